#pragma once

#include <json/value.h>

#include <string>

namespace ZOVA {

/** The kind of a user: "admin." or "normal.", then "domain", "ldap" or "local" after the form of the name. */
std::string UserTag(bool isAdmin, const std::string& userName);

/** Whether a description's "allowUser" names the tag; a list that is none, or is empty, names nobody. */
bool NamesUserTag(const Json::Value& allowUser, const std::string& tag);

}  // namespace ZOVA
