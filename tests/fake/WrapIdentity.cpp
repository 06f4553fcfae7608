// Identity and scheduling calls, on the fake process.

#include <grp.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "Wrap.h"

using fake::FakePlatform;
using fake::Shown;

extern "C" {
int __real_setresuid(uid_t, uid_t, uid_t);
int __real_setresgid(gid_t, gid_t, gid_t);
int __real_setgroups(size_t, const gid_t*);
int __real_getgroups(int, gid_t*);
int __real_getresuid(uid_t*, uid_t*, uid_t*);
int __real_getresgid(gid_t*, gid_t*, gid_t*);
uid_t __real_getuid();
uid_t __real_geteuid();
gid_t __real_getgid();
gid_t __real_getegid();
int __real_getpriority(int, id_t);
int __real_setpriority(int, id_t, int);
}

namespace {

/** An id as the caller wrote it: -1 for "unchanged". */
std::string ShownIds(unsigned int real, unsigned int effective, unsigned int saved) {
    return Shown(static_cast<int>(real)) + ", " + Shown(static_cast<int>(effective)) + ", " +
           Shown(static_cast<int>(saved));
}

}  // namespace

FAKE_EXPORT int __wrap_setresuid(uid_t real, uid_t effective, uid_t saved) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_setresuid(real, effective, saved);
    }
    return platform->Enter("setresuid", ShownIds(real, effective, saved), EPERM)
               ? platform->process.SetUser(real, effective, saved)
               : -1;
}

FAKE_EXPORT int __wrap_setresgid(gid_t real, gid_t effective, gid_t saved) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_setresgid(real, effective, saved);
    }
    return platform->Enter("setresgid", ShownIds(real, effective, saved), EPERM)
               ? platform->process.SetGroup(real, effective, saved)
               : -1;
}

FAKE_EXPORT int __wrap_setgroups(size_t count, const gid_t* list) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_setgroups(count, list);
    }
    std::string shown;
    for (size_t i = 0; i < count; ++i) {
        shown += (i == 0 ? "" : ", ") + Shown(list[i]);
    }
    return platform->Enter("setgroups", shown, EPERM) ? platform->process.SetGroups({list, list + count}) : -1;
}

FAKE_EXPORT int __wrap_getgroups(int size, gid_t* list) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_getgroups(size, list);
    }
    if (!platform->Enter("getgroups", Shown(size), EINVAL)) {
        return -1;
    }
    const std::vector<gid_t>& groups = platform->process.groups;
    const int count = static_cast<int>(groups.size());
    if (size != 0 && size < count) {
        errno = EINVAL;
        return -1;
    }
    if (size != 0) {
        std::copy(groups.begin(), groups.end(), list);
    }
    return count;
}

FAKE_EXPORT int __wrap_getresuid(uid_t* real, uid_t* effective, uid_t* saved) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_getresuid(real, effective, saved);
    }
    if (!platform->Enter("getresuid", "", EFAULT)) {
        return -1;
    }
    *real = platform->process.user.real;
    *effective = platform->process.user.effective;
    *saved = platform->process.user.saved;
    return 0;
}

FAKE_EXPORT int __wrap_getresgid(gid_t* real, gid_t* effective, gid_t* saved) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_getresgid(real, effective, saved);
    }
    if (!platform->Enter("getresgid", "", EFAULT)) {
        return -1;
    }
    *real = platform->process.group.real;
    *effective = platform->process.group.effective;
    *saved = platform->process.group.saved;
    return 0;
}

FAKE_EXPORT uid_t __wrap_getuid() {
    FakePlatform* platform = FakePlatform::Active();
    return platform == nullptr ? __real_getuid() : platform->process.user.real;
}

FAKE_EXPORT uid_t __wrap_geteuid() {
    FakePlatform* platform = FakePlatform::Active();
    return platform == nullptr ? __real_geteuid() : platform->process.user.effective;
}

FAKE_EXPORT gid_t __wrap_getgid() {
    FakePlatform* platform = FakePlatform::Active();
    return platform == nullptr ? __real_getgid() : platform->process.group.real;
}

FAKE_EXPORT gid_t __wrap_getegid() {
    FakePlatform* platform = FakePlatform::Active();
    return platform == nullptr ? __real_getegid() : platform->process.group.effective;
}

FAKE_EXPORT int __wrap_getpriority(int which, id_t who) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_getpriority(which, who);
    }
    if (which != PRIO_PROCESS || who != 0) {
        fake::Unmodelled("the nice value of another process");
    }
    return platform->Enter("getpriority", "", ESRCH) ? platform->process.nice : -1;
}

FAKE_EXPORT int __wrap_setpriority(int which, id_t who, int value) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_setpriority(which, who, value);
    }
    if (which != PRIO_PROCESS || who != 0) {
        fake::Unmodelled("the nice value of another process");
    }
    return platform->Enter("setpriority", Shown(value), EACCES) ? platform->process.SetNice(value) : -1;
}

// Calls that change the identity in ways the framework has no use for.

#define FAKE_REFUSES(name, parameters)           \
    FAKE_EXPORT int __wrap_##name parameters {   \
        if (FakePlatform::Active() != nullptr) { \
            fake::Unmodelled(#name);             \
        }                                        \
        errno = ENOSYS;                          \
        return -1;                               \
    }

FAKE_REFUSES(setuid, (uid_t))
FAKE_REFUSES(setgid, (gid_t))
FAKE_REFUSES(seteuid, (uid_t))
FAKE_REFUSES(setegid, (gid_t))
FAKE_REFUSES(setreuid, (uid_t, uid_t))
FAKE_REFUSES(setregid, (gid_t, gid_t))
FAKE_REFUSES(initgroups, (const char*, gid_t))
