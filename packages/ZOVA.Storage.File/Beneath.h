#pragma once

#include <string>

#include "../common/UniqueFd.h"

namespace package {

/**
 * Opens a folder by an absolute path that the device itself names, as a place to start from. No symbolic link is
 * followed on the way: a folder above may be another user's. Not open, with `errno`, on failure.
 */
UniqueFd OpenTopFolder(const std::string& path);

/**
 * Opens what lies at a relative path below a folder, through no symbolic link and on no way out, whoever renames what
 * meanwhile. A link at the path's end is opened itself with O_PATH and O_NOFOLLOW. Never waits for a pipe, and takes no
 * terminal.
 * @param path "" for the folder itself.
 * @param flags of the kernel's, O_PATH among them for a place in which something is to be made, renamed or removed.
 * @return not open, with `errno`, on failure.
 */
UniqueFd OpenBeneath(int folder, const std::string& path, int flags);

/** As above, but nothing that is mounted there: EXDEV. */
UniqueFd OpenOnSameMount(int folder, const std::string& path, int flags);

}  // namespace package
