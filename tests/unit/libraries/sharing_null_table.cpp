// A check library that gives no table out.

#include "webapi/APITable.h"

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
    return nullptr;
}
