#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

// Sharing links of the caller's own. All answer 101 with a parameter's name, 401, 402, 403, and 117 where the platform
// failed, and log nothing.

/**
 * "create": a link to "paths" for "project"; optionally "protect_type" with "password" or "users", "addresses",
 * "match_ip", "expires", "visit_limit", "enabled". Answers the link and data.url, under which it is reached.
 */
void CreateLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response);
/** "get": the link of "hash", with its URL. */
void GetLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response);
/** "list": data.links, the oldest first, each with its URL. */
void ListLinks(ZOVA::APIRequest* request, ZOVA::APIResponse* response);
/** "update": replaces what is given, any parameter of "create" but "project". */
void UpdateLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response);
/** "delete": removes the link of "hash"; its visitors are out at once. */
void DeleteLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
