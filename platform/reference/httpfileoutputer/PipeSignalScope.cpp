#include "httpfileoutputer/PipeSignalScope.h"

#include <cerrno>
#include <ctime>

namespace reference {

namespace {

bool IsPending() {
    sigset_t pending;
    return sigpending(&pending) == 0 && sigismember(&pending, SIGPIPE) == 1;
}

}  // namespace

PipeSignalScope::PipeSignalScope() {
    const int error = errno;
    sigemptyset(&pipeSignal);
    sigaddset(&pipeSignal, SIGPIPE);
    wasPending = IsPending();
    isBlocked = pthread_sigmask(SIG_BLOCK, &pipeSignal, &saved) == 0;
    errno = error;
}

PipeSignalScope::~PipeSignalScope() {
    const int error = errno;
    if (isBlocked) {
        const struct timespec atOnce = {};
        while (!wasPending && IsPending() && sigtimedwait(&pipeSignal, nullptr, &atOnce) < 0 && errno == EINTR) {
        }
        pthread_sigmask(SIG_SETMASK, &saved, nullptr);
    }
    errno = error;
}

}  // namespace reference
