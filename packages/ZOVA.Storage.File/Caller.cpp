#include "Caller.h"

#include <errno.h>
#include <grp.h>
#include <pwd.h>
#include <string.h>
#include <syslog.h>
#include <unistd.h>
#include <webapi/Json.h>

#include <algorithm>
#include <optional>

#include "../common/DeviceFolder.h"
#include "../common/PlatformIdentity.h"
#include "../common/PlatformSharedPath.h"
#include "../common/PrivateFile.h"
#include "ClientPath.h"
#include "SharedFolders.h"

namespace package {
namespace {

constexpr char kTable[] = "shared-folders.json";
constexpr std::size_t kLongestTable = std::size_t{256} << 10;
constexpr std::size_t kRecordSize = std::size_t{64} << 10;
constexpr int kMostGroups = 65536;
constexpr char kHome[] = "home";

Caller& Current() {
    static Caller caller;
    return caller;
}

/** What the user database says of an account. */
struct Account {
    std::string name;
    std::string home;
    uid_t uid = 0;
    gid_t gid = 0;
};

std::optional<Account> FindAccount(const std::string& user) {
    std::vector<char> buffer(kRecordSize);
    passwd record = {};
    passwd* found = nullptr;
    if (user.empty() || user.find('\0') != std::string::npos ||
        getpwnam_r(user.c_str(), &record, buffer.data(), buffer.size(), &found) != 0 || found == nullptr) {
        return std::nullopt;
    }
    return Account{record.pw_name, record.pw_dir == nullptr ? "" : record.pw_dir, record.pw_uid, record.pw_gid};
}

std::vector<gid_t> GroupsOf(const Account& account) {
    int count = 64;
    std::vector<gid_t> groups(static_cast<std::size_t>(count));
    while (getgrouplist(account.name.c_str(), account.gid, groups.data(), &count) < 0) {
        if (count > kMostGroups) {
            return {};
        }
        groups.resize(static_cast<std::size_t>(count));
    }
    groups.resize(static_cast<std::size_t>(count));
    return groups;
}

bool IsMember(const std::vector<gid_t>& groups, const std::string& name) {
    // A group's record lists its members.
    for (std::size_t size = kRecordSize; size <= kRecordSize * 64; size *= 4) {
        std::vector<char> buffer(size);
        group record = {};
        group* found = nullptr;
        const int problem = getgrnam_r(name.c_str(), &record, buffer.data(), buffer.size(), &found);
        if (problem != ERANGE) {
            return problem == 0 && found != nullptr &&
                   std::find(groups.begin(), groups.end(), record.gr_gid) != groups.end();
        }
    }
    return false;
}

bool Names(const AccessList& list, const Account& account, const std::vector<gid_t>& groups) {
    return std::find(list.users.begin(), list.users.end(), account.name) != list.users.end() ||
           std::any_of(list.groups.begin(), list.groups.end(),
                       [&](const std::string& name) { return IsMember(groups, name); });
}

/** nullopt, and a line in the log, if there is a table that cannot be used. */
std::optional<std::vector<SharedFolder>> ReadTable() {
    std::string text;
    const PrivateFileResult result = ReadPrivateFile(DeviceFolder(), kTable, kLongestTable, text);
    if (result == PrivateFileResult::kMissing) {
        return std::vector<SharedFolder>();
    }
    Json::Value table;
    if (result == PrivateFileResult::kDone && Json::fromString(table, text)) {
        if (auto folders = ParseSharedFolders(table)) {
            return folders;
        }
    }
    syslog(LOG_ERR, "%s/%s cannot be used: %s", DeviceFolder(), kTable,
           result == PrivateFileResult::kFailed      ? strerror(errno)
           : result == PrivateFileResult::kUntrusted ? "not root's alone, or too long"
                                                     : "not of the form that it must have");
    return std::nullopt;
}

}  // namespace

bool FindCaller(const std::string& user, Caller& out) {
    const auto account = FindAccount(user);
    if (!account || account->uid == 0) {
        return false;
    }
    out = Caller();
    out.user = account->name;
    out.uid = account->uid;
    if (IsClientPath(account->home) && account->home != kTopPath) {
        out.folders.push_back({kHome, account->home, true});
    }
    const auto table = ReadTable();
    out.isTableGood = table.has_value();
    if (!table || table->empty()) {
        return true;
    }
    const std::vector<gid_t> groups = GroupsOf(*account);
    for (const SharedFolder& folder : *table) {
        const bool writable = Names(folder.write, *account, groups);
        if (writable || Names(folder.read, *account, groups)) {
            out.folders.push_back({folder.name, folder.path, writable});
        }
    }
    return true;
}

bool PrepareCall(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const bool visits = request->IsSharing();
    const ZOVA::sharing::record::Entry link = request->GetSharingEntry();
    Caller& caller = Current();
    // An account of the owner's name that is another one by now has nothing to do with the link.
    if (FindCaller(visits ? link.ownerName : request->GetLoginUserName(), caller) &&
        (!visits || caller.uid == link.ownerUid)) {
        return true;
    }
    caller = Caller();
    response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
    return false;
}

const Caller& CurrentCaller() {
    return Current();
}

bool TakeIdentity(const Caller& caller) {
    return caller.uid != 0 && ResetCredentialsByName(caller.user.c_str(), false) && geteuid() == caller.uid;
}

}  // namespace package
