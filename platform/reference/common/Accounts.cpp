#include "common/Accounts.h"

#include <grp.h>
#include <pwd.h>
#include <shadow.h>

#include <cerrno>
#include <ctime>

namespace reference {

namespace {

/** Calls `query(buffer, size)`, which answers as the re-entrant database functions do, with a buffer that fits. */
template <typename Query>
bool WithBuffer(Query query) {
    constexpr size_t kLargest = 1 << 22;
    std::vector<char> buffer(1024);
    int error;
    while ((error = query(buffer.data(), buffer.size())) == ERANGE && buffer.size() < kLargest) {
        buffer.resize(buffer.size() * 4);
    }
    return error == 0;
}

template <typename Query>
std::optional<Account> QueryAccount(Query query) {
    std::optional<Account> account;
    const bool asked = WithBuffer([&](char* buffer, size_t size) {
        struct passwd entry;
        struct passwd* found = nullptr;
        const int error = query(&entry, buffer, size, &found);
        if (error == 0 && found != nullptr) {
            account = Account{entry.pw_uid, entry.pw_gid, entry.pw_name, entry.pw_dir};
        }
        return error;
    });
    return asked ? account : std::nullopt;
}

}  // namespace

std::optional<Account> FindAccount(const char* name) {
    if (name == nullptr || *name == '\0') {
        return std::nullopt;
    }
    return QueryAccount([name](struct passwd* entry, char* buffer, size_t size, struct passwd** found) {
        return getpwnam_r(name, entry, buffer, size, found);
    });
}

std::optional<Account> FindAccountOf(uid_t uid) {
    return QueryAccount([uid](struct passwd* entry, char* buffer, size_t size, struct passwd** found) {
        return getpwuid_r(uid, entry, buffer, size, found);
    });
}

std::optional<Group> FindGroup(const char* name) {
    std::optional<Group> group;
    if (name == nullptr || *name == '\0') {
        return group;
    }
    const bool asked = WithBuffer([&](char* buffer, size_t size) {
        struct group entry;
        struct group* found = nullptr;
        const int error = getgrnam_r(name, &entry, buffer, size, &found);
        if (error == 0 && found != nullptr) {
            group = Group{entry.gr_gid, {}};
            for (char** member = entry.gr_mem; *member != nullptr; ++member) {
                group->members.emplace_back(*member);
            }
        }
        return error;
    });
    return asked ? group : std::nullopt;
}

bool IsInGroup(const Account& account, const char* name) {
    const auto group = FindGroup(name);
    if (!group) {
        return false;
    }
    if (group->gid == account.gid) {
        return true;
    }
    for (const std::string& member : group->members) {
        if (member == account.name) {
            return true;
        }
    }
    return false;
}

bool IsLockedAway(const char* name) {
    bool locked = false;
    WithBuffer([&](char* buffer, size_t size) {
        struct spwd entry;
        struct spwd* found = nullptr;
        const int error = getspnam_r(name, &entry, buffer, size, &found);
        if (error == 0 && found != nullptr) {
            constexpr time_t kDay = 86400;
            locked = entry.sp_pwdp[0] == '!' || (entry.sp_expire > 0 && entry.sp_expire <= time(nullptr) / kDay);
        }
        return error;
    });
    return locked;
}

bool IsInForce(const std::string& name, uid_t uid) {
    const auto account = FindAccount(name.c_str());
    return account && account->uid == uid && account->uid != 0 && name != kSystemUser && !IsLockedAway(name.c_str());
}

}  // namespace reference
