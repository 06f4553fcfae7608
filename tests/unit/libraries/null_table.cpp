// A library whose table is null.

#include "webapi/APITable.h"

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return nullptr;
}
