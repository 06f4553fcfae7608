#include "httpfileoutputer/ClientOutput.h"

#include <poll.h>
#include <sys/sendfile.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

namespace reference {

namespace {

constexpr size_t kPart = size_t{64} * 1024;
/** One call sends no more than this, so that none has to be counted near the limits of its types. */
constexpr std::uint64_t kLargestStep = std::uint64_t{1} << 30;

}  // namespace

bool ClientOutput::CanTryAgain() const {
    if (errno == EINTR) {
        return true;
    }
    if (errno != EAGAIN && errno != EWOULDBLOCK) {
        return false;
    }
    pollfd wanted{client, POLLOUT, 0};
    const int ready = poll(&wanted, 1, kLongestWait);
    return ready > 0 || (ready < 0 && errno == EINTR);
}

bool ClientOutput::Write(std::string_view text) {
    while (!text.empty()) {
        const ssize_t written = write(client, text.data(), text.size());
        if (written > 0) {
            text.remove_prefix(static_cast<size_t>(written));
        } else if (written == 0 || !CanTryAgain()) {
            return false;
        }
    }
    return true;
}

bool ClientOutput::SendFile(int file, std::uint64_t first, std::uint64_t length) {
    auto place = static_cast<off_t>(first);
    while (length > 0) {
        const ssize_t sent = sendfile(client, file, &place, static_cast<size_t>(std::min(length, kLargestStep)));
        if (sent > 0) {
            length -= static_cast<std::uint64_t>(sent);
            continue;
        }
        if (sent < 0 && (errno == EINVAL || errno == ENOSYS)) {
            // File systems and outputs that the kernel cannot join.
            return CopyFile(file, static_cast<std::uint64_t>(place), length);
        }
        if (sent == 0 || !CanTryAgain()) {
            return false;
        }
    }
    return true;
}

bool ClientOutput::CopyFile(int file, std::uint64_t first, std::uint64_t length) {
    std::array<char, kPart> part;
    while (length > 0) {
        const size_t wanted = static_cast<size_t>(std::min<std::uint64_t>(length, part.size()));
        const ssize_t got = pread(file, part.data(), wanted, static_cast<off_t>(first));
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0 || !Write({part.data(), static_cast<size_t>(got)})) {
            return false;
        }
        first += static_cast<std::uint64_t>(got);
        length -= static_cast<std::uint64_t>(got);
    }
    return true;
}

bool ClientOutput::SendStream(FILE* stream) {
    std::array<char, kPart> part;
    for (;;) {
        errno = 0;
        const size_t got = fread(part.data(), 1, part.size(), stream);
        if (!Write({part.data(), got})) {
            return false;
        }
        if (got == part.size()) {
            continue;
        }
        if (feof(stream) != 0) {
            return true;
        }
        if (errno != EINTR) {
            return false;
        }
        clearerr(stream);
    }
}

}  // namespace reference
