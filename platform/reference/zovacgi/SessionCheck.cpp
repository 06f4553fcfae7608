#include "zovacgi/SessionCheck.h"

#include "common/Accounts.h"
#include "common/NetAddress.h"
#include "zovacgi/SessionId.h"

namespace reference {

namespace {

bool IsSameAddress(std::string_view first, std::string_view second) {
    const auto left = NetAddress::Parse(first);
    const auto right = NetAddress::Parse(second);
    return left && right && *left == *right;
}

}  // namespace

bool HasTimedOut(const SessionStore::Entry& entry, int idleMinutes, time_t now) {
    const int minutes = entry.session.timeout > 0 ? entry.session.timeout : idleMinutes;
    return now - entry.used > static_cast<time_t>(minutes) * 60;
}

SessionVerdict JudgeSession(const SessionStore::Entry& entry, const SessionDemands& demands, time_t now) {
    const Session& session = entry.session;
    if (!IsInForce(session.user, session.uid)) {
        return kSessionInterrupted;
    }
    if (demands.checkIdle && !demands.allowTimeout && HasTimedOut(entry, demands.idleMinutes, now)) {
        return kSessionTimedOut;
    }
    if (demands.checkAddress && !session.skipCheckIp.value_or(false) &&
        !IsSameAddress(session.address, demands.address)) {
        return kSessionOtherAddress;
    }
    if (demands.checkToken && !session.token.empty() && !EqualSecrets(session.token, demands.token)) {
        return kSessionTokenMissing;
    }
    return kSessionGood;
}

}  // namespace reference
