#include "LinkErrors.h"

#include "../common/Parameters.h"
#include "../common/PlatformSharing.h"

namespace package {

void RefuseLink(ZOVA::APIResponse* response, int result) {
    switch (result) {
        case ZOVA_LINK_BAD_FIELD:
            return RefuseParameter(response, "enabled");
        case ZOVA_LINK_BAD_PROJECT:
            return RefuseParameter(response, "project");
        case ZOVA_LINK_BAD_PATHS:
            return RefuseParameter(response, "paths");
        case ZOVA_LINK_BAD_PROTECTION:
            return RefuseParameter(response, "protect_type");
        case ZOVA_LINK_BAD_ADDRESSES:
            return RefuseParameter(response, "addresses");
        case ZOVA_LINK_BAD_TIME:
            return RefuseParameter(response, "expires");
        case ZOVA_LINK_BAD_LIMIT:
            return RefuseParameter(response, "visit_limit");
        case ZOVA_LINK_NO_USER:
            return response->SetError(LINK_ERR_NO_USER, Json::Value());
        case ZOVA_LINK_UNKNOWN:
            return response->SetError(LINK_ERR_NO_SUCH_LINK, Json::Value());
        case ZOVA_LINK_TOO_MANY:
            return response->SetError(LINK_ERR_TOO_MANY, Json::Value());
        default:
            return response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
    }
}

}  // namespace package
