#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/** What the ids of the tasks begin with that show how far uploads are; the client's "ticket" comes behind it. */
constexpr char kUploadPrefix[] = "upload-";

/**
 * "upload_deferred": as "upload", but the body is taken part by part, each file goes to its place as soon as it is
 * there, and a background task shows how far it is: "taken" and "length" in bytes, "done". Its id begins with "upload-"
 * and "ticket" (1 to 16 letters and digits), so that the client finds it while the body is still on its way.
 *
 * The parameters stand in the query string, or in front of the first file. A file without a name of the parameters'
 * gets the one that the client sent with it, if it is a good one.
 * Answers as "upload", and data.task_id. If the task is stopped the rest of the body is not taken: 414.
 */
void UploadDeferred(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
