#include "TokenErrors.h"

#include "../common/Parameters.h"
#include "PlatformTokens.h"

namespace package {

void RefuseToken(ZOVA::APIResponse* response, int result) {
    switch (result) {
        case ZOVA_ACCESS_TOKEN_BAD_APIS:
            return RefuseParameter(response, "apis");
        case ZOVA_ACCESS_TOKEN_BAD_LABEL:
            return RefuseParameter(response, "label");
        case ZOVA_ACCESS_TOKEN_BAD_TIME:
            return RefuseParameter(response, "expires_in");
        case ZOVA_ACCESS_TOKEN_NO_USER:
            return response->SetError(TOKEN_ERR_NO_SUCH_USER, Json::Value());
        case ZOVA_ACCESS_TOKEN_TOO_MANY:
            return response->SetError(TOKEN_ERR_TOO_MANY, Json::Value());
        case ZOVA_ACCESS_TOKEN_UNKNOWN:
            return response->SetError(TOKEN_ERR_NO_SUCH_TOKEN, Json::Value());
        default:
            return response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
    }
}

}  // namespace package
