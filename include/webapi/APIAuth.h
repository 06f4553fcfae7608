#pragma once

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

    /**
     * Judges a bearer token.
     * @return false if the call carries none; true leaves the outcome in the request's authorisation result.
     */
    static bool CheckAccessToken(APIRequest* request);
};

}  // namespace ZOVA
