#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "TaskDevice.h"
#include "taskmanager.h"
#include "webapi/Json.h"

using ZELM::Task;

namespace {

using TaskWaitTest = TaskTest;

bool MakeRecord(const std::string& owner, const std::string& id) {
    return Task(owner.c_str(), id.c_str()).setProperty("info", "x");
}

}  // namespace

// ---- the process of a task ----

TEST_F(TaskWaitTest, KnowsTheTasksProcessUntilItEnds) {
    const pid_t child = fork();
    if (child == 0) {
        pause();
        _exit(0);
    }
    ASSERT_TRUE(Task("alice", "1").setCreatePid(child));
    EXPECT_EQ(Task("alice", "1").getCreatePid(), child);
    kill(child, SIGKILL);
    ASSERT_TRUE(Eventually([child] { return !IsRunning(child); }));
    EXPECT_EQ(Task("alice", "1").getCreatePid(), 0) << "a zombie works on nothing";
    ASSERT_EQ(waitpid(child, nullptr, 0), child);
    EXPECT_EQ(Task("alice", "1").getCreatePid(), 0);
}

TEST_F(TaskWaitTest, AnotherProcessOfTheSameIdIsNotTheTasks) {
    ASSERT_TRUE(Task("alice", "1").setCreatePid(getpid()));
    Json::Value record = Parse(ReadWholeFile(RecordPath("alice", "1")));
    record["process_start"] = Json::UInt64(record["process_start"].asUInt64() + 1);
    WriteFile(RecordPath("alice", "1"), Json::toString(record));
    EXPECT_EQ(Task("alice", "1").getCreatePid(), 0);
}

TEST_F(TaskWaitTest, AUsersRecordCannotPointAtAProcessOfAnother) {
    ASSERT_TRUE(Task("alice", "1").setCreatePid(getpid()));
    ASSERT_EQ(Task("alice", "1").getCreatePid(), getpid());
    ASSERT_EQ(chown(RecordPath("alice", "1").c_str(), kAlice.uid, kAlice.uid), 0);
    EXPECT_EQ(Task("alice", "1").getCreatePid(), 0);
}

TEST_F(TaskWaitTest, APidThatIsNoneIsNone) {
    ASSERT_TRUE(Task("alice", "1").setCreatePid(-5));
    EXPECT_EQ(Task("alice", "1").getCreatePid(), 0);
}

// ---- waiting ----

TEST_F(TaskWaitTest, WaitsNotAtAllForWhatIsThere) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    Task task("alice", "1");
    EXPECT_LT(SecondsOf([&] { EXPECT_TRUE(task.waitForDataReady("info", 60)); }), 5);
}

TEST_F(TaskWaitTest, IsWokenByAnotherProcessesWrite) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    Task task("alice", "1");
    const pid_t child = fork();
    if (child == 0) {
        Task other("alice", "1");
        other.setCreatePid(getpid());
        for (int number = 0; number < 20; ++number) {
            other.setProperty("progress", number);
            usleep(5000);
        }
        other.setProperty("task_run", true);
        pause();
        _exit(0);
    }
    EXPECT_LT(SecondsOf([&] { EXPECT_TRUE(task.waitForDataReady("task_run", 60)); }), 20);
    EXPECT_TRUE(task.hasProperty("task_run")) << "the object has read what it waited for";
    kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
}

TEST_F(TaskWaitTest, EndsTheWaitWhenTheTimeIsUp) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    Task task("alice", "1");
    const double seconds = SecondsOf([&] { EXPECT_FALSE(task.waitForDataReady("task_run", 1)); });
    EXPECT_GE(seconds, 0.95);
    EXPECT_LT(seconds, 20);
    EXPECT_FALSE(task.waitForDataReady("task_run", 0));
    EXPECT_FALSE(task.waitForDataReady("task_run", -1));
    EXPECT_FALSE(task.waitForDataReady(nullptr, 1));
}

TEST_F(TaskWaitTest, EndsTheWaitWhenTheProcessIsKilled) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    const pid_t child = fork();
    if (child == 0) {
        Task("alice", "1").setCreatePid(getpid());
        usleep(100000);
        kill(getpid(), SIGKILL);
    }
    Task task("alice", "1");
    EXPECT_LT(SecondsOf([&] { EXPECT_FALSE(task.waitForDataReady("task_run", 60)); }), 20);
    waitpid(child, nullptr, 0);
}

TEST_F(TaskWaitTest, SeesWhatAProcessWroteJustBeforeItsEnd) {
    for (int round = 0; round < 20; ++round) {
        const std::string id = std::to_string(round);
        ASSERT_TRUE(MakeRecord("alice", id));
        const pid_t child = fork();
        if (child == 0) {
            Task other("alice", id.c_str());
            other.setCreatePid(getpid());
            other.setProperty("task_run", true);
            _exit(0);
        }
        Task task("alice", id.c_str());
        EXPECT_TRUE(task.waitForDataReady("task_run", 60));
        waitpid(child, nullptr, 0);
    }
}

TEST_F(TaskWaitTest, WaitsOnForATaskThatFinishedWithoutTheProperty) {
    ASSERT_EQ(StatusOfChild([] {
                  Task task("alice", "1");
                  return task.setCreatePid(getpid()) && task.finish(false) ? 0 : 1;
              }),
              0);
    Task task("alice", "1");
    EXPECT_GE(SecondsOf([&] { EXPECT_FALSE(task.waitForDataReady("task_run", 1)); }), 0.95);
}

TEST_F(TaskWaitTest, EndsTheWaitWhenTheRecordGoes) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    const pid_t child = fork();
    if (child == 0) {
        usleep(100000);
        Task("alice", "1").remove();
        _exit(0);
    }
    Task task("alice", "1");
    EXPECT_LT(SecondsOf([&] { EXPECT_FALSE(task.waitForDataReady("task_run", 60)); }), 20);
    EXPECT_FALSE(task.hasProperty("info"));
    waitpid(child, nullptr, 0);
}

// ---- what a wait leaves behind ----

namespace {

/** Queues of file events that this process holds. */
int CountFileEvents() {
    int count = 0;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code gone;
        count += std::filesystem::read_symlink(entry, gone) == "anon_inode:inotify" ? 1 : 0;
    }
    return count;
}

/** Watches set on it, as the kernel tells them. */
int CountWatches() {
    int count = 0;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fdinfo")) {
        std::ifstream info(entry.path());
        for (std::string line; std::getline(info, line);) {
            count += line.rfind("inotify ", 0) == 0 ? 1 : 0;
        }
    }
    return count;
}

}  // namespace

TEST_F(TaskWaitTest, ManyWaitsUseOneQueueAndLeaveNoWatch) {
    for (const char* id : {"1", "2", "3", "4"}) {
        ASSERT_TRUE(MakeRecord("alice", id));
        EXPECT_FALSE(Task("alice", id).waitForDataReady("none", 0));
    }
    EXPECT_EQ(CountFileEvents(), 1);
    EXPECT_EQ(CountWatches(), 0);
}

TEST_F(TaskWaitTest, AForkedProcessWaitsWithAQueueOfItsOwn) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    EXPECT_FALSE(Task("alice", "1").waitForDataReady("none", 0));
    const pid_t child = fork();
    if (child == 0) {
        // The parent's queue stays as it is, whatever the child does.
        Task("alice", "1").waitForDataReady("none", 0);
        _exit(CountFileEvents() == 1 ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    const pid_t writer = fork();
    if (writer == 0) {
        usleep(50'000);
        Task("alice", "1").setProperty("late", true);
        _exit(0);
    }
    EXPECT_LT(SecondsOf([] { EXPECT_TRUE(Task("alice", "1").waitForDataReady("late", 60)); }), 30);
    ASSERT_EQ(waitpid(writer, nullptr, 0), writer);
}
