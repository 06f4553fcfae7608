#include "common/TimedLock.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <ctime>
#include <utility>

namespace reference {

namespace {

constexpr long kNanosecondsPerSecond = 1000000000;

bool IsPast(const struct timespec& deadline) {
    struct timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return now.tv_sec != deadline.tv_sec ? now.tv_sec > deadline.tv_sec : now.tv_nsec >= deadline.tv_nsec;
}

}  // namespace

bool LockDescriptor(int descriptor, int seconds) {
    struct timespec deadline;
    clock_gettime(CLOCK_MONOTONIC, &deadline);
    deadline.tv_sec += seconds;
    // flock has no time limit of its own. The pauses grow to a bound that keeps the wait after a release short.
    constexpr long kLongestPause = kNanosecondsPerSecond / 50;
    struct timespec pause = {0, kNanosecondsPerSecond / 2000};
    while (flock(descriptor, LOCK_EX | LOCK_NB) != 0) {
        if (errno == EINTR) {
            continue;
        }
        if (errno != EWOULDBLOCK) {
            return false;
        }
        if (IsPast(deadline)) {
            errno = ETIMEDOUT;
            return false;
        }
        nanosleep(&pause, nullptr);
        pause.tv_nsec = pause.tv_nsec * 2 < kLongestPause ? pause.tv_nsec * 2 : kLongestPause;
    }
    return true;
}

UniqueFd TakeTimedLock(const char* path, int seconds) {
    UniqueFd file(open(path, O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY, 0600));
    return file.IsOpen() && LockDescriptor(file.Get(), seconds) ? std::move(file) : UniqueFd();
}

}  // namespace reference
