#pragma once

#include <unistd.h>

#include <utility>

namespace package {

/** Owns a descriptor, or none (-1). */
class [[nodiscard]] UniqueFd {
public:
    explicit UniqueFd(int owned = -1) : descriptor(owned) {}
    UniqueFd(UniqueFd&& other) noexcept : descriptor(other.Release()) {}
    UniqueFd& operator=(UniqueFd&& other) noexcept {
        Reset(other.Release());
        return *this;
    }
    ~UniqueFd() { Reset(-1); }

    int Get() const { return descriptor; }
    bool IsOpen() const { return descriptor >= 0; }
    int Release() { return std::exchange(descriptor, -1); }
    void Reset(int other) {
        if (descriptor >= 0) {
            close(descriptor);
        }
        descriptor = other;
    }

private:
    int descriptor;
};

}  // namespace package
