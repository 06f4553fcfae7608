#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/** What the ids of searches begin with. */
constexpr char kSearchPrefix[] = "search-";

/** Error numbers of this package's own. */
enum SearchError : int {
    /** The folder does not exist, is none, or may not be read by the caller. */
    SEARCH_ERR_FOLDER = 401,
};

/**
 * "start": searches a folder and all below it in a background task, as the user who is logged in.
 *
 * "folder" is an absolute path, "pattern" a shell pattern for names (1 to 255 bytes, no "/", at most 16 "*"), "content"
 * (optional, 1 to 1,024 bytes) what a found file must hold.
 * Answers data.task_id; the task reports what `SearchState::ToJson` tells, at once and every half second.
 * Errors: 101 for a parameter, 401 for the folder, 110 or 117 if the task cannot be started.
 */
void StartSearch(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
