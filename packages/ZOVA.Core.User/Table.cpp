#include <webapi/APITable.h>

#include "GetUser.h"
#include "ListUsers.h"

namespace {

constexpr char kApi[] = "ZOVA.Core.User";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "get", package::GetUser},
    {kApi, 1, "list", package::ListUsers},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
