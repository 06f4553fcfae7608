#include <webapi/APITable.h>

#include "CreateToken.h"
#include "ListTokens.h"
#include "RevokeToken.h"

namespace {

constexpr char kApi[] = "ZOVA.Core.Token";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "create", package::CreateToken},
    {kApi, 1, "list", package::ListTokens},
    {kApi, 1, "revoke", package::RevokeToken},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
