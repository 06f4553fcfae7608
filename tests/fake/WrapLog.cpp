// Syslog, into the fake process's log.

#include <syslog.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>

#include "Wrap.h"

using fake::FakePlatform;
using fake::Shown;

extern "C" {
void __real_openlog(const char*, int, int);
void __real_closelog();
}

namespace {

void Log(int priority, const char* format, va_list arguments) {
    const int error = errno;
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        errno = error;
        vsyslog(priority, format, arguments);
        return;
    }
    char text[8192];
    errno = error;
    vsnprintf(text, sizeof(text), format, arguments);
    platform->process.Log(priority, text, error);
    // As the real one does where the log daemon cannot be reached: what comes after must not count on `errno`.
    errno = ENOTCONN;
}

}  // namespace

FAKE_EXPORT void __wrap_syslog(int priority, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    Log(priority, format, arguments);
    va_end(arguments);
}

FAKE_EXPORT void __wrap___syslog_chk(int priority, int, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    Log(priority, format, arguments);
    va_end(arguments);
}

FAKE_EXPORT void __wrap_openlog(const char* ident, int options, int facility) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        __real_openlog(ident, options, facility);
        return;
    }
    platform->Enter("openlog", Shown(ident) + ", " + Shown(options) + ", " + Shown(facility), 0);
    platform->process.ident = Shown(ident);
}

FAKE_EXPORT void __wrap_closelog() {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        __real_closelog();
        return;
    }
    platform->Enter("closelog", "", 0);
}
