#include <fcntl.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/UniqueFd.h"

namespace {

using Files = DeviceTest;
using Locks = DeviceTest;

double Now() {
    struct timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

}  // namespace

TEST_F(Files, TellsWhatExists) {
    WriteFile(InRoot("/scratch/file"), "");
    EXPECT_EQ(QLIBCFileExist(InRoot("/scratch/file").c_str()), 1);
    EXPECT_EQ(QLIBCFileExist(InRoot("/scratch").c_str()), 1);
    EXPECT_NE(QLIBCFileExist(InRoot("/scratch/none").c_str()), 1);
    EXPECT_NE(QLIBCFileExist(""), 1);
    EXPECT_NE(QLIBCFileExist(nullptr), 1);
}

TEST_F(Files, ComparesAPairOfAnInformationFile) {
    const std::string path = InRoot("/scratch/info.conf");
    WriteFile(path, "# comment\nenable_data_collect=\"yes\"\nempty=\"\"\n");
    EXPECT_NE(QLIBCFileCheckKeyValue(path.c_str(), "enable_data_collect", "yes", 0), 0);
    EXPECT_EQ(QLIBCFileCheckKeyValue(path.c_str(), "enable_data_collect", "ye", 0), 0);
    EXPECT_EQ(QLIBCFileCheckKeyValue(path.c_str(), "enable_data", "yes", 0), 0);
    EXPECT_NE(QLIBCFileCheckKeyValue(path.c_str(), "empty", "", 0), 0);
    EXPECT_EQ(QLIBCFileCheckKeyValue(path.c_str(), "absent", "", 0), 0);
    EXPECT_EQ(QLIBCFileCheckKeyValue(InRoot("/scratch/none").c_str(), "a", "b", 0), 0);
    EXPECT_EQ(QLIBCFileCheckKeyValue(nullptr, "a", "b", 0), 0);
    EXPECT_EQ(QLIBCFileCheckKeyValue(path.c_str(), nullptr, "b", 0), 0);
    EXPECT_EQ(QLIBCFileCheckKeyValue(path.c_str(), "a", nullptr, 0), 0);
    WriteFile(path, "a=\"b\"\n" + std::string(70000, '#'));
    EXPECT_EQ(QLIBCFileCheckKeyValue(path.c_str(), "a", "b", 0), 0);
}

TEST_F(Files, TouchMakesAPrivateFileAndRenewsIt) {
    const std::string path = InRoot("/scratch/stamp");
    ASSERT_EQ(QLIBCFileTouch(path.c_str()), 0);
    EXPECT_EQ(ModeOf(path), 0600u);
    MakeOlder(path, 5000);
    ASSERT_EQ(QLIBCFileTouch(path.c_str()), 0);
    struct stat status;
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_GT(status.st_mtime, time(nullptr) - 1000);
    ASSERT_EQ(symlink("target", InRoot("/scratch/link").c_str()), 0);
    EXPECT_LT(QLIBCFileTouch(InRoot("/scratch/link").c_str()), 0);
    EXPECT_FALSE(Exists(InRoot("/scratch/target")));
    EXPECT_LT(QLIBCFileTouch(InRoot("/scratch/no/folder").c_str()), 0);
    EXPECT_LT(QLIBCFileTouch(nullptr), 0);
}

TEST_F(Files, UTimeSetsNowOrTheGivenTime) {
    const std::string path = InRoot("/scratch/file");
    WriteFile(path, "");
    MakeOlder(path, 5000);
    ASSERT_EQ(QLIBCFileUTime(path.c_str(), 1, 0), 0);
    struct stat status;
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_GT(status.st_mtime, time(nullptr) - 1000);
    ASSERT_EQ(QLIBCFileUTime(path.c_str(), 0, 12345), 0);
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mtime, 12345);
    EXPECT_LT(QLIBCFileUTime(InRoot("/scratch/none").c_str(), 1, 0), 0);
    EXPECT_LT(QLIBCFileUTime(nullptr, 1, 0), 0);
}

TEST_F(Locks, GiveUpWhenTheTimeIsUp) {
    const std::string path = InRoot("/scratch/lock");
    int first = -1;
    ASSERT_GE(QLIBCFileLockTimeByFile(path.c_str(), 1, 2, &first), 0);
    EXPECT_EQ(ModeOf(path), 0600u);
    EXPECT_NE(fcntl(first, F_GETFD) & FD_CLOEXEC, 0);
    int second = -7;
    const double start = Now();
    EXPECT_LT(QLIBCFileLockTimeByFile(path.c_str(), 1, 1, &second), 0);
    EXPECT_EQ(errno, ETIMEDOUT);
    EXPECT_EQ(second, -7);
    EXPECT_GE(Now() - start, 1.0);
    EXPECT_LT(QLIBCFileLockTimeByFile(path.c_str(), 1, 0, &second), 0);
    EXPECT_EQ(QLIBCFileUnlockByFile(first), 0);
    ASSERT_GE(QLIBCFileLockTimeByFile(path.c_str(), 1, 0, &second), 0);
    EXPECT_EQ(QLIBCFileUnlockByFile(second), 0);
}

TEST_F(Locks, AreTakenAsSoonAsTheyAreFree) {
    const std::string path = InRoot("/scratch/lock");
    int fd = -1;
    ASSERT_GE(QLIBCFileLockTimeByFile(path.c_str(), 1, 0, &fd), 0);
    int ready[2];
    ASSERT_EQ(pipe2(ready, O_CLOEXEC), 0);
    const pid_t child = fork();
    if (child == 0) {
        int mine = -1;
        const bool busy = QLIBCFileLockTimeByFile(path.c_str(), 1, 0, &mine) < 0;
        const bool told = write(ready[1], "x", 1) == 1;
        _exit(busy && told && QLIBCFileLockTimeByFile(path.c_str(), 1, 30, &mine) >= 0 ? 0 : 1);
    }
    char byte;
    ASSERT_EQ(read(ready[0], &byte, 1), 1);
    // The child holds a copy of the descriptor, which must not keep the lock.
    ASSERT_EQ(QLIBCFileUnlockByFile(fd), 0);
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    close(ready[0]);
    close(ready[1]);
}

TEST_F(Locks, RefuseBadArgumentsAndLinks) {
    int fd = -7;
    const std::string path = InRoot("/scratch/lock");
    EXPECT_LT(QLIBCFileLockTimeByFile(nullptr, 1, 1, &fd), 0);
    EXPECT_LT(QLIBCFileLockTimeByFile(path.c_str(), 2, 1, &fd), 0);
    EXPECT_LT(QLIBCFileLockTimeByFile(path.c_str(), 1, -1, &fd), 0);
    EXPECT_LT(QLIBCFileLockTimeByFile(path.c_str(), 1, 1, nullptr), 0);
    EXPECT_LT(QLIBCFileLockTimeByFile(InRoot("/scratch/no/folder").c_str(), 1, 1, &fd), 0);
    ASSERT_EQ(symlink("target", path.c_str()), 0);
    EXPECT_LT(QLIBCFileLockTimeByFile(path.c_str(), 1, 1, &fd), 0);
    EXPECT_EQ(fd, -7);
    EXPECT_LT(QLIBCFileUnlockByFile(-1), 0);
}

namespace {

bool IsNothing(int fd) {
    struct stat nothing;
    struct stat mine;
    return stat("/dev/null", &nothing) == 0 && fstat(fd, &mine) == 0 && S_ISCHR(mine.st_mode) &&
           mine.st_rdev == nothing.st_rdev;
}

/** What the child of a host finds; `copy` was the host's own descriptor of its client. */
bool ChildIsApart(int copy, int other) {
    return IsNothing(0) && IsNothing(1) && IsNothing(2) && fcntl(copy, F_GETFD) < 0 && fcntl(other, F_GETFD) >= 0 &&
           write(STDOUT_FILENO, "x", 1) == 1;
}

/** A host with a connection at 0 and 1, which ends its part of it while the child lives on. */
[[noreturn]] void ActAsHost(int connection, int report, const int (&hold)[2]) {
    close(hold[1]);
    dup2(connection, STDIN_FILENO);
    dup2(connection, STDOUT_FILENO);
    const pid_t child = QLIBCProcFork();
    if (child == 0) {
        const char verdict = ChildIsApart(connection, report) ? 'y' : 'n';
        char byte;
        const bool told = write(report, &verdict, 1) == 1;
        _exit(told && read(hold[0], &byte, 1) == 0 ? 0 : 1);
    }
    close(connection);
    close(STDIN_FILENO);
    close(STDOUT_FILENO);
    // The child is nobody's to wait for here, so that it leaves no zombie in a host that lives on.
    _exit(child > 0 && waitpid(child, nullptr, 0) == -1 && errno == ECHILD ? 0 : 99);
}

}  // namespace

TEST(ProcessFork, TheChildHoldsNothingOfTheClient) {
    int client[2];
    int report[2];
    int hold[2];
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM, 0, client), 0);
    ASSERT_EQ(pipe2(report, O_CLOEXEC), 0);
    ASSERT_EQ(pipe2(hold, O_CLOEXEC), 0);
    const pid_t host = fork();
    if (host == 0) {
        close(client[0]);
        ActAsHost(client[1], report[1], hold);
    }
    close(client[1]);
    char byte = 0;
    ASSERT_EQ(read(report[0], &byte, 1), 1);
    EXPECT_EQ(byte, 'y');
    // The child still lives: it waits for the end of the pipe `hold`.
    EXPECT_EQ(read(client[0], &byte, 1), 0);
    close(hold[1]);
    int status = -1;
    ASSERT_EQ(waitpid(host, &status, 0), host);
    EXPECT_EQ(status, 0);
    // Its end of the report goes when it ends.
    close(report[1]);
    EXPECT_EQ(read(report[0], &byte, 1), 0);
    for (int fd : {client[0], report[0], hold[0]}) {
        close(fd);
    }
}

TEST(ProcessFork, TheChildIsTheCallersOwnWithoutTheFlagForADetachedOne) {
    for (const int flags : {0, 1}) {
        const int child = QLIBCProcForkEx(flags);
        if (child == 0) {
            _exit(IsNothing(1) ? 7 : 1);
        }
        int status = -1;
        ASSERT_GT(child, 0);
        ASSERT_EQ(waitpid(child, &status, 0), child);
        EXPECT_EQ(WEXITSTATUS(status), 7);
    }
    const int detached = QLIBCProcForkEx(65);
    if (detached == 0) {
        _exit(0);
    }
    ASSERT_GT(detached, 0);
    EXPECT_EQ(waitpid(detached, nullptr, 0), -1);
}

TEST(ProcessFork, FailsAsForkDoesWhereItsDescriptorsCannotBeHad) {
    EXPECT_EQ(StatusOfChild([] {
                  for (int fd = dup(0); fd >= 0; fd = dup(0)) {
                  }
                  return QLIBCProcFork() == -1 && errno == EMFILE ? 0 : 1;
              }),
              0);
}
