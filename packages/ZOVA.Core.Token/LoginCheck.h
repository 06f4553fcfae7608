#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <string>

namespace package {

/**
 * Checks that the call comes from somebody who is logged in. That the framework let it pass does not say so: a device
 * access token or a bearer token may have done that, and who got hold of one must not make others of it. So the session
 * of the cookie "id" is checked once more, and has to be that of the user whom the framework found.
 * @return false with the error in the response.
 */
bool RequireLogin(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/**
 * After `RequireLogin`: whose tokens the call is about, the caller's own unless an administrator names a "user".
 * @return false with the error in the response: 101 for a name that can be none, 105 for somebody else's.
 */
bool ReadOwner(ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::string& owner);

}  // namespace package
