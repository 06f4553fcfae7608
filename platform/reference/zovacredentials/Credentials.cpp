#include <grp.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string>
#include <string_view>
#include <vector>

#include "Seam.h"
#include "common/Accounts.h"

namespace {

struct Ids {
    unsigned int real;
    unsigned int effective;
    unsigned int saved;

    bool operator==(const Ids& other) const {
        return real == other.real && effective == other.effective && saved == other.saved;
    }
};

/** All that says who the process is. */
struct Identity {
    Ids user;
    Ids group;
    std::vector<gid_t> groups;
};

bool ReadGroups(std::vector<gid_t>& groups) {
    const int count = getgroups(0, nullptr);
    if (count < 0) {
        return false;
    }
    groups.resize(static_cast<size_t>(count));
    const int got = getgroups(count, groups.data());
    if (got < 0) {
        return false;
    }
    groups.resize(static_cast<size_t>(got));
    std::sort(groups.begin(), groups.end());
    groups.erase(std::unique(groups.begin(), groups.end()), groups.end());
    return true;
}

bool ReadIdentity(Identity& identity) {
    return getresuid(&identity.user.real, &identity.user.effective, &identity.user.saved) == 0 &&
           getresgid(&identity.group.real, &identity.group.effective, &identity.group.saved) == 0 &&
           ReadGroups(identity.groups);
}

/** The groups that a login of the account would have, sorted. */
bool ExpectedGroups(const reference::Account& account, std::vector<gid_t>& groups) {
    if (account.name == reference::kSystemUser) {
        groups.assign(1, account.gid);
        return true;
    }
    int count = 64;
    groups.resize(static_cast<size_t>(count));
    if (getgrouplist(account.name.c_str(), account.gid, groups.data(), &count) < 0) {
        groups.resize(static_cast<size_t>(count));
        if (getgrouplist(account.name.c_str(), account.gid, groups.data(), &count) < 0) {
            return false;
        }
    }
    groups.resize(static_cast<size_t>(count));
    std::sort(groups.begin(), groups.end());
    groups.erase(std::unique(groups.begin(), groups.end()), groups.end());
    return true;
}

constexpr unsigned int kUnchanged = static_cast<unsigned int>(-1);

/** Puts the identity back as far as the process still may; errno stays as it is. */
void RollBack(const Identity& before) {
    const int error = errno;
    if (setresuid(kUnchanged, 0, kUnchanged) == 0) {
        const bool groups = setgroups(before.groups.size(), before.groups.data()) == 0;
        const bool group = setresgid(before.group.real, before.group.effective, before.group.saved) == 0;
        // Root's rights without the groups that belong to it are still the state that the caller knows how to leave.
        if (groups && group) {
            static_cast<void>(setresuid(before.user.real, before.user.effective, before.user.saved) == 0);
        }
    }
    errno = error;
}

bool Change(const reference::Account& account, bool keep, const std::vector<gid_t>& groups) {
    if (setgroups(groups.size(), groups.data()) != 0) {
        return false;
    }
    const gid_t realGroup = keep ? kUnchanged : account.gid;
    const uid_t realUser = keep ? kUnchanged : account.uid;
    return setresgid(realGroup, account.gid, keep ? 0 : account.gid) == 0 &&
           setresuid(realUser, account.uid, keep ? 0 : account.uid) == 0;
}

bool HasTaken(const reference::Account& account, bool keep, const Identity& before, const std::vector<gid_t>& groups) {
    Identity now;
    if (!ReadIdentity(now)) {
        return false;
    }
    const Ids user = keep ? Ids{before.user.real, account.uid, 0} : Ids{account.uid, account.uid, account.uid};
    const Ids group = keep ? Ids{before.group.real, account.gid, 0} : Ids{account.gid, account.gid, account.gid};
    return now.user == user && now.group == group && now.groups == groups;
}

/** Proves that no id of root can be had again. */
bool IsWayBackClosed(const reference::Account& account) {
    if (account.uid == 0) {
        return true;
    }
    if (setresuid(kUnchanged, 0, kUnchanged) == 0 || setresuid(0, kUnchanged, kUnchanged) == 0) {
        return false;
    }
    return account.gid == 0 || (setresgid(kUnchanged, 0, kUnchanged) != 0 && setresgid(0, kUnchanged, kUnchanged) != 0);
}

}  // namespace

bool ResetCredentialsByName(const char* user, bool keep) {
    if (user == nullptr) {
        errno = EINVAL;
        return false;
    }
    const bool isSystem = strcmp(user, reference::kSystemUser) == 0;
    // Root with root's group alone: the name stands for the device itself, so the user database has no say in it.
    const auto account =
        isSystem ? std::optional(reference::Account{0, 0, reference::kSystemUser, "/"}) : reference::FindAccount(user);
    if (!account) {
        errno = ENOENT;
        return false;
    }
    Identity before;
    std::vector<gid_t> groups;
    if (!ReadIdentity(before) || !ExpectedGroups(*account, groups)) {
        return false;
    }
    if (before.user.effective != 0) {
        errno = EPERM;
        return false;
    }
    if (Change(*account, keep, groups) && HasTaken(*account, keep, before, groups) &&
        (keep || IsWayBackClosed(*account))) {
        return true;
    }
    RollBack(before);
    return false;
}

bool InitCredentialsByExecutable(const char* path, int keep) {
    const std::string_view file = path == nullptr ? "" : path;
    const std::string_view name = file.substr(file.rfind('/') + 1);
    const std::string_view stem = name.substr(0, name.rfind('.'));
    // The account named as the file is: the file's own owner is root, or the file could not be trusted.
    return !stem.empty() && stem != reference::kSystemUser &&
           ResetCredentialsByName(std::string(stem).c_str(), keep != 0);
}
