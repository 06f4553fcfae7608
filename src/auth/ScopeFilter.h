#pragma once

#include <json/value.h>

#include <string>

namespace ZOVA {

class APIRequest;

/**
 * Whether the scopes that a token was granted open the call.
 * @param scopes records with "id" and "apis", as the device keeps them; what is of another form opens nothing.
 * @param granted ids, separated by single blanks.
 */
bool ScopesCover(const Json::Value& scopes, const std::string& granted, APIRequest& request);

}  // namespace ZOVA
