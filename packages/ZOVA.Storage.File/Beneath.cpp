#include "Beneath.h"

#include <errno.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>

namespace package {
namespace {

/** The kernel gives up where a rename came in between. */
constexpr int kTries = 32;

/** What opening needs beside the caller's flags. With O_PATH nothing is opened in that sense. */
int Careful(int flags) {
    return (flags & O_PATH) == 0 ? O_NONBLOCK | O_NOCTTY | O_NOFOLLOW : 0;
}

UniqueFd OpenResolved(int folder, const char* path, int flags, unsigned int resolve) {
    open_how how = {};
    how.flags = static_cast<unsigned int>(flags | O_CLOEXEC);
    how.resolve = resolve | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS;
    for (int tries = 0;; ++tries) {
        UniqueFd opened(static_cast<int>(syscall(SYS_openat2, folder, path, &how, sizeof(how))));
        if (opened.IsOpen() || (errno != EAGAIN && errno != EINTR) || tries == kTries) {
            return opened;
        }
    }
}

}  // namespace

UniqueFd OpenTopFolder(const std::string& path) {
    return OpenResolved(AT_FDCWD, path.c_str(), O_PATH | O_DIRECTORY, 0);
}

UniqueFd OpenBeneath(int folder, const std::string& path, int flags) {
    return OpenResolved(folder, path.empty() ? "." : path.c_str(), flags | Careful(flags), RESOLVE_BENEATH);
}

UniqueFd OpenOnSameMount(int folder, const std::string& path, int flags) {
    return OpenResolved(folder, path.empty() ? "." : path.c_str(), flags | Careful(flags),
                        RESOLVE_BENEATH | RESOLVE_NO_XDEV);
}

}  // namespace package
