#pragma once

#include <gtest/gtest.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "common/Descriptor.h"

/** Far above what any step takes; what does not come by then does not come. */
constexpr int kPatience = 30'000;

/** A connection to a unix socket; closed, with errno, if it is refused. */
inline host::Descriptor ConnectTo(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof(address.sun_path) - 1);
    host::Descriptor made(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    if (connect(made.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0) {
        made.Close();
    }
    return made;
}

/** What arrives until the end of the connection or, if given, of the line. Fails the test if that end does not come. */
inline std::string Read(int connection, bool onlyLine = false) {
    std::string text;
    pollfd wanted{connection, POLLIN, 0};
    for (;;) {
        if (poll(&wanted, 1, kPatience) <= 0) {
            ADD_FAILURE() << "the connection does not end; so far it brought: " << text;
            return text;
        }
        char byte;
        if (read(connection, &byte, 1) != 1 || (onlyLine && byte == '\n')) {
            return text;
        }
        text += byte;
    }
}

inline bool Write(int connection, const std::string& text) {
    return send(connection, text.data(), text.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(text.size());
}
