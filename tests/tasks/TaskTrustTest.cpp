// Records between users: who may keep, read, forge and stop whose.

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

#include "TaskDevice.h"
#include "taskmanager.h"
#include "taskmanager/TaskProcess.h"
#include "webapi/Json.h"

using ZELM::Task;
using ZELM::TaskMgr;
using ZELM::TaskUtil;

namespace {

using TaskTrustTest = TaskTest;

std::string RecordText(const std::string& owner, const std::string& id) {
    return R"({"finished":false,"format":1,"id":")" + id + R"(","owner":")" + owner +
           R"(","pid":0,"process_start":0,"properties":{"body":{"success":true}},"removed":false,"removed_at":0})";
}

uid_t OwnerOf(const std::string& path) {
    struct stat status = {};
    EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
    return status.st_uid;
}

unsigned int ModeOf(const std::string& path) {
    struct stat status = {};
    EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
    return status.st_mode & 07777;
}

int WriteAs(const TestUser& user, const char* owner, const char* id) {
    return StatusOfChild([&] { return Task(owner, id).setProperty("info", "x") ? 0 : 1; }, user.uid);
}

struct ForgedRow {
    const char* name;
    const char* owner;
    uid_t fileOwner;
    mode_t mode;
    bool believed;
};

class RecordFile : public TaskTest, public ::testing::WithParamInterface<ForgedRow> {};

}  // namespace

TEST_P(RecordFile, IsBelievedOnlyIfItsOwnerMayKeepSuchTasks) {
    const ForgedRow& row = GetParam();
    WriteFile(RecordPath(row.owner, "1"), RecordText(row.owner, "1"), row.fileOwner, row.mode);
    EXPECT_EQ(TaskUtil::checkTaskExists(row.owner, "1"), row.believed);
    EXPECT_EQ(TaskMgr(row.owner).getAllTaskId(nullptr).size(), row.believed ? 1u : 0u);
    EXPECT_EQ(Task(row.owner, "1").setProperty("a", 1), row.believed);
    EXPECT_EQ(LoggedTimes("cannot be used") > 0, !row.believed);
}

INSTANTIATE_TEST_SUITE_P(Rows, RecordFile,
                         ::testing::Values(ForgedRow{"OwnFile", "alice", kAlice.uid, 0600, true},
                                           ForgedRow{"OwnFileToBeRemoved", "alice", kAlice.uid, 0400, true},
                                           ForgedRow{"RootsFile", "alice", 0, 0600, true},
                                           ForgedRow{"AnotherUsersFile", "alice", kBob.uid, 0600, false},
                                           ForgedRow{"AnAdministratorsFile", "alice", kBoss.uid, 0600, false},
                                           ForgedRow{"ReadableByAll", "alice", kAlice.uid, 0644, false},
                                           ForgedRow{"WritableByGroup", "alice", kAlice.uid, 0620, false},
                                           ForgedRow{"UnknownOwner", "ghost", kAlice.uid, 0600, false},
                                           ForgedRow{"RootsFileOfUnknownOwner", "ghost", 0, 0600, true},
                                           ForgedRow{"AdministratorsByOne", "@administrators", kBoss.uid, 0600, true},
                                           ForgedRow{"AdministratorsByAUser", "@administrators", kAlice.uid, 0600,
                                                     false},
                                           ForgedRow{"AdministratorsByRoot", "@administrators", 0, 0600, true},
                                           ForgedRow{"UsersByAUser", "@users", kAlice.uid, 0600, true},
                                           ForgedRow{"UsersByNobodyKnown", "@users", kUnknownUid, 0600, false}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(TaskTrustTest, AUserKeepsOwnTasksWithoutRoot) {
    EXPECT_EQ(WriteAs(kAlice, "alice", "1"), 0);
    EXPECT_EQ(OwnerOf(RecordPath("alice", "1")), kAlice.uid);
    EXPECT_EQ(ModeOf(RecordPath("alice", "1")), 0600u);
    EXPECT_TRUE(Task("alice", "1").hasProperty("info"));
    EXPECT_EQ(WriteAs(kAlice, "@users", "2"), 0);
    EXPECT_EQ(WriteAs(kBoss, "@administrators", "3"), 0);
}

TEST_F(TaskTrustTest, AUserCannotKeepTasksOfOthers) {
    EXPECT_EQ(WriteAs(kAlice, "bob", "1"), 1);
    EXPECT_EQ(WriteAs(kAlice, "@administrators", "2"), 1);
    EXPECT_EQ(StatusOfChild([] { return Task("@users", "3").setProperty("info", "x") ? 0 : 1; }, kUnknownUid), 1);
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}

TEST_F(TaskTrustTest, AUserCannotReadNorWriteNorRemoveAnothersRecord) {
    ASSERT_EQ(WriteAs(kAlice, "alice", "1"), 0);
    EXPECT_EQ(StatusOfChild(
                  [] {
                      Task task("alice", "1");
                      const bool seen = TaskUtil::checkTaskExists("alice", "1") || task.hasProperty("info");
                      const bool changed = task.setProperty("info", "y") || task.finish(true) || task.remove();
                      const bool unlinked = unlink(RecordPath("alice", "1").c_str()) == 0;
                      return seen || changed || unlinked ? 1 : 0;
                  },
                  kBob.uid),
              0);
    EXPECT_EQ(Json::asString(Task("alice", "1").getProperty("info")), "x");
}

TEST_F(TaskTrustTest, AUserCannotListTheStore) {
    ASSERT_EQ(WriteAs(kAlice, "alice", "1"), 0);
    EXPECT_EQ(StatusOfChild([] { return FilesIn(TaskFolder()).empty() ? 0 : 1; }, kBob.uid), 0);
    EXPECT_EQ(StatusOfChild([] { return TaskMgr("alice").getAllTaskId(nullptr).empty() ? 0 : 1; }, kAlice.uid), 0);
}

TEST_F(TaskTrustTest, RootsRewriteKeepsTheUsersFile) {
    ASSERT_EQ(WriteAs(kAlice, "alice", "1"), 0);
    ASSERT_TRUE(Task("alice", "1").setProperty("root", true));
    EXPECT_EQ(OwnerOf(RecordPath("alice", "1")), kAlice.uid);
    EXPECT_EQ(WriteAs(kAlice, "alice", "1"), 0) << "its task writes on";
    ASSERT_TRUE(Task("alice", "1").finish(true));
    EXPECT_EQ(OwnerOf(RecordPath("alice", "1")), kAlice.uid);
    EXPECT_TRUE(Task("alice", "1").hasProperty("root"));
}

TEST_F(TaskTrustTest, NoLinkOrSpecialFileIsARecord) {
    WriteFile(InRoot("/run/zova/elsewhere"), RecordText("alice", "link"), kAlice.uid);
    ASSERT_EQ(symlink(InRoot("/run/zova/elsewhere").c_str(), RecordPath("alice", "link").c_str()), 0);
    WriteFile(InRoot("/run/zova/hard"), RecordText("alice", "hard"), kAlice.uid);
    ASSERT_EQ(link(InRoot("/run/zova/hard").c_str(), RecordPath("alice", "hard").c_str()), 0);
    ASSERT_EQ(mkfifo(RecordPath("alice", "pipe").c_str(), 0600), 0);
    ASSERT_EQ(mkdir(RecordPath("alice", "folder").c_str(), 0700), 0);
    for (const char* id : {"link", "hard", "pipe", "folder"}) {
        EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id)) << id;
        EXPECT_FALSE(Task("alice", id).setProperty("a", 1)) << id;
    }
    EXPECT_EQ(ReadWholeFile(InRoot("/run/zova/elsewhere")), RecordText("alice", "link"));
    EXPECT_EQ(ReadWholeFile(InRoot("/run/zova/hard")), RecordText("alice", "hard"));
}

TEST_F(TaskTrustTest, ARecordUnderAnotherNameIsNone) {
    WriteFile(RecordPath("alice", "2"), RecordText("alice", "1"));
    WriteFile(RecordPath("bob", "1"), RecordText("alice", "1"));
    EXPECT_FALSE(TaskUtil::checkTaskExists("alice", "2"));
    EXPECT_FALSE(TaskUtil::checkTaskExists("bob", "1"));
}

TEST_F(TaskTrustTest, BrokenFilesAreNoTasksAndHarmNoOthers) {
    ASSERT_EQ(WriteAs(kAlice, "alice", "good"), 0);
    WriteFile(RecordPath("alice", "empty"), "");
    WriteFile(RecordPath("alice", "truncated"), RecordText("alice", "truncated").substr(0, 40));
    WriteFile(RecordPath("alice", "foreign"), "PNG\r\n\x1a\n");
    WriteFile(RecordPath("alice", "huge"), "");
    ASSERT_EQ(truncate(RecordPath("alice", "huge").c_str(), 1L << 40), 0);
    for (const char* id : {"empty", "truncated", "foreign", "huge"}) {
        EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id)) << id;
        EXPECT_FALSE(Task("alice", id).setProperty("a", 1)) << id;
        EXPECT_FALSE(Task("alice", id).finish(true)) << id;
        EXPECT_FALSE(Task("alice", id).waitForDataReady("a", 60)) << id;
    }
    EXPECT_EQ(Json::toString(TaskMgr("alice").getAllTaskId(nullptr)), R"(["good"])");
}

TEST_F(TaskTrustTest, AFolderThatOthersMayEmptyIsNoStore) {
    ASSERT_TRUE(Task("alice", "1").setProperty("a", 1));
    ASSERT_EQ(chmod(TaskFolder().c_str(), 0777), 0);
    EXPECT_FALSE(TaskUtil::checkTaskExists("alice", "1"));
    ASSERT_EQ(chmod(TaskFolder().c_str(), 01733), 0);
    ASSERT_EQ(chown(TaskFolder().c_str(), kAlice.uid, kAlice.uid), 0);
    EXPECT_FALSE(TaskUtil::checkTaskExists("alice", "1"));
    EXPECT_EQ(LoggedTimes("task folder"), 2);
}

TEST_F(TaskTrustTest, RootMakesTheFolderAndAUserCannot) {
    ASSERT_EQ(rmdir(TaskFolder().c_str()), 0);
    EXPECT_EQ(WriteAs(kAlice, "alice", "1"), 1);
    EXPECT_FALSE(Exists(TaskFolder()));
    ASSERT_TRUE(Task("alice", "2").setProperty("a", 1));
    EXPECT_EQ(ModeOf(TaskFolder()), 01733u);
    EXPECT_EQ(WriteAs(kAlice, "alice", "1"), 0);
}

TEST_F(TaskTrustTest, ALockHeldByAUserDelaysRootForSecondsOnly) {
    ASSERT_EQ(WriteAs(kAlice, "alice", "1"), 0);
    int ready[2];
    ASSERT_EQ(pipe(ready), 0);
    const pid_t holder = fork();
    if (holder == 0) {
        const int file = open(RecordPath("alice", "1").c_str(), O_RDONLY);
        flock(file, LOCK_EX);
        [[maybe_unused]] const ssize_t told = write(ready[1], "x", 1);
        pause();
        _exit(0);
    }
    char byte;
    ASSERT_EQ(read(ready[0], &byte, 1), 1);
    EXPECT_TRUE(TaskUtil::checkTaskExists("alice", "1")) << "readers do not wait";
    EXPECT_LT(SecondsOf([] { EXPECT_FALSE(Task("alice", "1").finish(false)); }), 20);
    kill(holder, SIGKILL);
    waitpid(holder, nullptr, 0);
    close(ready[0]);
    close(ready[1]);
    EXPECT_TRUE(Task("alice", "1").finish(false));
}

TEST_F(TaskTrustTest, AUsersRecordNamesTheUsersProcess) {
    const pid_t child = fork();
    if (child == 0) {
        const bool changed =
            setresgid(kAlice.uid, kAlice.uid, kAlice.uid) == 0 && setresuid(kAlice.uid, kAlice.uid, kAlice.uid) == 0;
        Task("alice", "1").setCreatePid(changed ? getpid() : 0);
        pause();
        _exit(0);
    }
    EXPECT_TRUE(Eventually([child] { return Task("alice", "1").getCreatePid() == child; }));
    EXPECT_TRUE(reference::HasProcessUser(child, kAlice.uid));
    EXPECT_FALSE(reference::HasProcessUser(child, kBob.uid));
    kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
    EXPECT_FALSE(reference::HasProcessUser(child, kAlice.uid)) << "gone";
}
