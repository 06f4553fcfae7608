#include "SystemFile.h"

#include <errno.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstddef>
#include <utility>

namespace package {
namespace {

constexpr std::size_t kLargest = 4 << 20;

bool ReadAll(int fd, std::string& out) {
    char buffer[4096];
    std::string text;
    for (;;) {
        const ssize_t count = read(fd, buffer, sizeof(buffer));
        if (count == 0) {
            out = std::move(text);
            return true;
        }
        if (count > 0) {
            text.append(buffer, static_cast<std::size_t>(count));
        } else if (errno != EINTR) {
            return false;
        }
        if (text.size() > kLargest) {
            return false;
        }
    }
}

}  // namespace

bool ReadSystemFile(const char* path, std::string& out) {
    const int fd = open(path, O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return false;
    }
    const bool read = ReadAll(fd, out);
    close(fd);
    return read;
}

}  // namespace package
