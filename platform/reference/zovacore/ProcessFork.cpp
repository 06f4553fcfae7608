#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "Seam.h"
#include "common/UniqueFd.h"

using reference::UniqueFd;

namespace {

bool IsConnection(const struct stat& status) {
    return S_ISSOCK(status.st_mode) || S_ISFIFO(status.st_mode);
}

bool IsSame(const struct stat& first, const struct stat& second) {
    return first.st_dev == second.st_dev && first.st_ino == second.st_ino;
}

/** Closes copies of the connections that descriptors 0 and 1 are, such as a host's own descriptor of its client. */
void CloseOtherCopies(const struct stat (&client)[2]) {
    DIR* directory = opendir("/proc/self/fd");
    if (directory == nullptr) {
        return;
    }
    while (const struct dirent* entry = readdir(directory)) {
        char* rest = nullptr;
        const long descriptor = strtol(entry->d_name, &rest, 10);
        struct stat status;
        if (rest == entry->d_name || descriptor <= STDERR_FILENO || descriptor == dirfd(directory) ||
            fstat(static_cast<int>(descriptor), &status) != 0 || !IsConnection(status)) {
            continue;
        }
        if (IsSame(status, client[0]) || IsSame(status, client[1])) {
            close(static_cast<int>(descriptor));
        }
    }
    closedir(directory);
}

void LeaveClient(int nothing) {
    struct stat client[2] = {};
    for (int descriptor : {STDIN_FILENO, STDOUT_FILENO}) {
        if (fstat(descriptor, &client[descriptor]) != 0) {
            client[descriptor] = {};
        }
    }
    CloseOtherCopies(client);
    for (int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        if (dup2(nothing, descriptor) < 0) {
            _exit(EXIT_FAILURE);
        }
    }
}

/** /dev/null, on a descriptor above the standard ones. */
UniqueFd OpenNothing() {
    UniqueFd nothing(open("/dev/null", O_RDWR | O_CLOEXEC));
    if (nothing.IsOpen() && nothing.Get() <= STDERR_FILENO) {
        nothing.Reset(fcntl(nothing.Get(), F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
    }
    return nothing;
}

/** What the child in between tells of the fork that it made. */
struct Report {
    pid_t child;
    int error;
};

/** The child in between: forks once more and ends. Returns in the grandchild only. */
void ForkOnceMore(UniqueFd& reading, UniqueFd& writing) {
    Report report = {fork(), errno};
    if (report.child == 0) {
        reading.Reset(-1);
        writing.Reset(-1);
        return;
    }
    const ssize_t written = write(writing.Get(), &report, sizeof(report));
    _exit(written == sizeof(report) ? EXIT_SUCCESS : EXIT_FAILURE);
}

void WaitFor(pid_t child) {
    const int error = errno;
    while (waitpid(child, nullptr, 0) < 0 && errno == EINTR) {
    }
    errno = error;
}

Report ReadReport(int descriptor) {
    Report report;
    ssize_t got;
    while ((got = read(descriptor, &report, sizeof(report))) < 0 && errno == EINTR) {
    }
    return got == sizeof(report) ? report : Report{-1, EAGAIN};
}

/** Forks twice, so that the child belongs to init, which waits for it. @return as fork, with the grandchild's id. */
pid_t ForkDetached() {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        return -1;
    }
    UniqueFd reading(ends[0]);
    UniqueFd writing(ends[1]);
    const pid_t between = fork();
    if (between < 0) {
        return -1;
    }
    if (between == 0) {
        ForkOnceMore(reading, writing);
        return 0;
    }
    writing.Reset(-1);
    const Report report = ReadReport(reading.Get());
    WaitFor(between);
    if (report.child < 0) {
        errno = report.error;
        return -1;
    }
    return report.child;
}

int ForkWithoutClient(bool detached) {
    // Opened before the fork, so that a child that exists is sure to have let go of the client.
    const UniqueFd nothing = OpenNothing();
    if (!nothing.IsOpen()) {
        return -1;
    }
    const pid_t child = detached ? ForkDetached() : fork();
    if (child == 0) {
        LeaveClient(nothing.Get());
    }
    return child;
}

}  // namespace

int QLIBCProcFork() {
    return ForkWithoutClient(true);
}

int QLIBCProcForkEx(int flags) {
    constexpr int kDetached = 64;
    return ForkWithoutClient((flags & kDetached) != 0);
}
