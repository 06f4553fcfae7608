#include "dispatcher/IdentityPlan.h"

#include "webapi/APIRequest.h"
#include "webapi/Json.h"

namespace ZOVA {

IdentityPlan IdentityPlan::Of(const APIRequest& request, const Json::Value& attributes) {
    IdentityPlan plan;
    plan.grantByDefault = Json::asBool(Json::member(attributes, "grantByDefault"));
    plan.grantByUser = Json::asBool(Json::member(attributes, "grantByUser"));
    plan.grantable = plan.grantByDefault || Json::asBool(Json::member(attributes, "grantable"));
    plan.runAs = Json::asString(Json::hasMember(attributes, "runAs") ? attributes["runAs"]
                                                                     : request.GetAPIInfo("runAs", "system"));
    plan.login = request.GetLoginUserName();
    return plan;
}

const std::string& IdentityPlan::User() const {
    static const std::string kRoot = "system";
    if (grantByDefault) {
        return kRoot;
    }
    return grantByUser ? login : runAs;
}

}  // namespace ZOVA
