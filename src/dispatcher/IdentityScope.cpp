#include "dispatcher/IdentityScope.h"

#include <grp.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "base/ErrnoGuard.h"
#include "base/Log.h"
#include "zovacredentials.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr int kUnchanged = -1;

void LogGain(const char* what, int real, int effective, int saved) {
    base::ErrnoGuard errnoGuard;
    WEBAPI_LOG(LOG_AUTH | LOG_INFO, "WARNING: set%s(%d, %d, %d)", what, real, effective, saved);
}

void LogRefusal(const char* what, int real, int effective, int saved) {
    base::ErrnoGuard errnoGuard;
    char text[1024] = "";
    const char* reason = strerror_r(errno, text, sizeof(text));
    WEBAPI_LOG(LOG_AUTH | LOG_ERR, "ERROR: set%s(%d, %d, %d) [%s]", what, real, effective, saved, reason);
}

bool GainRootUser() {
    if (setresuid(kUnchanged, 0, kUnchanged) != 0) {
        LogRefusal("resuid", kUnchanged, 0, kUnchanged);
        return false;
    }
    LogGain("resuid", kUnchanged, 0, kUnchanged);
    return true;
}

bool GainRootGroup() {
    if (setresgid(kUnchanged, 0, kUnchanged) != 0) {
        LogRefusal("resgid", kUnchanged, 0, kUnchanged);
        return false;
    }
    LogGain("resgid", kUnchanged, 0, kUnchanged);
    return true;
}

/** Whether real, effective and saved ids are one: what a change without a way back has to leave. */
bool IsLasting() {
    uid_t realUser = 0;
    uid_t effectiveUser = 0;
    uid_t savedUser = 0;
    gid_t realGroup = 0;
    gid_t effectiveGroup = 0;
    gid_t savedGroup = 0;
    return getresuid(&realUser, &effectiveUser, &savedUser) == 0 && realUser == effectiveUser &&
           savedUser == effectiveUser && getresgid(&realGroup, &effectiveGroup, &savedGroup) == 0 &&
           realGroup == effectiveGroup && savedGroup == effectiveGroup;
}

}  // namespace

bool ResetIdentity(const std::string& user, bool keep) {
    if (!GainRootUser()) {
        uid_t uid = 0;
        gid_t gid = 0;
        if (ZOVAUserGetUGID(user.c_str(), &uid, &gid) == 0 && uid == geteuid() && gid == getegid()) {
            return keep || IsLasting();
        }
    }
    return ResetCredentialsByName(user.c_str(), keep) && (keep || IsLasting());
}

bool IdentityScope::Save() {
    if (getresgid(&realGroup, &effectiveGroup, &savedGroup) != 0 ||
        getresuid(&realUser, &effectiveUser, &savedUser) != 0) {
        return false;
    }
    const int count = getgroups(0, nullptr);
    if (count < 0) {
        return false;
    }
    groups.resize(static_cast<std::size_t>(count));
    return count == 0 || getgroups(count, groups.data()) == count;
}

bool IdentityScope::BecomeEffectiveRoot() {
    if (effectiveGroup != 0 && !GainRootGroup()) {
        return false;
    }
    return effectiveUser == 0 || GainRootUser();
}

void IdentityScope::Restore() {
    bool root = true;
    if (getegid() != 0 && !GainRootGroup()) {
        WEBAPI_LOG(LOG_ERR, "set eid to root failed [%m]");
        root = false;
    }
    if (root && geteuid() != 0 && !GainRootUser()) {
        WEBAPI_LOG(LOG_ERR, "set eid to root failed [%m]");
    }
    if (geteuid() == 0 && setgroups(groups.size(), groups.data()) != 0) {
        WEBAPI_LOG(LOG_AUTH | LOG_ERR, "ERROR: setgroups(%zu) [%m]", groups.size());
    }
    RestoreIds();
}

void IdentityScope::RestoreKept() {
    RestoreIds();
    std::vector<gid_t> now(groups.size());
    const int count = getgroups(0, nullptr);
    const bool same =
        count == static_cast<int>(groups.size()) && getgroups(count, now.data()) == count && now == groups;
    if (!same && setgroups(groups.size(), groups.data()) != 0) {
        WEBAPI_LOG(LOG_AUTH | LOG_ERR, "ERROR: setgroups(%zu) [%m]", groups.size());
    }
}

void IdentityScope::RestoreIds() {
    const int group[] = {static_cast<int>(realGroup), static_cast<int>(effectiveGroup), static_cast<int>(savedGroup)};
    if (setresgid(realGroup, effectiveGroup, savedGroup) != 0) {
        LogRefusal("resgid", group[0], group[1], group[2]);
    } else if (effectiveGroup == 0) {
        LogGain("resgid", group[0], group[1], group[2]);
    }
    const int user[] = {static_cast<int>(realUser), static_cast<int>(effectiveUser), static_cast<int>(savedUser)};
    if (setresuid(realUser, effectiveUser, savedUser) != 0) {
        LogRefusal("resuid", user[0], user[1], user[2]);
    } else if (effectiveUser == 0) {
        LogGain("resuid", user[0], user[1], user[2]);
    }
}

}  // namespace ZOVA
