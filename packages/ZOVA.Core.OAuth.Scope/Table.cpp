#include <webapi/APITable.h>

#include "ScopeMethods.h"

namespace {

constexpr char kApi[] = "ZOVA.Core.OAuth.Scope";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "get", package::GetScopes},
    {kApi, 1, "set", package::SetScopes},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
