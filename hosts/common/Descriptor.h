#pragma once

#include <unistd.h>

#include <cerrno>

namespace host {

/** Owns a descriptor, or none (-1). Closing leaves `errno` alone. */
class [[nodiscard]] Descriptor {
public:
    explicit Descriptor(int given = -1) : fd(given) {}
    Descriptor(Descriptor&& other) noexcept : fd(other.Release()) {}
    Descriptor& operator=(Descriptor&& other) noexcept {
        if (this != &other) {
            Close();
            fd = other.Release();
        }
        return *this;
    }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    ~Descriptor() { Close(); }

    int Get() const { return fd; }
    bool IsOpen() const { return fd >= 0; }

    /** Hands the descriptor to the caller. */
    int Release() {
        const int released = fd;
        fd = -1;
        return released;
    }

    void Close() {
        if (fd >= 0) {
            const int error = errno;
            close(Release());
            errno = error;
        }
    }

private:
    int fd;
};

}  // namespace host
