// Takes the place of the C library's log functions: nothing reaches the machine's log, and what a client sent must have
// been made printable before it gets here.

#include <cstdarg>
#include <cstdio>

#include "Check.h"

namespace {

void CheckLine(const char* format, va_list arguments) {
    char line[4096];
    const int length = vsnprintf(line, sizeof(line), format, arguments);
    FUZZ_CHECK(length >= 0);
    for (const char* byte = line; *byte != '\0'; ++byte) {
        FUZZ_CHECK(static_cast<unsigned char>(*byte) >= 0x20 && *byte != 0x7f);
    }
}

}  // namespace

extern "C" {

void openlog(const char*, int, int) {}

void closelog() {}

void syslog(int, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    CheckLine(format, arguments);
    va_end(arguments);
}

void vsyslog(int, const char* format, va_list arguments) {
    CheckLine(format, arguments);
}

/** What a build with _FORTIFY_SOURCE calls. */
void __syslog_chk(int, int, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    CheckLine(format, arguments);
    va_end(arguments);
}

}  // extern "C"
