#pragma once

#include <string>

#include "common/UniqueFd.h"

namespace reference {

/**
 * Keeps a part file that has got its name open, and with that locked, until the process ends. Whatever is then still
 * under the path where it was published is removed: at exit, and before SIGTERM, SIGINT or SIGHUP ends the process
 * where that is what they do. A forked child removes nothing.
 */
void KeepPublished(UniqueFd descriptor, const std::string& path);

}  // namespace reference
