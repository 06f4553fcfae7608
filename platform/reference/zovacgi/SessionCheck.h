#pragma once

#include <ctime>
#include <string_view>

#include "zovacgi/SessionStore.h"

namespace reference {

/** Authorisation results. */
enum SessionVerdict : int {
    kSessionGood = 1,
    kSessionTimedOut = -1,
    kSessionBroken = -2,
    kSessionInterrupted = -3,
    kSessionUnknown = -5,
    kSessionTokenMissing = -7,
    kSessionOtherAddress = -8,
};

/** What a session is checked against. */
struct SessionDemands {
    bool checkIdle = true;
    bool allowTimeout = false;
    /** Idle time where the session has none of its own, in minutes. */
    int idleMinutes = 0;
    bool checkAddress = true;
    std::string_view address;
    bool checkToken = true;
    std::string_view token;
};

/** Whether the idle time has run out at `now`. */
bool HasTimedOut(const SessionStore::Entry& entry, int idleMinutes, time_t now);

/** The verdict on a session that was loaded: its account, idle time, address and token, in this order. */
SessionVerdict JudgeSession(const SessionStore::Entry& entry, const SessionDemands& demands, time_t now);

}  // namespace reference
