#include "ListTokens.h"

#include <string>

#include "../common/Fence.h"
#include "LoginCheck.h"
#include "PlatformTokens.h"
#include "TokenErrors.h"

namespace package {
namespace {

void Answer(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::string owner;
    if (!RequireLogin(request, response) || !ReadOwner(request, response, owner)) {
        return;
    }
    Json::Value data(Json::objectValue);
    const int result = ZovaAccessTokenList(owner.c_str(), &data["tokens"]);
    if (result == ZOVA_ACCESS_TOKEN_OK) {
        response->SetSuccess(data);
    } else {
        RefuseToken(response, result);
    }
}

}  // namespace

void ListTokens(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("list", response, [&] { Answer(request, response); });
}

}  // namespace package
