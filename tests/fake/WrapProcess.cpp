// Process, environment and confinement calls.

#include <fcntl.h>
#include <signal.h>
#include <sys/apparmor.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <ctime>
#include <new>

#include "ChildExit.h"
#include "Wrap.h"

using fake::FakePlatform;
using fake::Shown;

extern "C" {
pid_t __real_setsid();
int __real_prctl(int, unsigned long, unsigned long, unsigned long, unsigned long);
int __real_setenv(const char*, const char*, int);
pid_t __real_fork();
unsigned int __real_sleep(unsigned int);
void __real_exit(int) __attribute__((noreturn));
void __real__exit(int) __attribute__((noreturn));
int __real_kill(pid_t, int);
int __real_usleep(useconds_t);
int __real_pipe2(int*, int);
void* __real__ZnwmRKSt9nothrow_t(size_t, const std::nothrow_t&);
int __real_aa_change_hat(const char*, unsigned long);
time_t __real_time(time_t*);
void* __real_calloc(size_t, size_t);
}

namespace fake {

ChildExit*& CurrentChildExit() {
    static ChildExit* current = nullptr;
    return current;
}

}  // namespace fake

FAKE_EXPORT pid_t __wrap_setsid() {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_setsid();
    }
    if (!platform->Enter("setsid", "", EPERM)) {
        return -1;
    }
    return ++platform->process.sessionsLed;
}

FAKE_EXPORT int __wrap_prctl(int option, unsigned long value, unsigned long third, unsigned long fourth,
                             unsigned long fifth) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_prctl(option, value, third, fourth, fifth);
    }
    if (option != PR_SET_NAME) {
        fake::Unmodelled("prctl " + Shown(option));
    }
    const std::string name = reinterpret_cast<const char*>(value);
    if (!platform->Enter("prctl", name, EFAULT)) {
        return -1;
    }
    constexpr std::size_t kKernelNameSize = 15;
    platform->process.threadName = name.substr(0, kKernelNameSize);
    return 0;
}

FAKE_EXPORT int __wrap_setenv(const char* name, const char* value, int overwrite) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("setenv", std::string(name) + ", " + value, ENOMEM)) {
        return -1;
    }
    return __real_setenv(name, value, overwrite);
}

FAKE_EXPORT pid_t __wrap_fork() {
    if (FakePlatform::Active() != nullptr) {
        fake::Unmodelled("fork");
    }
    return __real_fork();
}

FAKE_EXPORT unsigned int __wrap_sleep(unsigned int seconds) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_sleep(seconds);
    }
    platform->Enter("sleep", Shown(seconds), 0);
    platform->process.secondsSlept += static_cast<int>(seconds);
    return 0;
}

FAKE_EXPORT void __wrap_exit(int status) {
    if (FakePlatform* platform = FakePlatform::Active()) {
        platform->Enter("exit", Shown(status), 0);
        if (platform->children.InChild()) {
            platform->children.Leave(*platform, status);
        }
        if (fake::ChildExit* child = fake::CurrentChildExit()) {
            child->Leave(status);
        }
    }
    __real_exit(status);
}

/** Only a child of `QLIBCProcForkEx` ends this way. */
FAKE_EXPORT void __wrap__exit(int status) {
    if (FakePlatform* platform = FakePlatform::Active()) {
        if (!platform->children.InChild()) {
            fake::Unmodelled("_exit outside a forked child");
        }
        platform->Enter("_exit", Shown(status), 0);
        platform->children.Leave(*platform, status);
    }
    __real__exit(status);
}

/** Only asks for the parent, which belongs to root. */
FAKE_EXPORT int __wrap_kill(pid_t process, int signal) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_kill(process, signal);
    }
    if (!platform->children.InChild() || process != platform->children.Parent() || signal != 0) {
        fake::Unmodelled("a signal to a process");
    }
    platform->Enter("kill", "parent, 0", 0);
    if (platform->parentPolls <= 0) {
        errno = ESRCH;
        return -1;
    }
    --platform->parentPolls;
    if (platform->process.user.effective != 0) {
        errno = EPERM;
        return -1;
    }
    return 0;
}

FAKE_EXPORT int __wrap_usleep(useconds_t microseconds) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_usleep(microseconds);
    }
    platform->Enter("usleep", Shown(microseconds), 0);
    return 0;
}

FAKE_EXPORT int __wrap_pipe2(int* ends, int flags) {
    FakePlatform* platform = FakePlatform::Active();
    const std::string kept = (flags & O_CLOEXEC) != 0 ? "" : "kept over exec";
    if (platform != nullptr && !platform->Enter("pipe2", kept, EMFILE)) {
        return -1;
    }
    return __real_pipe2(ends, flags);
}

/** The form of `operator new` that does not throw. */
FAKE_EXPORT void* __wrap__ZnwmRKSt9nothrow_t(size_t size, const std::nothrow_t& tag) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("new", "", ENOMEM)) {
        return nullptr;
    }
    return __real__ZnwmRKSt9nothrow_t(size, tag);
}

FAKE_EXPORT int __wrap_aa_change_hat(const char* name, unsigned long token) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_aa_change_hat(name, token);
    }
    return platform->Enter("aa_change_hat", Shown(name), EACCES) ? platform->process.ChangeHat(name, token) : -1;
}

FAKE_EXPORT time_t __wrap_time(time_t* out) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr || platform->clock < 0) {
        return __real_time(out);
    }
    platform->Enter("time", "", 0);
    if (out != nullptr) {
        *out = static_cast<time_t>(platform->clock);
    }
    return static_cast<time_t>(platform->clock);
}

FAKE_EXPORT void* __wrap_calloc(size_t count, size_t size) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("calloc", Shown(count) + ", " + Shown(size), ENOMEM)) {
        return nullptr;
    }
    return __real_calloc(count, size);
}
