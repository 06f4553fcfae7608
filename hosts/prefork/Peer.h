#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

namespace host {

/**
 * Whether the process that made the connection was root's then, or, if a group is given, in it: by its group or one of
 * its supplementary ones. False for a connection that tells nothing of its peer.
 */
bool IsAllowedPeer(int connection, std::optional<gid_t> group);

/** "process 12 of user 1000", for log lines. */
std::string DescribePeer(int connection);

}  // namespace host
