#include "Account.h"

#include <errno.h>
#include <pwd.h>

#include <algorithm>
#include <cstddef>
#include <tuple>
#include <utility>

#include "../common/Text.h"

namespace package {
namespace {

constexpr std::size_t kLongestName = 255;
constexpr std::size_t kFirstBuffer = 4096;
constexpr std::size_t kLargestBuffer = 1 << 20;

std::string Text(const char* text) {
    return text != nullptr ? text : "";
}

Account FromEntry(const passwd& entry) {
    Account account;
    account.name = Text(entry.pw_name);
    account.uid = entry.pw_uid;
    account.gid = entry.pw_gid;
    account.home = Text(entry.pw_dir);
    account.shell = Text(entry.pw_shell);
    const std::string comment = Text(entry.pw_gecos);
    account.description = comment.substr(0, comment.find(','));
    return account;
}

/** The errors by which the user database says that it knows no such name. */
bool MeansUnknown(int error) {
    return error == 0 || error == ENOENT || error == ESRCH;
}

}  // namespace

bool IsAccountName(const std::string& name) {
    return !name.empty() && name.size() <= kLongestName && name.front() != '-' && !HasControlBytes(name) &&
           name.find_first_of(":/") == std::string::npos;
}

AccountResult FindAccount(const std::string& name, Account& out) {
    for (std::size_t size = kFirstBuffer; size <= kLargestBuffer; size *= 4) {
        std::vector<char> buffer(size);
        passwd entry = {};
        passwd* found = nullptr;
        const int error = getpwnam_r(name.c_str(), &entry, buffer.data(), buffer.size(), &found);
        if (found != nullptr) {
            out = FromEntry(*found);
            return AccountResult::kFound;
        }
        if (error != ERANGE) {
            return MeansUnknown(error) ? AccountResult::kNone : AccountResult::kFailed;
        }
    }
    return AccountResult::kFailed;
}

bool ListAccounts(std::vector<Account>& out) {
    std::vector<Account> accounts;
    setpwent();
    errno = 0;
    while (const passwd* entry = getpwent()) {
        accounts.push_back(FromEntry(*entry));
        errno = 0;
    }
    const int error = errno;
    endpwent();
    if (!MeansUnknown(error)) {
        return false;
    }
    std::stable_sort(accounts.begin(), accounts.end(), [](const Account& left, const Account& right) {
        return std::tie(left.uid, left.name) < std::tie(right.uid, right.name);
    });
    out = std::move(accounts);
    return true;
}

}  // namespace package
