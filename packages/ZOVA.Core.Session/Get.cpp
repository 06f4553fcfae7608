#include "Get.h"

#include "../common/ClientSession.h"
#include "../common/Fence.h"
#include "../common/PlatformAccounts.h"
#include "../common/Text.h"
#include "SessionStatus.h"

namespace package {
namespace {

constexpr int kUserSize = 493;

}  // namespace

void Get(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("get", response, [&] {
        char user[kUserSize] = {};
        const int result = CheckClientSession(request, user, kUserSize);
        if (result != ZOVA::AUTHORIZED_RESULT_OK && result != ZOVA::AUTHORIZED_RESULT_OK_ALSO) {
            RefuseSession(response, result);
            return;
        }
        Json::Value data(Json::objectValue);
        data["user"] = ValidUtf8(user);
        data["is_admin"] = IsAdministrator(user);
        response->SetSuccess(data);
    });
}

}  // namespace package
