#include <cstring>

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
