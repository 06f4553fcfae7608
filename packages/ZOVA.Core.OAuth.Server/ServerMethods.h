#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "get": the OAuth servers, in the order in which they are asked. The description admits administrators only, as a
 * record may hold the device's own credentials at the server.
 *
 * Answers data, an array of records as `CheckServer` describes them; empty before the first "set".
 * Errors: 402 the stored list cannot be used, 403 it cannot be read.
 */
void GetServers(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/**
 * "set": replaces the whole list by "servers", an array of at most 32 records, or nothing at all.
 * Errors: 101 for another parameter, 401 for a record that cannot be used, 402 and 403 as above.
 */
void SetServers(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
