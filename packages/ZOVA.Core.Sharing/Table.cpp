#include <webapi/APITable.h>

#include "LinkMethods.h"

namespace {

constexpr char kApi[] = "ZOVA.Core.Sharing";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "create", package::CreateLink}, {kApi, 1, "get", package::GetLink},
    {kApi, 1, "list", package::ListLinks},    {kApi, 1, "update", package::UpdateLink},
    {kApi, 1, "delete", package::DeleteLink}, {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
