#include "Peer.h"

#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <vector>

namespace host {
namespace {

bool Credentials(int connection, ucred& peer) {
    socklen_t size = sizeof(peer);
    return getsockopt(connection, SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0 && size == sizeof(peer);
}

bool HasSupplementary(int connection, gid_t group) {
    std::vector<gid_t> groups(64);
    socklen_t size = static_cast<socklen_t>(groups.size() * sizeof(gid_t));
    int result = getsockopt(connection, SOL_SOCKET, SO_PEERGROUPS, groups.data(), &size);
    if (result != 0 && errno == ERANGE) {
        // `size` now says how much there is.
        groups.resize(size / sizeof(gid_t));
        result = getsockopt(connection, SOL_SOCKET, SO_PEERGROUPS, groups.data(), &size);
    }
    if (result != 0) {
        return false;
    }
    groups.resize(size / sizeof(gid_t));
    return std::find(groups.begin(), groups.end(), group) != groups.end();
}

}  // namespace

bool IsAllowedPeer(int connection, std::optional<gid_t> group) {
    ucred peer{};
    if (!Credentials(connection, peer)) {
        return false;
    }
    return peer.uid == 0 || (group && (peer.gid == *group || HasSupplementary(connection, *group)));
}

std::string DescribePeer(int connection) {
    ucred peer{};
    if (!Credentials(connection, peer)) {
        return "an unknown process";
    }
    return "process " + std::to_string(peer.pid) + " of user " + std::to_string(peer.uid);
}

}  // namespace host
