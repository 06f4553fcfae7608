#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace package {

/** One entry of the user database. */
struct Account {
    std::string name;
    uid_t uid = 0;
    gid_t gid = 0;
    std::string home;
    std::string shell;
    /** The full name: the first field of the entry's comment. */
    std::string description;
};

enum class AccountResult { kFound, kNone, kFailed };

/** Whether the text can be an account's name: 1 to 255 bytes, no control byte, ":" or "/", and no "-" at its front. */
bool IsAccountName(const std::string& name);

/** Looks up one account. `out` is written only if it was found. */
AccountResult FindAccount(const std::string& name, Account& out);

/**
 * All accounts that the user database lists, by user id and then name.
 * @return false if the database could not be read; `out` is then left alone.
 */
bool ListAccounts(std::vector<Account>& out);

}  // namespace package
