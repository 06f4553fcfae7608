#include "VolumeProbe.h"

#include <errno.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/statvfs.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>

namespace package {
namespace {

constexpr int kMostHangs = 2;

/** One answer of the child; short enough to cross a pipe in one piece. */
struct Answer {
    bool good;
    VolumeSize size;
};

struct Child {
    pid_t pid;
    int fd;
};

using Clock = std::chrono::steady_clock;

/** Takes the client's connection away from the child, and everything else but its pipe. */
void KeepOnly(int pipeEnd) {
    const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
    if (null < 0) {
        _exit(1);
    }
    for (int fd = STDIN_FILENO; fd <= STDERR_FILENO; ++fd) {
        if (fd != pipeEnd) {
            dup2(null, fd);
        }
    }
    if (pipeEnd > STDERR_FILENO + 1) {
        close_range(STDERR_FILENO + 1, pipeEnd - 1, 0);
    }
    close_range(std::max(pipeEnd, STDERR_FILENO) + 1, ~0U, 0);
}

[[noreturn]] void RunChild(const std::vector<std::string>& mountPoints, std::size_t first, int fd, SizeFunction read) {
    signal(SIGPIPE, SIG_IGN);
    KeepOnly(fd);
    for (std::size_t at = first; at < mountPoints.size(); ++at) {
        Answer answer = {};
        answer.good = read(mountPoints[at].c_str(), answer.size);
        if (write(fd, &answer, sizeof(answer)) != static_cast<ssize_t>(sizeof(answer))) {
            break;
        }
    }
    _exit(0);
}

bool StartChild(const std::vector<std::string>& mountPoints, std::size_t first, SizeFunction read, Child& out) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        return false;
    }
    const pid_t pid = fork();
    if (pid == 0) {
        RunChild(mountPoints, first, ends[1], read);
    }
    close(ends[1]);
    if (pid < 0) {
        close(ends[0]);
        return false;
    }
    out = {pid, ends[0]};
    return true;
}

/** A child that hangs in the kernel cannot be waited for: it is left to end when the kernel lets it go. */
void EndChild(const Child& child, bool hangs) {
    close(child.fd);
    if (hangs) {
        kill(child.pid, SIGKILL);
    }
    while (waitpid(child.pid, nullptr, hangs ? WNOHANG : 0) < 0 && errno == EINTR) {
    }
}

enum class Outcome { kAnswer, kHangs, kEnded };

Outcome NextAnswer(const Child& child, std::chrono::milliseconds patience, Answer& out) {
    const Clock::time_point deadline = Clock::now() + patience;
    for (;;) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
        pollfd waiting = {child.fd, POLLIN, 0};
        const int ready = poll(&waiting, 1, left > 0 ? static_cast<int>(left) : 0);
        if (ready < 0 && errno == EINTR) {
            continue;
        }
        if (ready <= 0) {
            return Outcome::kHangs;
        }
        const ssize_t count = read(child.fd, &out, sizeof(out));
        if (count < 0 && errno == EINTR) {
            continue;
        }
        return count == static_cast<ssize_t>(sizeof(out)) ? Outcome::kAnswer : Outcome::kEnded;
    }
}

}  // namespace

bool ReadVolumeSize(const char* mountPoint, VolumeSize& out) {
    struct statvfs figures = {};
    if (statvfs(mountPoint, &figures) != 0 || figures.f_blocks == 0) {
        return false;
    }
    const std::uint64_t unit = figures.f_frsize;
    out = {figures.f_blocks * unit, figures.f_bfree * unit, figures.f_bavail * unit};
    return true;
}

std::vector<std::optional<VolumeSize>> ProbeVolumes(const std::vector<std::string>& mountPoints,
                                                    std::chrono::milliseconds patience, SizeFunction read) {
    std::vector<std::optional<VolumeSize>> sizes(mountPoints.size());
    int hangs = 0;
    for (std::size_t at = 0; at < mountPoints.size() && hangs < kMostHangs;) {
        Child child = {};
        if (!StartChild(mountPoints, at, read, child)) {
            break;
        }
        Outcome outcome = Outcome::kAnswer;
        while (at < mountPoints.size() && outcome == Outcome::kAnswer) {
            Answer answer = {};
            outcome = NextAnswer(child, patience, answer);
            if (outcome == Outcome::kAnswer && answer.good) {
                sizes[at] = answer.size;
            }
            ++at;
        }
        EndChild(child, outcome == Outcome::kHangs);
        hangs += outcome == Outcome::kHangs ? 1 : 0;
    }
    return sizes;
}

}  // namespace package
