#include "common/RandomBytes.h"

#include <sys/random.h>

#include <cerrno>

namespace reference {

bool FillRandom(void* buffer, size_t size) {
    auto* at = static_cast<unsigned char*>(buffer);
    while (size > 0) {
        const ssize_t got = getrandom(at, size, 0);
        if (got < 0 && errno != EINTR) {
            return false;
        }
        if (got > 0) {
            at += got;
            size -= static_cast<size_t>(got);
        }
    }
    return true;
}

}  // namespace reference
