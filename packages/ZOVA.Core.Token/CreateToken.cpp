#include "CreateToken.h"

#include <limits>
#include <string>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/Text.h"
#include "LoginCheck.h"
#include "PlatformTokens.h"
#include "TokenErrors.h"

namespace package {
namespace {

constexpr char kApis[] = "apis";
constexpr char kLabel[] = "label";
constexpr char kExpiresIn[] = "expires_in";

/** Texts reach the platform and come back in answers: no NUL that would cut one, and nothing but UTF-8. */
bool IsLabel(const std::string& label) {
    return !HasControlBytes(label) && ValidUtf8(label) == label;
}

bool ReadLabel(ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::string& label) {
    const auto given = request->GetAndCheckString(kLabel, ZOVA::APIRequest::PARAM_OPTIONAL);
    if (given.IsInvalid() || given.IsReset() || (given.IsSet() && !IsLabel(given.Get()))) {
        RefuseParameter(response, kLabel);
        return false;
    }
    label = given.Get("");
    return true;
}

void Answer(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    // Absent counts as 0, which the platform refuses: every token expires.
    int seconds = 0;
    std::string label;
    if (!RequireLogin(request, response) || !ReadLabel(request, response, label) ||
        !ReadInteger(request, response, kExpiresIn, 0, std::numeric_limits<int>::max(), seconds)) {
        return;
    }
    const auto apis = request->GetAndCheckArray(kApis, ZOVA::APIRequest::PARAM_REQUIRED);
    if (apis.IsInvalid() || apis.IsReset() || !apis.IsSet()) {
        RefuseParameter(response, kApis);
        return;
    }
    const std::string user = request->GetLoginUserName();
    const Json::Value& list = apis.Get();
    Json::Value made;
    const int result = ZovaAccessTokenCreate(user.c_str(), label.c_str(), seconds, &list, &made);
    if (result == ZOVA_ACCESS_TOKEN_OK) {
        response->SetSuccess(made);
    } else {
        RefuseToken(response, result);
    }
}

}  // namespace

void CreateToken(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("create", response, [&] { Answer(request, response); });
}

}  // namespace package
