#include "FileContent.h"

#include <errno.h>
#include <fcntl.h>
#include <string.h>
#include <sys/stat.h>

#include <vector>

#include "../common/UniqueFd.h"

namespace package {
namespace {

constexpr std::size_t kPiece = 128 * 1024;

}  // namespace

ContentResult FindContent(int folder, const char* name, const std::string& content,
                          const std::function<void()>& pause) {
    // What was a file a moment ago may be a pipe by now.
    const UniqueFd file(openat(folder, name, O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY));
    struct stat status;
    if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || !S_ISREG(status.st_mode)) {
        return ContentResult::kUnreadable;
    }
    std::vector<char> buffer(kPiece + content.size());
    // The end of the piece before, in which a match may begin.
    std::size_t kept = 0;
    for (;;) {
        const ssize_t got = read(file.Get(), buffer.data() + kept, kPiece);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0) {
            return got == 0 ? ContentResult::kNone : ContentResult::kUnreadable;
        }
        const std::size_t length = kept + static_cast<std::size_t>(got);
        if (memmem(buffer.data(), length, content.data(), content.size()) != nullptr) {
            return ContentResult::kFound;
        }
        kept = length < content.size() ? length : content.size() - 1;
        memmove(buffer.data(), buffer.data() + length - kept, kept);
        pause();
    }
}

}  // namespace package
