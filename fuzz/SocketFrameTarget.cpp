// What arrives on a connection, up to its end: texts, each behind its length.

#include <sys/socket.h>
#include <unistd.h>

#include "Check.h"
#include "Target.h"
#include "zovadaemon.h"

namespace {

constexpr size_t kLengthSize = 8;
/** Leaves room in a socket's buffer, so that one thread can write it all before it reads. */
constexpr size_t kMostBytes = 64U * 1024;
constexpr uint64_t kLargestText = 64U * 1024 * 1024;

/** A second, plainer reading: takes the next text from the front of `bytes`. */
bool TakeText(std::string& bytes, std::string& text) {
    if (bytes.size() < kLengthSize) {
        return false;
    }
    uint64_t length = 0;
    for (size_t place = kLengthSize; place-- > 0;) {
        length = length << 8 | static_cast<unsigned char>(bytes[place]);
    }
    if (length > kLargestText || length > bytes.size() - kLengthSize) {
        return false;
    }
    text = bytes.substr(kLengthSize, length);
    bytes.erase(0, kLengthSize + length);
    return true;
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    int ends[2];
    FUZZ_CHECK(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) == 0);
    std::string bytes = fuzz::TextOf(data, size < kMostBytes ? size : kMostBytes);
    FUZZ_CHECK(send(ends[1], bytes.data(), bytes.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(bytes.size()));
    close(ends[1]);
    zovadaemon::SockConnection connection(ends[0]);
    for (bool more = true; more;) {
        std::string expected;
        std::string text = "as before";
        more = TakeText(bytes, expected);
        FUZZ_CHECK(connection.Recv(text) == more);
        FUZZ_CHECK(text == (more ? expected : "as before"));
    }
    return 0;
}
