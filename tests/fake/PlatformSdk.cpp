// libzovasdk.so.6 and libzovacredentials.so.6 on the fake platform.

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "Wrap.h"
#include "zovacredentials.h"
#include "zovasdk.h"

using fake::FakePlatform;
using fake::Shown;

namespace {

constexpr unsigned int kUnchanged = static_cast<unsigned int>(-1);

int PreferenceDir(const char* name, const std::map<std::string, std::string>& known, char* buffer, int size) {
    const auto found = known.find(name);
    if (found == known.end() || static_cast<int>(found->second.size()) >= size) {
        errno = ENOENT;
        return -1;
    }
    memcpy(buffer, found->second.c_str(), found->second.size() + 1);
    return 0;
}

}  // namespace

extern "C" {

int ZOVAFSMkdirP(const char* path, int unused, int keepMode, int uid, int gid, unsigned int mode) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__,
                        std::string(path) + ", " + std::to_string(unused) + ", " + std::to_string(keepMode) + ", " +
                            std::to_string(uid) + ", " + std::to_string(gid) + ", " + std::to_string(mode),
                        EACCES)) {
        return -1;
    }
    platform.directories.insert(path);
    return 0;
}

int ZOVAUserGetUGID(const char* user, uid_t* uid, gid_t* gid) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    const auto found = platform.users.find(user);
    if (!platform.Enter(__func__, user, ENOENT) || found == platform.users.end()) {
        return -1;
    }
    *uid = found->second.uid;
    *gid = found->second.gid;
    return 0;
}

int ZOVAUserPreferenceDirGet(const char* user, char* buffer, int size) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(user) + ", " + std::to_string(size), EIO)) {
        return -1;
    }
    return PreferenceDir(user, platform.userPreferenceDirs, buffer, size);
}

int ZOVAGroupPreferenceDirGet(const char* group, char* buffer, int size) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(group) + ", " + std::to_string(size), EIO)) {
        return -1;
    }
    return PreferenceDir(group, platform.groupPreferenceDirs, buffer, size);
}

int QLIBGroupIsAdminGroupMem(const char* user, int unused) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(user) + ", " + std::to_string(unused), EIO)) {
        return -1;
    }
    const auto found = platform.users.find(user);
    return found != platform.users.end() && found->second.admin ? 1 : 0;
}

int QLIBAppPrivUserHas(const char* user, const char* privilege, const char* address) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(user) + ", " + privilege + ", " + address, EIO)) {
        return 0;
    }
    return platform.appPrivileges.count({user, privilege, address}) != 0 ? 1 : 0;
}

int ZOVA_aa_has_profile_restricted() {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, "", 0);
    return platform.confined ? 1 : 0;
}

bool ResetCredentialsByName(const char* user, bool keep) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    fake::FakeProcess& process = platform.process;
    if (!platform.Enter(__func__, std::string(user) + (keep ? ", keep" : ", for good"), EPERM)) {
        return false;
    }
    const auto found = platform.users.find(user);
    if (found == platform.users.end() || process.user.effective != 0) {
        errno = found == platform.users.end() ? ENOENT : EPERM;
        return false;
    }
    const fake::User& target = found->second;
    if (process.SetGroups(target.groups) != 0) {
        return false;
    }
    if (platform.breakCredentials == fake::BreakCredentials::kAfterGroups) {
        errno = EPERM;
        return false;
    }
    const unsigned int gid = keep ? kUnchanged : target.gid;
    if (process.SetGroup(gid, target.gid, gid) != 0) {
        return false;
    }
    if (platform.breakCredentials == fake::BreakCredentials::kAfterGroup) {
        errno = EPERM;
        return false;
    }
    const unsigned int uid = keep ? kUnchanged : target.uid;
    return process.SetUser(uid, target.uid, uid) == 0;
}

bool InitCredentialsByExecutable(const char* path, int keep) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(path) + ", " + Shown(keep), EPERM)) {
        return false;
    }
    const auto found = platform.executableIdentities.find(path);
    if (found == platform.executableIdentities.end()) {
        return false;
    }
    const fake::User& target = platform.users.at(found->second);
    return platform.process.SetGroups(target.groups) == 0 &&
           platform.process.SetGroup(kUnchanged, target.gid, kUnchanged) == 0 &&
           platform.process.SetUser(kUnchanged, target.uid, kUnchanged) == 0;
}

int ZOVAUserGetByUID(uid_t uid, ZovaUserRecord** out) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, Shown(uid), EIO)) {
        return -1;
    }
    for (const auto& [name, user] : platform.users) {
        if (user.uid == uid) {
            *out = new ZovaUserRecord{strdup(name.c_str()), user.uid, user.gid};
            ++platform.userRecords;
            return 0;
        }
    }
    errno = ENOENT;
    return -1;
}

void ZOVAUserFree(ZovaUserRecord* user) {
    if (user != nullptr) {
        --FakePlatform::Required(__func__).userRecords;
        free(user->name);
        delete user;
    }
}

}  // extern "C"
