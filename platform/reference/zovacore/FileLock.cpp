#include <sys/file.h>
#include <unistd.h>

#include <cerrno>

#include "Seam.h"
#include "common/TimedLock.h"

int QLIBCFileLockTimeByFile(const char* path, int mode, int seconds, int* fd) {
    constexpr int kExclusive = 1;
    if (path == nullptr || fd == nullptr || mode != kExclusive || seconds < 0) {
        errno = EINVAL;
        return -1;
    }
    reference::UniqueFd lock = reference::TakeTimedLock(path, seconds);
    if (!lock.IsOpen()) {
        return -1;
    }
    *fd = lock.Release();
    return 0;
}

int QLIBCFileUnlockByFile(int fd) {
    // Unlocked as well as closed, since a forked child may hold a copy of the descriptor.
    const int result = flock(fd, LOCK_UN);
    close(fd);
    return result;
}
