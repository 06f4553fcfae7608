#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "list": a page of what lies in the folder "path", "/" (the default) for the caller's folders, or for what a link
 * shares.
 *
 * "sort" is "name" (the default), "size", "mtime" or "type", "order" "asc" (the default) or "desc"; "offset" 0 to
 * 1,000,000, default 0; "limit" 1 to 5,000, default 1,000.
 * Answers data.entries as `EntryJson` tells them, data.total of the whole folder, data.offset. A caller's folder has
 * "writable" too, and the name by which people know it.
 * Errors: 101 for a parameter, 401 to 404, 406, 412, 415.
 */
void ListFolder(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/** "stat": each of "paths" (one, or up to 1,000) in data.results, or why not: the call succeeds all the same. */
void StatPaths(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
