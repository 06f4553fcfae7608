#include "ListeningSocket.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>

#include <cstring>

namespace host {
namespace {

std::string WithErrno(const std::string& text) {
    return text + ": " + strerror(errno);
}

bool MakeAddress(const std::string& path, sockaddr_un& address) {
    address.sun_family = AF_UNIX;
    if (path.empty() || path[0] != '/' || path.size() >= sizeof(address.sun_path)) {
        return false;
    }
    memcpy(address.sun_path, path.c_str(), path.size() + 1);
    return true;
}

Descriptor TakeLock(const std::string& path, std::string& problem) {
    const std::string name = path + ".lock";
    Descriptor lock(open(name.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!lock.IsOpen()) {
        problem = WithErrno("cannot open " + name);
    } else if (flock(lock.Get(), LOCK_EX | LOCK_NB) != 0) {
        problem = errno == EWOULDBLOCK ? "another service holds " + name : WithErrno("cannot lock " + name);
        lock.Close();
    }
    return lock;
}

/** True only if the kernel says that no socket listens behind the path. */
bool NobodyListens(const sockaddr_un& address) {
    const Descriptor probe(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    return probe.IsOpen() && connect(probe.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0 &&
           errno == ECONNREFUSED;
}

bool MakeRoom(const std::string& path, const sockaddr_un& address, std::string& problem) {
    struct stat status;
    if (lstat(path.c_str(), &status) != 0) {
        if (errno != ENOENT) {
            problem = WithErrno("cannot look at " + path);
        }
        return errno == ENOENT;
    }
    if (!S_ISSOCK(status.st_mode)) {
        problem = path + " is there and no socket";
        return false;
    }
    if (!NobodyListens(address)) {
        problem = "somebody listens on " + path;
        return false;
    }
    if (unlink(path.c_str()) != 0) {
        problem = WithErrno("cannot remove " + path);
        return false;
    }
    return true;
}

/** Nobody can connect before all of it is done, as the socket does not listen until then. */
bool BindTo(int socket, const sockaddr_un& address, const SocketPlace& place) {
    // The mode comes from the socket itself, so that the file never has another one.
    const mode_t before = umask(0);
    const bool bound = fchmod(socket, place.mode) == 0 &&
                       bind(socket, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0;
    const int error = errno;
    umask(before);
    errno = error;
    return bound && lchown(place.path.c_str(), place.owner, place.group) == 0 && listen(socket, SOMAXCONN) == 0;
}

bool Listens(int socket) {
    int type = 0;
    int listening = 0;
    socklen_t size = sizeof(int);
    return getsockopt(socket, SOL_SOCKET, SO_TYPE, &type, &size) == 0 && type == SOCK_STREAM &&
           getsockopt(socket, SOL_SOCKET, SO_ACCEPTCONN, &listening, &size) == 0 && listening != 0;
}

}  // namespace

std::optional<ListeningSocket> ListeningSocket::Bind(const SocketPlace& place, std::string& problem) {
    sockaddr_un address{};
    if (!MakeAddress(place.path, address)) {
        problem = "\"" + place.path + "\" is no path for a socket: absolute, at most " +
                  std::to_string(sizeof(address.sun_path) - 1) + " bytes";
        return std::nullopt;
    }
    ListeningSocket made;
    made.lock = TakeLock(place.path, problem);
    if (!made.lock.IsOpen() || !MakeRoom(place.path, address, problem)) {
        return std::nullopt;
    }
    made.socket = Descriptor(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    struct stat status;
    if (!made.socket.IsOpen() || !BindTo(made.socket.Get(), address, place) ||
        lstat(place.path.c_str(), &status) != 0) {
        problem = WithErrno("cannot listen on " + place.path);
        return std::nullopt;
    }
    made.path = place.path;
    made.device = status.st_dev;
    made.node = status.st_ino;
    return made;
}

std::optional<ListeningSocket> ListeningSocket::Adopt(Descriptor socket, std::string& problem) {
    if (!Listens(socket.Get())) {
        problem = "what was handed over is no stream socket that listens";
        return std::nullopt;
    }
    const int flags = fcntl(socket.Get(), F_GETFL);
    if (flags < 0 || fcntl(socket.Get(), F_SETFL, flags | O_NONBLOCK) != 0 ||
        fcntl(socket.Get(), F_SETFD, FD_CLOEXEC) != 0) {
        problem = WithErrno("cannot use the socket that was handed over");
        return std::nullopt;
    }
    ListeningSocket made;
    made.socket = std::move(socket);
    return made;
}

void ListeningSocket::Stop() {
    struct stat status;
    if (!path.empty() && lstat(path.c_str(), &status) == 0 && status.st_dev == device && status.st_ino == node) {
        unlink(path.c_str());
    }
    socket.Close();
    lock.Close();
}

}  // namespace host
