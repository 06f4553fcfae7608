#include <poll.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>

#include "Seam.h"
#include "zovadaemon/Deadline.h"
#include "zovadaemon/SocketLimits.h"

// A text on the wire is its length in 8 bytes, the lowest first, and then its bytes.

namespace zovadaemon {

namespace {

using reference::Deadline;
using reference::socketLimits;

constexpr std::uint64_t kLargestText = 64U * 1024 * 1024;
constexpr std::size_t kLengthSize = 8;
constexpr std::size_t kChunk = 64U * 1024;

bool WaitFor(int descriptor, short event, const Deadline& deadline) {
    for (;;) {
        pollfd wanted{descriptor, event, 0};
        const int ready = poll(&wanted, 1, deadline.Left());
        if (ready > 0) {
            return true;
        }
        if (ready == 0) {
            errno = ETIMEDOUT;
            return false;
        }
        if (errno != EINTR) {
            return false;
        }
    }
}

bool CanTryAgain() {
    return errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR;
}

bool SendAll(int descriptor, const char* data, std::size_t size, const Deadline& deadline) {
    while (size > 0) {
        const ssize_t sent = send(descriptor, data, size, MSG_NOSIGNAL | MSG_DONTWAIT);
        if (sent >= 0) {
            data += sent;
            size -= static_cast<std::size_t>(sent);
        } else if (!CanTryAgain() || !WaitFor(descriptor, POLLOUT, deadline)) {
            return false;
        }
    }
    return true;
}

bool ReceiveAll(int descriptor, char* data, std::size_t size, const Deadline& deadline) {
    while (size > 0) {
        const ssize_t got = recv(descriptor, data, size, MSG_DONTWAIT);
        if (got > 0) {
            data += got;
            size -= static_cast<std::size_t>(got);
        } else if (got == 0) {
            errno = ECONNRESET;
            return false;
        } else if (!CanTryAgain() || !WaitFor(descriptor, POLLIN, deadline)) {
            return false;
        }
    }
    return true;
}

}  // namespace

SockConnection::SockConnection(int descriptor) : fd(descriptor) {}

SockConnection::~SockConnection() {
    Close();
}

void SockConnection::Close() {
    if (fd >= 0) {
        close(fd);
        fd = -1;
    }
}

bool SockConnection::Send(const std::string& text) {
    if (text.size() > kLargestText) {
        errno = EMSGSIZE;
        return false;
    }
    std::array<char, kLengthSize> length;
    for (std::size_t place = 0; place < kLengthSize; ++place) {
        length[place] = static_cast<char>((std::uint64_t{text.size()} >> (8 * place)) & 0xFF);
    }
    const Deadline deadline(socketLimits.transfer);
    return SendAll(fd, length.data(), length.size(), deadline) && SendAll(fd, text.data(), text.size(), deadline);
}

bool SockConnection::Recv(std::string& text) {
    if (fd < 0) {
        // poll would wait for nothing until the time is up.
        errno = EBADF;
        return false;
    }
    if (!WaitFor(fd, POLLIN, Deadline(socketLimits.answer))) {
        return false;
    }
    const Deadline deadline(socketLimits.transfer);
    std::array<char, kLengthSize> bytes;
    if (!ReceiveAll(fd, bytes.data(), bytes.size(), deadline)) {
        return false;
    }
    std::uint64_t length = 0;
    for (std::size_t place = 0; place < kLengthSize; ++place) {
        length |= std::uint64_t{static_cast<unsigned char>(bytes[place])} << (8 * place);
    }
    if (length > kLargestText) {
        errno = EMSGSIZE;
        return false;
    }
    // The length is a claim: room is made for what arrives and not for what was announced.
    std::string received;
    while (received.size() < length) {
        const std::size_t begin = received.size();
        const std::size_t part = std::min<std::size_t>(kChunk, length - begin);
        received.resize(begin + part);
        if (!ReceiveAll(fd, received.data() + begin, part, deadline)) {
            return false;
        }
    }
    text.swap(received);
    return true;
}

DomainSockConnection::DomainSockConnection(const std::string& given) : path(given) {}

DomainSockConnection::~DomainSockConnection() = default;

bool DomainSockConnection::Connect() {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.empty() || path.size() >= sizeof(address.sun_path) || path.find('\0') != std::string::npos) {
        errno = ENAMETOOLONG;
        return false;
    }
    memcpy(address.sun_path, path.data(), path.size());
    Close();
    fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0) {
        return false;
    }
    // A full backlog makes a connect wait; this is the limit of that wait.
    const auto span = socketLimits.connect.count();
    const timeval limit{span / 1000, (span % 1000) * 1000};
    if (setsockopt(fd, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof(limit)) != 0 ||
        connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0) {
        const int error = errno == EAGAIN ? ETIMEDOUT : errno;
        Close();
        errno = error;
        return false;
    }
    return true;
}

}  // namespace zovadaemon
