#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "list": the accounts of the user database, ordered by user id. The description admits administrators only.
 *
 * Parameters: "offset" (from 0, default 0) and "limit" (1 to 1000, default 100). Answers data.users (name, uid, gid,
 * home, description, is_admin), data.offset and data.total. An offset behind the end gives no users.
 * Errors: 101 with the parameter's name, 402 the database cannot be read.
 */
void ListUsers(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
