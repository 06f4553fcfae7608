#include "auth/UserTag.h"

#include "webapi/Json.h"

namespace ZOVA {

std::string UserTag(bool isAdmin, const std::string& userName) {
    const std::string role = isAdmin ? "admin." : "normal.";
    if (userName.find('\\') != std::string::npos) {
        return role + "domain";
    }
    return role + (userName.find('@') != std::string::npos ? "ldap" : "local");
}

bool NamesUserTag(const Json::Value& allowUser, const std::string& tag) {
    return Json::searchArrayIndex(allowUser, tag) != Json::Value::maxUInt;
}

}  // namespace ZOVA
