#pragma once

#include <cerrno>

namespace ZOVA::base {

/** Puts `errno` back at the end of its scope. */
class [[nodiscard]] ErrnoGuard {
public:
    ErrnoGuard() : saved(errno) {}
    ErrnoGuard(const ErrnoGuard&) = delete;
    ErrnoGuard& operator=(const ErrnoGuard&) = delete;
    ~ErrnoGuard() { errno = saved; }

private:
    int saved;
};

}  // namespace ZOVA::base
