#pragma once

#include <sys/types.h>

#include <string>

#include "common/UniqueFd.h"

namespace reference::sharing {

/** An absolute path without empty, "." and ".." parts, of at most `kLongestPath` bytes; not the root alone. */
bool IsPlainPath(const std::string& path);

/**
 * Opens a regular file or folder that belongs to the owner, without following any symbolic link, for naming alone
 * (O_PATH). A hard link to somebody else's file is not the owner's.
 */
UniqueFd OpenOwned(const std::string& path, uid_t owner);

}  // namespace reference::sharing
