#include <webapi/APITable.h>

#include "Info.h"

namespace {

const ZOVA::_tag_API_TABLE kTable[] = {
    {"ZOVA.Core.System", 1, "info", package::Info},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
