#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "info": figures of the machine. The description admits administrators only.
 *
 * Answers data.hostname, uptime (seconds), load ("1", "5", "15"), memory (total, free, available) and volumes, an array
 * of mount_point, device, type, total, free, available. Sizes are in bytes. A volume that cannot be read is left out.
 * 117 where the system does not tell one of the others; that is logged.
 */
void Info(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
