#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "list": the caller's device access tokens, or for administrators those of "user". Answers data.tokens with "id",
 * "label", "apis", "created" and "expires" (seconds since the epoch) of each, the oldest first, and never a token.
 * Errors: 101 with the parameter's name, 105, 400, 401, 117 where the platform failed.
 */
void ListTokens(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
