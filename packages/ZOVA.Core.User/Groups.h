#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace package {

/** Name of a group; its number as text where the system knows no name. */
std::string GroupName(gid_t gid);

/**
 * Names of all groups of an account, its own first.
 * @return false if the account is in more groups than the system allows a process; `out` is then left alone.
 */
bool GroupNames(const std::string& account, gid_t gid, std::vector<std::string>& out);

}  // namespace package
