#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "get": one account of the user database, the caller's own unless an administrator names another by "name".
 *
 * Answers data.name, uid, gid, group, groups (names), home, shell, description, is_admin.
 * Errors: 101 for a name that can be none, 105 for somebody else's without being an administrator (whether or not it
 * exists), 401 no such user, 402 the database cannot be read.
 */
void GetUser(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
