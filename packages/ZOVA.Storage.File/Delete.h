#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/** What the ids of removals in the background begin with. */
constexpr char kDeletePrefix[] = "delete-";

/**
 * "delete": removes "paths", one or up to 1,000. With "recursive" (default false) folders with all that is in them, in
 * a background task; without, files, links and empty folders at once.
 *
 * Answers data.results with "path" and "error" for each, the call being a success only if all are removed; or
 * data.task_id, and the task reports what `RemovalState::ToJson` tells, at once and every half second. Nothing is
 * started if one of the paths cannot be found.
 * Errors: 101 for a parameter, 401 to 404, 406, 407, 409, 412, 415; 110 or 117 if the task cannot be started.
 */
void Delete(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
