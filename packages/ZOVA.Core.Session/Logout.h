#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "logout": ends the session of the cookie "id" and deletes the cookie. A success also where there was none; 117 if the
 * session could not be ended.
 */
void Logout(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
