#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "login": checks account and password, opens a session, removes the client's earlier one.
 *
 * Answers data.sid, data.user, data.is_admin, and data.token if "csrf" was true; the cookie "id" holds the session id.
 * Errors: 101 with the parameter's name, 400, 407, and 117 where the platform failed. Logs nothing.
 */
void Login(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
