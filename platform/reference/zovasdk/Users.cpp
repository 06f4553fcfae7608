#include <cstdlib>
#include <cstring>
#include <optional>

#include "Seam.h"
#include "common/Accounts.h"

int ZOVAUserGetUGID(const char* user, uid_t* uid, gid_t* gid) {
    if (user == nullptr || uid == nullptr || gid == nullptr) {
        return -1;
    }
    if (strcmp(user, reference::kSystemUser) == 0) {
        *uid = 0;
        *gid = 0;
        return 0;
    }
    const auto account = reference::FindAccount(user);
    if (!account) {
        return -1;
    }
    *uid = account->uid;
    *gid = account->gid;
    return 0;
}

int QLIBGroupIsAdminGroupMem(const char* user, int) {
    if (user == nullptr) {
        return -1;
    }
    const auto account = reference::FindAccount(user);
    return account && reference::IsInGroup(*account, reference::kAdministrators) ? 1 : 0;
}

int ZOVAUserGetByUID(uid_t uid, ZovaUserRecord** user) {
    const auto account = user == nullptr ? std::nullopt : reference::FindAccountOf(uid);
    if (!account || account->uid == 0) {
        return -1;
    }
    char* name = strdup(account->name.c_str());
    if (name == nullptr) {
        return -1;
    }
    *user = new ZovaUserRecord{name, account->uid, account->gid};
    return 0;
}

void ZOVAUserFree(ZovaUserRecord* user) {
    if (user != nullptr) {
        free(user->name);
        delete user;
    }
}
