#include <webapi/APITable.h>

#include "ServerMethods.h"

namespace {

constexpr char kApi[] = "ZOVA.Core.OAuth.Server";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "get", package::GetServers},
    {kApi, 1, "set", package::SetServers},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
