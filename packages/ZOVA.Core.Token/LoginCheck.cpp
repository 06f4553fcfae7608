#include "LoginCheck.h"

#include <cstddef>

#include "../common/ClientSession.h"
#include "../common/Parameters.h"
#include "../common/Text.h"
#include "TokenErrors.h"

namespace package {
namespace {

constexpr char kUser[] = "user";
constexpr int kUserSize = 493;
constexpr std::size_t kLongestName = 255;

bool IsName(const std::string& name) {
    return !name.empty() && name.size() <= kLongestName && !HasControlBytes(name);
}

}  // namespace

bool RequireLogin(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    char user[kUserSize] = {};
    const int result = CheckClientSession(request, user, kUserSize);
    const bool good = result == ZOVA::AUTHORIZED_RESULT_OK || result == ZOVA::AUTHORIZED_RESULT_OK_ALSO;
    if (!good || user[0] == '\0' || request->GetLoginUserName() != user) {
        response->SetError(TOKEN_ERR_NO_SESSION, Json::Value());
        return false;
    }
    return true;
}

bool ReadOwner(ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::string& owner) {
    const auto user = request->GetAndCheckString(kUser, ZOVA::APIRequest::PARAM_OPTIONAL);
    if (user.IsInvalid() || user.IsReset() || (user.IsSet() && !IsName(user.Get()))) {
        RefuseParameter(response, kUser);
        return false;
    }
    const std::string self = request->GetLoginUserName();
    const std::string& named = user.Get(self);
    if (named != self && !request->IsAdmin()) {
        response->SetError(ZOVA::WEBAPI_ERR_NO_PERMISSION, Json::Value());
        return false;
    }
    owner = named;
    return true;
}

}  // namespace package
