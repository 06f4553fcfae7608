// libzovadaemon.so.6 on the fake platform: services answer by what the test has put behind their path.

#include <cerrno>

#include "FakePlatform.h"
#include "zovadaemon.h"

using fake::FakePlatform;

namespace zovadaemon {

SockConnection::SockConnection(int descriptor) : fd(descriptor) {}

SockConnection::~SockConnection() {
    Close();
}

void SockConnection::Close() {
    if (fd >= 0) {
        FakePlatform& platform = FakePlatform::Required("SockConnection::Close");
        platform.Enter("SockConnection::Close", "", 0);
        --platform.openConnections;
        fd = -1;
        // As the real one may: what comes after must not count on `errno`.
        errno = EBADF;
    }
}

bool SockConnection::Send(const std::string& text) {
    FakePlatform& platform = FakePlatform::Required("SockConnection::Send");
    if (!platform.Enter("SockConnection::Send", text, EPIPE)) {
        return false;
    }
    platform.connections.at(static_cast<std::size_t>(fd)).request = text;
    return true;
}

bool SockConnection::Recv(std::string& text) {
    FakePlatform& platform = FakePlatform::Required("SockConnection::Recv");
    if (!platform.Enter("SockConnection::Recv", "", ECONNRESET)) {
        return false;
    }
    const fake::Connection& connection = platform.connections.at(static_cast<std::size_t>(fd));
    text = platform.services.at(connection.path)(connection.request);
    return true;
}

DomainSockConnection::DomainSockConnection(const std::string& given) : path(given) {}

DomainSockConnection::~DomainSockConnection() = default;

bool DomainSockConnection::Connect() {
    FakePlatform& platform = FakePlatform::Required("DomainSockConnection::Connect");
    if (!platform.Enter("DomainSockConnection::Connect", path, ECONNREFUSED)) {
        return false;
    }
    if (platform.services.count(path) == 0) {
        errno = ENOENT;
        return false;
    }
    fd = static_cast<int>(platform.connections.size());
    platform.connections.push_back({path, ""});
    ++platform.openConnections;
    return true;
}

}  // namespace zovadaemon
