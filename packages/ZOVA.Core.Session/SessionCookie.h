#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <string>

namespace package {

/**
 * Hands the session id to the client in the cookie "id": for this visit of the browser, out of reach of scripts, never
 * sent along from another site, and over https only if the login came that way.
 */
bool SetSessionCookie(ZOVA::APIRequest* request, ZOVA::APIResponse* response, const std::string& sid);

/** Makes the client forget the cookie "id". */
bool DeleteSessionCookie(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
