#pragma once

#include <json/value.h>

#include <string>

#include "Export.h"

namespace ZOVA {

class APIRequest;
class APIResponse;

/** Checks of users and privileges, for API libraries and the web entry. Static, without state. */
class WEBAPI_EXPORT APIAuth {
public:
    /**
     * Whether the kind of user is named in the API's "allowUser": "admin." or "normal." after the request, then
     * "domain" for a name with a backslash, "ldap" for one with "@", else "local". An API that names nobody admits
     * nobody. The method's own "allowUser" is not looked at.
     */
    static bool CheckAllowUser(APIRequest* request, const char* userName);

    /**
     * A complete check for a library that holds a session id of its own: session, "allowUser", "appPriv". The identity
     * is the request's, not the session's.
     * @param flag goes to the CGI library.
     * @return false with the error 105, 106, 107, 150 or 160 in the response; also if an error stood there before.
     */
    static bool CheckPermission(APIRequest* request, APIResponse* response, const char* sessionId, bool flag);

    /**
     * Renews the idle time of the request's login session.
     * @return false if there is none, or its id leads anywhere but to a plain file of the session directory.
     */
    static bool UpdateTimeout(APIRequest* request);

    // ---- bearer tokens ----
    //
    // What a token stands for is asked of the servers that "ZOVA.Core.OAuth.Server" lists; what it is good for stands
    // in the scopes of "ZOVA.Core.OAuth.Scope". A token is a secret: no function logs it. Nothing is kept between
    // calls.

    /** What stands behind the first "Bearer " of the header Authorization, else the text "_oat"; "" for no token. */
    static std::string GetBearerToken(APIRequest* request);

    /**
     * Asks one server after the other, in their order, what the token stands for.
     * @param out receives the values that the accepting server's "expect" names, "userName" and "scope" among them; of
     *     a server that refused nothing stays.
     * @return false if no server accepted it. Logs a server list that cannot be had.
     */
    static bool ExchangeAccessToken(const std::string& token, Json::Value& out);

    /**
     * Asks one server, given as its record in the list, through `APIUtils::QueryWebapi`. The token goes into the
     * record's "params" as it is, without any encoding.
     * @param out as above; what it held before is gone once the server has answered.
     * @return false without a line for a server that is not enabled or gave no answer; anything else is logged.
     */
    static bool ExchangeAccessTokenByServer(const Json::Value& server, const std::string& token, Json::Value& out);

    /**
     * Judges the bearer token of a call. One exchange with the token's server, and three calls of the system's own
     * APIs as the administrator.
     * @return false if the call carries none. True leaves the outcome in the request's authorisation result: 1, with
     * the user as login name; -2 for an unknown user, or scopes that do not cover the call; -4 for an answer without
     * user or scope; -6 if there are no scopes, or no server accepted the token. All but 1 leave the login name alone.
     */
    static bool CheckAccessToken(APIRequest* request);
};

}  // namespace ZOVA
