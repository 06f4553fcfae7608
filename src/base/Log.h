#pragma once

#include <syslog.h>

namespace ZOVA::base {

/** The file's name without its folders, worked out by the compiler. */
constexpr const char* SourceName(const char* path) {
    const char* name = path;
    for (const char* c = path; *c != '\0'; ++c) {
        if (*c == '/') {
            name = c + 1;
        }
    }
    return name;
}

}  // namespace ZOVA::base

/**
 * One line to syslog that names its source and line first. `errno` is still the caller's when "%m" is expanded. The
 * text must be a literal; client bytes among the arguments go through `Printable`.
 */
#define WEBAPI_LOG_AS(source, priority, text, ...) \
    syslog((priority), "%s:%d " text, (source), __LINE__ __VA_OPT__(, ) __VA_ARGS__)

#define WEBAPI_LOG(priority, text, ...) \
    WEBAPI_LOG_AS(::ZOVA::base::SourceName(__FILE__), (priority), text __VA_OPT__(, ) __VA_ARGS__)
