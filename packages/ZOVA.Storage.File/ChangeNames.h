#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "mkdir": makes the folder "path"; with "parents" (default false) those above it too, and what is there already is
 * left alone. New folders get the rights of the one above, but strangers may not write.
 * Answers data.path. Errors: 101 for a parameter, 401 to 406, 408, 409, 412, 415.
 */
void MakeFolder(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/**
 * "rename": renames or moves "path" to the path "to", within one of the caller's folders. "existing" says what happens
 * to what is there: "error" (the default), or "overwrite" for a file, or a folder that is empty.
 * Answers data.path. Errors: 101 for a parameter, 401 to 412, 415.
 */
void Rename(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
