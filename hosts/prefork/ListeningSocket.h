#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

#include "../common/Descriptor.h"

namespace host {

/** Where a service listens, and who may connect. */
struct SocketPlace {
    /** Absolute, in a folder that only root can write to. */
    std::string path;
    uid_t owner = 0;
    gid_t group = 0;
    mode_t mode = 0600;
};

/**
 * The socket on which a service takes connections: a unix socket that it bound itself, or any stream socket that its
 * manager listens on. Non-blocking, so that of several who wait none is held by a connection that another has taken.
 */
class ListeningSocket {
public:
    /**
     * Binds and listens. What an earlier service left at the path is replaced if it is a socket on which nobody
     * listens; two services that start at once cannot take the path from each other, as each holds PATH.lock first.
     * @return nothing, with the reason in `problem`, if something else lies there or the system refuses.
     */
    static std::optional<ListeningSocket> Bind(const SocketPlace& place, std::string& problem);

    /** Takes a socket over that somebody else listens on and goes on to own. Nothing, with the reason, if it is none.
     */
    static std::optional<ListeningSocket> Adopt(Descriptor socket, std::string& problem);

    int Get() const { return socket.Get(); }

    /** Takes no more connections: removes the path if it is still this socket's, and closes. */
    void Stop();

    /** For a child, which waits on the socket and owns nothing else of it. */
    void LeaveLockToParent() { lock.Close(); }
    /** For a child that has its connection. */
    void CloseInChild() { socket.Close(); }

private:
    ListeningSocket() = default;

    Descriptor socket;
    Descriptor lock;
    /** Empty for a socket of somebody else. */
    std::string path;
    dev_t device = 0;
    ino_t node = 0;
};

}  // namespace host
