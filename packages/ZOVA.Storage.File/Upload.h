#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "upload": puts the files of a form into the folder "path". `UploadWishes` tells the parameters; each file needs a
 * name. "mtime" is in seconds since the epoch.
 *
 * Answers data.results with "field", "path", "size" and "skipped", or "error", for each; the call is a success only if
 * no file was refused. Nothing is placed if a parameter cannot be used.
 * Errors: 101 for a parameter, or "file" where there is none; 108 as the framework says; 401 to 406, 408, 412, 415.
 */
void Upload(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
