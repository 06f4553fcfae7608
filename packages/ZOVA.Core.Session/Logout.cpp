#include "Logout.h"

#include "../common/ClientSession.h"
#include "../common/Fence.h"
#include "SessionCookie.h"

namespace package {

void Logout(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("logout", response, [&] {
        if (!EndClientSession(request)) {
            response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
            return;
        }
        DeleteSessionCookie(request, response);
        response->SetSuccess(Json::Value());
    });
}

}  // namespace package
