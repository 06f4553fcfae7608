#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "download": sends "paths", one or up to 1,000. One file goes out as it is, with ranges and conditions; several
 * things, a folder, or whatever it is with "format" ("zip", "tar"), as an archive made on the way, without a length.
 *
 * Everything is looked at before anything goes out: the first thing that cannot be read is the answer.
 * Errors: 101 for a parameter, 401 to 404, 406, 412, 413, 415.
 */
void Download(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
