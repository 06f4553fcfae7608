#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

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

}  // namespace

int QLIBCProcFork() {
    // Opened before the fork, so that a child that exists is sure to have let go of the client.
    UniqueFd nothing(open("/dev/null", O_RDWR | O_CLOEXEC));
    if (!nothing.IsOpen()) {
        return -1;
    }
    if (nothing.Get() <= STDERR_FILENO) {
        nothing.Reset(fcntl(nothing.Get(), F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
        if (!nothing.IsOpen()) {
            return -1;
        }
    }
    const pid_t child = fork();
    if (child == 0) {
        LeaveClient(nothing.Get());
    }
    return child;
}
