#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "get": what each scope of a bearer token opens. The description admits administrators only.
 *
 * Answers data.scope, an array of records as `CheckScope` describes them; empty before the first "set".
 * Errors: 402 the stored list cannot be used, 403 it cannot be read.
 */
void GetScopes(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/**
 * "set": replaces the whole list by "scope", an array of at most 256 records, or nothing at all.
 * Errors: 101 for another parameter, 401 for a record that cannot be used, 402 and 403 as above.
 */
void SetScopes(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
