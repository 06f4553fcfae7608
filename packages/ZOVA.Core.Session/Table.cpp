#include <webapi/APITable.h>

#include "Cipher.h"
#include "Get.h"
#include "Login.h"
#include "Logout.h"

namespace {

constexpr char kApi[] = "ZOVA.Core.Session";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "login", package::Login},   {kApi, 1, "logout", package::Logout}, {kApi, 1, "get", package::Get},
    {kApi, 1, "cipher", package::Cipher}, {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
