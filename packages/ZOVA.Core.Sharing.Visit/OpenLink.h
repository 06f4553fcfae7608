#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "open": opens the link of "hash" for a visitor, by "password", or by "user" and that user's "password". Answers
 * data.expires, and hands the session id out in the cookie "sharing_sid"; a public link without conditions needs no
 * session, and then neither comes. Errors: 101 with the parameter's name, 400, 402, 403, 407, 117 where the platform
 * failed. Logs nothing.
 */
void OpenLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
