#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

namespace reference {

struct Account {
    uid_t uid;
    gid_t gid;
    std::string name;
    std::string home;
};

/** The account in the system's user database. Nothing for an unknown one, and when the database cannot be asked. */
std::optional<Account> FindAccount(const char* name);

/** The account of a user id, likewise. */
std::optional<Account> FindAccountOf(uid_t uid);

struct Group {
    gid_t gid;
    std::vector<std::string> members;
};

std::optional<Group> FindGroup(const char* name);

/** Whether the group is the account's own or lists it. */
bool IsInGroup(const Account& account, const char* group);

/** Whether the account is locked or has expired by the shadow database; an account without an entry there is not. */
bool IsLockedAway(const char* name);

/**
 * Whether calls may still be made in the name of an account that was found with this user id before: it is there, the
 * same one, not locked away and not root's.
 */
bool IsInForce(const std::string& name, uid_t uid);

/** Name of the group whose members administer the device. */
constexpr const char* kAdministrators = "administrators";

/** Name that stands for root where the framework names users. No account may log in under it. */
constexpr const char* kSystemUser = "system";

}  // namespace reference
