#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

#include "TaskDevice.h"
#include "webapi/Pipe.h"
#include "zovacore.h"

namespace {

/** Which of the two functions, with which flags. */
struct ForkRow {
    const char* name;
    int (*fork)();
};

int ForkDetachedEx() {
    return QLIBCProcForkEx(65);
}

class DetachedFork : public ::testing::TestWithParam<ForkRow> {};

/** The device that a descriptor is, 0 for none. */
dev_t DeviceOf(int descriptor) {
    struct stat status = {};
    return fstat(descriptor, &status) == 0 ? status.st_rdev : 0;
}

bool LeadsNowhere(int descriptor) {
    struct stat nothing = {};
    return stat("/dev/null", &nothing) == 0 && DeviceOf(descriptor) == nothing.st_rdev;
}

/** What the forked child tells through a pipe. */
template <typename Body>
std::string TellOf(int (*forkFunction)(), pid_t& pid, Body body) {
    int ends[2];
    EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
    pid = forkFunction();
    if (pid == 0) {
        close(ends[0]);
        const std::string text = body();
        [[maybe_unused]] const ssize_t written = write(ends[1], text.data(), text.size());
        _exit(0);
    }
    close(ends[1]);
    std::string text;
    char buffer[256];
    for (ssize_t got; (got = read(ends[0], buffer, sizeof(buffer))) > 0;) {
        text.append(buffer, static_cast<size_t>(got));
    }
    close(ends[0]);
    return text;
}

}  // namespace

TEST_P(DetachedFork, GivesTheParentTheIdOfTheChild) {
    pid_t pid = 0;
    const std::string told = TellOf(GetParam().fork, pid, [] { return std::to_string(getpid()); });
    EXPECT_EQ(told, std::to_string(pid));
    EXPECT_GT(pid, 0);
}

TEST_P(DetachedFork, LeavesNothingToWaitFor) {
    for (int number = 0; number < 10; ++number) {
        pid_t pid = 0;
        TellOf(GetParam().fork, pid, [] { return std::string("x"); });
    }
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1);
    EXPECT_EQ(errno, ECHILD) << "no child, no zombie";
}

TEST_P(DetachedFork, LeavesSigchldAsItWas) {
    struct sigaction before = {};
    before.sa_handler = [](int) {};
    ASSERT_EQ(sigaction(SIGCHLD, &before, nullptr), 0);
    pid_t pid = 0;
    TellOf(GetParam().fork, pid, [] { return std::string("x"); });
    struct sigaction after = {};
    ASSERT_EQ(sigaction(SIGCHLD, nullptr, &after), 0);
    EXPECT_EQ(after.sa_handler, before.sa_handler);
    signal(SIGCHLD, SIG_DFL);
}

TEST_P(DetachedFork, WorksWhereTheHostIgnoresSigchld) {
    signal(SIGCHLD, SIG_IGN);
    pid_t pid = 0;
    EXPECT_EQ(TellOf(GetParam().fork, pid, [] { return std::string("x"); }), "x");
    EXPECT_GT(pid, 0);
    signal(SIGCHLD, SIG_DFL);
}

TEST_P(DetachedFork, ChildsStandardDescriptorsLeadNowhere) {
    pid_t pid = 0;
    EXPECT_EQ(TellOf(GetParam().fork, pid,
                     [] { return std::string(LeadsNowhere(0) && LeadsNowhere(1) && LeadsNowhere(2) ? "yes" : "no"); }),
              "yes");
}

TEST_P(DetachedFork, ChildHoldsNoCopyOfTheClientsConnection) {
    const int status = StatusOfChild([] {
        int client[2];
        if (socketpair(AF_UNIX, SOCK_STREAM, 0, client) != 0) {
            return 1;
        }
        const int copy = fcntl(client[1], F_DUPFD_CLOEXEC, 50);
        dup2(client[1], STDIN_FILENO);
        dup2(client[1], STDOUT_FILENO);
        close(client[1]);
        const int child = GetParam().fork();
        if (child == 0) {
            pause();
            _exit(0);
        }
        // The other side sees the end as soon as this process lets go, although the child lives on.
        close(copy);
        close(STDIN_FILENO);
        close(STDOUT_FILENO);
        char byte;
        const bool ended = read(client[0], &byte, 1) == 0;
        kill(child, SIGKILL);
        return ended ? 0 : 2;
    });
    EXPECT_EQ(status, 0);
}

TEST_P(DetachedFork, IsRefusedWhereNoProcessIsLeft) {
    EXPECT_EQ(StatusOfChild(
                  [] {
                      const struct rlimit none = {1, 1};
                      if (setrlimit(RLIMIT_NPROC, &none) != 0) {
                          return 1;
                      }
                      errno = 0;
                      const int result = GetParam().fork();
                      return result == -1 && errno == EAGAIN ? 0 : 2;
                  },
                  kUnknownUid),
              0);
}

TEST_P(DetachedFork, IsRefusedWhenOnlyTheSecondForkFails) {
    EXPECT_EQ(StatusOfChild(
                  [] {
                      // This process and one more.
                      const struct rlimit two = {2, 2};
                      if (setrlimit(RLIMIT_NPROC, &two) != 0) {
                          return 1;
                      }
                      errno = 0;
                      const int result = GetParam().fork();
                      if (result != -1 || errno != EAGAIN) {
                          return 2;
                      }
                      return waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD ? 0 : 3;
                  },
                  kUnknownUid),
              0);
}

TEST_P(DetachedFork, IsRefusedWithoutDescriptors) {
    EXPECT_EQ(StatusOfChild([] {
                  const struct rlimit none = {3, 3};
                  setrlimit(RLIMIT_NOFILE, &none);
                  return GetParam().fork() == -1 ? 0 : 1;
              }),
              0);
}

INSTANTIATE_TEST_SUITE_P(Functions, DetachedFork,
                         ::testing::Values(ForkRow{"ProcFork", QLIBCProcFork}, ForkRow{"ProcForkEx", ForkDetachedEx}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST(ProcForkEx, WithoutTheFlagTheChildIsTheCallersOwn) {
    const int child = QLIBCProcForkEx(1);
    if (child == 0) {
        _exit(LeadsNowhere(0) && LeadsNowhere(1) && LeadsNowhere(2) ? 7 : 8);
    }
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(WEXITSTATUS(status), 7);
}

TEST(PipeCloseInherited, ClosesEveryOpenPipeOfTheProcess) {
    ZOVA::Pipe first;
    ZOVA::Pipe second;
    {
        ZOVA::Pipe gone;
        ASSERT_TRUE(gone.Init());
    }
    ASSERT_TRUE(first.Init());
    ASSERT_TRUE(second.Init());
    second.ReadOnly(-1);
    EXPECT_EQ(StatusOfChild([&] {
                  ZOVA::Pipe::CloseInherited();
                  return first.IsReadable() || second.IsReadable() ? 1 : 0;
              }),
              0);
    EXPECT_TRUE(first.IsReadable());
    char byte;
    first.ReadOnly(-1);
    EXPECT_EQ(first.Read(&byte, 1), 0) << "nobody holds the other end any longer";
}
