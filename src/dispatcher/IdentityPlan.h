#pragma once

#include <json/value.h>

#include <string>

namespace ZOVA {

class APIRequest;

/** What the description says of the identity that a method runs under. */
struct IdentityPlan {
    bool grantByDefault = false;
    bool grantByUser = false;
    bool grantable = false;
    std::string runAs;
    std::string login;

    /** @param attributes of the method. */
    static IdentityPlan Of(const APIRequest& request, const Json::Value& attributes);

    /** Name of the user that the method runs as; "" if the call has no login and needs one. */
    const std::string& User() const;
};

}  // namespace ZOVA
