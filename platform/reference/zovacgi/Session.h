#pragma once

#include <sys/types.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace reference {

/** Longest user name, in bytes: what the buffers of the framework hold. */
constexpr size_t kLongestUserName = 492;

/** What a session file says. */
struct Session {
    std::string user;
    uid_t uid = 0;
    /** Client address at login, or "". */
    std::string address;
    /** Seconds since the epoch. */
    int64_t created = 0;
    /** The token that each call must bring, or "". */
    std::string token;
    std::string app;
    std::string webapi;
    /** Nothing: as configured. */
    std::optional<bool> skipCheckIp;
    /** Idle time in minutes; 0: as configured. */
    int timeout = 0;
};

/** Reads the text of a session file. Never throws. False unless all members are there and in range. */
bool ParseSession(std::string_view text, Session& session);

std::string WriteSession(const Session& session);

}  // namespace reference
