#pragma once

#include <unistd.h>

namespace ZOVA::base {

/** Owns a descriptor, or none (-1). Closing leaves `errno` alone. */
class [[nodiscard]] UniqueFd {
public:
    explicit UniqueFd(int descriptor = -1) : fd(descriptor) {}
    UniqueFd(UniqueFd&& other) noexcept : fd(other.Release()) {}
    UniqueFd(const UniqueFd&) = delete;
    UniqueFd& operator=(const UniqueFd&) = delete;
    ~UniqueFd() { Close(); }

    int Get() const { return fd; }
    bool IsOpen() const { return fd >= 0; }

    /** Hands the descriptor to the caller. */
    int Release() {
        int released = fd;
        fd = -1;
        return released;
    }

    void Close();

private:
    int fd;
};

}  // namespace ZOVA::base
