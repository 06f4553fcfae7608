#include "taskmanager/TaskTrust.h"

#include "common/Accounts.h"
#include "taskmanager/TaskKey.h"

namespace reference {

bool MayKeepTasks(uid_t user, const std::string& owner) {
    if (user == 0) {
        return true;
    }
    if (owner == kUsersOwner) {
        return FindAccountOf(user).has_value();
    }
    if (owner == kAdministratorsOwner) {
        const auto account = FindAccountOf(user);
        return account && IsInGroup(*account, kAdministrators);
    }
    const auto account = FindAccount(owner.c_str());
    return account && account->uid == user;
}

}  // namespace reference
