#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "create": makes a device access token of the caller's own, from a login session only.
 *
 * Parameters: "apis", an array of {"api": name, "methods": names or "*"}; "expires_in", seconds from a minute to ten
 * years; "label", a text of at most 128 bytes, default "". Answers data.id, data.token (shown this once) and
 * data.expires. Errors: 101 with the parameter's name, 400, 401, 403, 117 where the platform failed. Logs nothing.
 */
void CreateToken(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
