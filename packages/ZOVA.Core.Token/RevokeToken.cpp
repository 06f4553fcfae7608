#include "RevokeToken.h"

#include <string>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/Text.h"
#include "LoginCheck.h"
#include "PlatformTokens.h"
#include "TokenErrors.h"

namespace package {
namespace {

constexpr char kId[] = "id";

void Answer(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::string owner;
    if (!RequireLogin(request, response) || !ReadOwner(request, response, owner)) {
        return;
    }
    const auto id = request->GetAndCheckString(kId, ZOVA::APIRequest::PARAM_REQUIRED);
    if (id.IsInvalid() || id.IsReset() || !id.IsSet() || HasControlBytes(id.Get())) {
        RefuseParameter(response, kId);
        return;
    }
    const int result = ZovaAccessTokenRevoke(owner.c_str(), id.Get().c_str());
    if (result == ZOVA_ACCESS_TOKEN_OK) {
        response->SetSuccess(Json::Value());
    } else {
        RefuseToken(response, result);
    }
}

}  // namespace

void RevokeToken(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("revoke", response, [&] { Answer(request, response); });
}

}  // namespace package
