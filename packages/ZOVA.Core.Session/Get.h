#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "get": who is logged in, as data.user and data.is_admin.
 *
 * The API is an open one, so the method checks the session itself and answers as the framework would: 119, 106, 150 or
 * 105, with the same word in the header "x-request-error".
 */
void Get(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
