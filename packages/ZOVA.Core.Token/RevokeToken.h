#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "revoke": ends the caller's device access token of "id", or for administrators one of "user". It counts no more from
 * the next call on. Errors: 101 with the parameter's name, 105, 400, 401, 402, 117 where the platform failed.
 */
void RevokeToken(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
