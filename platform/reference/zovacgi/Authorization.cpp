#include <cstdlib>
#include <cstring>
#include <ctime>

#include "Seam.h"
#include "common/Accounts.h"
#include "zovacgi/CgiState.h"
#include "zovacgi/ClientAddress.h"
#include "zovacgi/SessionCheck.h"

using reference::CgiState;
using reference::SessionStore;

namespace {

/** User of the session that was authorised last: a method asks for it after it has lost the right to read the store. */
struct Authorized {
    char sid[65];
    uid_t uid;
};
Authorized lastAuthorized;

void Remember(const char* sid, uid_t uid) {
    strncpy(lastAuthorized.sid, sid, sizeof(lastAuthorized.sid) - 1);
    lastAuthorized.uid = uid;
}

std::optional<std::string> UnlessEmpty(const std::string& text) {
    return text.empty() ? std::nullopt : std::optional(text);
}

void LoadOptions(const reference::Session& session, CgiState& state) {
    state.skipCheckIp.reset();
    if (session.skipCheckIp) {
        state.skipCheckIp = std::string(1, *session.skipCheckIp ? '1' : '0');
    }
    state.webapi = UnlessEmpty(session.webapi);
    state.app = UnlessEmpty(session.app);
    state.timeout = session.timeout > 0 ? std::optional(std::to_string(session.timeout)) : std::nullopt;
}

reference::SessionVerdict Judge(const ZovaCgi& cgi, const SessionStore::Entry& entry,
                                const ZovaCgiAuthOptions& options) {
    reference::SessionDemands demands;
    demands.checkIdle = (options.flags & ZOVA_CGI_AUTH_IDLE) != 0;
    demands.allowTimeout = options.allowTimeout != 0;
    demands.idleMinutes = cgi.timeout > 0 ? cgi.timeout : 0;
    demands.checkAddress = (options.flags & ZOVA_CGI_AUTH_ADDRESS) != 0 && cgi.skipCheckIP == 0;
    demands.checkToken = (options.flags & ZOVA_CGI_AUTH_TOKEN) != 0;
    const std::string address = demands.checkAddress ? reference::ClientAddressOfRequest() : std::string();
    demands.address = address;
    const char* token = getenv("HTTP_X_ZOVA_TOKEN");
    demands.token = token != nullptr ? token : "";
    return reference::JudgeSession(entry, demands, time(nullptr));
}

reference::SessionVerdict VerdictOf(SessionStore::Result result) {
    switch (result) {
        case SessionStore::Result::kGood:
            return reference::kSessionGood;
        case SessionStore::Result::kUnknown:
            return reference::kSessionUnknown;
        case SessionStore::Result::kBroken:
            break;
    }
    return reference::kSessionBroken;
}

bool ReplaceText(char*& text, const std::string& other) {
    char* copy = strdup(other.c_str());
    if (copy == nullptr) {
        return false;
    }
    free(text);
    text = copy;
    return true;
}

/** A session that ran out is not brought back to life by a call that is let through all the same. */
reference::SessionVerdict Renew(const ZovaCgi& cgi, const SessionStore::Entry& entry, const char* sid) {
    if (reference::HasTimedOut(entry, cgi.timeout, time(nullptr))) {
        return reference::kSessionGood;
    }
    return VerdictOf(SessionStore::Renew(sid));
}

}  // namespace

int ZovaCgiIsAuthorizedEx(ZovaCgi* cgi, const char* sid, char* user, int userSize, const ZovaCgiAuthOptions* options,
                          int) {
    if (cgi == nullptr || sid == nullptr || user == nullptr || userSize <= 0 || options == nullptr) {
        return reference::kSessionBroken;
    }
    user[0] = '\0';
    CgiState& state = CgiState::Of(*cgi);
    reference::SessionVerdict verdict = VerdictOf(state.Find(sid));
    if (verdict != reference::kSessionGood) {
        return verdict;
    }
    const SessionStore::Entry& entry = state.Found();
    verdict = Judge(*cgi, entry, *options);
    if (verdict == reference::kSessionGood && (options->flags & ZOVA_CGI_AUTH_REFRESH) != 0) {
        verdict = Renew(*cgi, entry, sid);
    }
    if (verdict != reference::kSessionGood) {
        return verdict;
    }
    const std::string& name = entry.session.user;
    if (name.size() >= static_cast<size_t>(userSize) || !ReplaceText(cgi->sessFile, SessionStore::PathOf(sid))) {
        return reference::kSessionBroken;
    }
    memcpy(user, name.c_str(), name.size() + 1);
    Remember(sid, entry.session.uid);
    if ((options->flags & ZOVA_CGI_AUTH_LOAD) != 0) {
        LoadOptions(entry.session, state);
    }
    return verdict;
}

unsigned int ZovaCgiUIDGet(const char* sid) {
    constexpr auto kNobody = static_cast<unsigned int>(-1);
    if (sid == nullptr || *sid == '\0') {
        return kNobody;
    }
    if (strcmp(sid, lastAuthorized.sid) == 0) {
        return lastAuthorized.uid;
    }
    SessionStore::Entry entry;
    if (SessionStore::Load(sid, entry) != SessionStore::Result::kGood) {
        return kNobody;
    }
    const auto account = reference::FindAccount(entry.session.user.c_str());
    return account && account->uid == entry.session.uid ? account->uid : kNobody;
}
