#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <limits>
#include <set>

#include "TaskDevice.h"
#include "taskmanager.h"
#include "webapi/Json.h"

using ZELM::Task;
using ZELM::TaskMgr;
using ZELM::TaskUtil;

namespace {

using TaskStoreTest = TaskTest;

bool MakeRecord(const std::string& owner, const std::string& id) {
    return Task(owner.c_str(), id.c_str()).setProperty("info", "x");
}

struct stat StatusOf(const std::string& path) {
    struct stat status = {};
    EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
    return status;
}

/** Puts the record's removal that many seconds into the past. */
void AgeRemoval(const std::string& owner, const std::string& id, unsigned int seconds) {
    const std::string path = RecordPath(owner, id);
    const struct stat status = StatusOf(path);
    Json::Value record = Parse(ReadWholeFile(path));
    ASSERT_GT(record["removed_at"].asUInt64(), seconds) << "the machine has not run that long";
    record["removed_at"] = Json::UInt64(record["removed_at"].asUInt64() - seconds);
    WriteFile(path, Json::toString(record), status.st_uid, status.st_mode & 0777);
}

/** Makes all that lies in the store two days old, then the next sweep due, and sweeps. */
void SweepAfterTwoDays() {
    for (const std::string& file : FilesIn(TaskFolder())) {
        MakeOlder(TaskFolder() + "/" + file, 2 * 24 * 60 * 60);
    }
    MakeOlder(InRoot("/run/zova/tasks.swept"), 31);
    TaskUtil::getUniqueID("alice", "");
}

}  // namespace

// ---- properties ----

TEST_F(TaskStoreTest, KeepsPropertiesForOtherObjectsAndProcesses) {
    Task task("alice", "1");
    task.beginUpdate();
    task.setProperty("info", Parse(R"({"a":[1,"x"]})"));
    task.setProperty("auto_remove", true);
    EXPECT_FALSE(TaskUtil::checkTaskExists("alice", "1")) << "nothing is stored before the end of the update";
    EXPECT_TRUE(task.endUpdate());
    EXPECT_EQ(StatusOfChild([] {
                  const Task other("alice", "1");
                  return Json::toString(other.getProperty("info")) == R"({"a":[1,"x"]})" &&
                                 other.getBoolProperty("auto_remove", false)
                             ? 0
                             : 1;
              }),
              0);
    EXPECT_STREQ(task.getTaskId(), "1");
}

TEST_F(TaskStoreTest, GivesNullAndTheFallbackForWhatIsNotThere) {
    Task task("alice", "1");
    EXPECT_TRUE(task.getProperty("body").isNull());
    ASSERT_TRUE(task.setProperty("info", "text"));
    EXPECT_TRUE(task.getProperty("body").isNull());
    EXPECT_FALSE(task.hasProperty("body"));
    EXPECT_TRUE(task.hasProperty("info"));
    EXPECT_TRUE(task.getBoolProperty("body", true));
    EXPECT_TRUE(task.getBoolProperty("info", true)) << "a text is no bool";
    EXPECT_FALSE(task.isFinished());
    EXPECT_EQ(task.getCreatePid(), 0);
}

TEST_F(TaskStoreTest, ReadingMakesNoRecord) {
    Task task("alice", "1");
    task.reload();
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}

TEST_F(TaskStoreTest, SeesOtherProcessesWritesAfterReload) {
    Task task("alice", "1");
    ASSERT_TRUE(task.setProperty("a", 1));
    ASSERT_EQ(StatusOfChild([] { return Task("alice", "1").setProperty("b", 2) ? 0 : 1; }), 0);
    EXPECT_FALSE(task.hasProperty("b"));
    EXPECT_TRUE(task.reload());
    EXPECT_TRUE(task.hasProperty("b"));
}

TEST_F(TaskStoreTest, AWriteKeepsWhatOthersWroteMeanwhile) {
    Task first("alice", "1");
    ASSERT_TRUE(first.setProperty("a", 1));
    Task second("alice", "1");
    ASSERT_TRUE(first.setProperty("b", 2));
    ASSERT_TRUE(second.setProperty("c", 3));
    const Task third("alice", "1");
    EXPECT_TRUE(third.hasProperty("a") && third.hasProperty("b") && third.hasProperty("c"));
}

TEST_F(TaskStoreTest, LosesNothingOfManyProcessesThatWriteAtOnce) {
    constexpr int kWriters = 6;
    constexpr int kWrites = 25;
    ASSERT_TRUE(MakeRecord("alice", "1"));
    for (int writer = 0; writer < kWriters; ++writer) {
        if (fork() == 0) {
            Task task("alice", "1");
            int failed = 0;
            for (int number = 0; number < kWrites; ++number) {
                const std::string name = std::to_string(writer) + "-" + std::to_string(number);
                failed += task.setProperty(name.c_str(), number) ? 0 : 1;
            }
            _exit(failed);
        }
    }
    for (int writer = 0; writer < kWriters; ++writer) {
        int status = 0;
        ASSERT_GT(wait(&status), 0);
        EXPECT_EQ(status, 0);
    }
    const Json::Value record = Parse(ReadWholeFile(RecordPath("alice", "1")));
    EXPECT_EQ(record["properties"].size(), kWriters * kWrites + 1u);
    EXPECT_EQ(FilesIn(TaskFolder()).size(), 1u) << "nothing is left beside the record";
}

TEST_F(TaskStoreTest, ManyProcessesThatCreateOneRecordMakeOneOfAllTheirWrites) {
    constexpr int kWriters = 8;
    for (int writer = 0; writer < kWriters; ++writer) {
        if (fork() == 0) {
            _exit(Task("alice", "1").setProperty(std::to_string(writer).c_str(), true) ? 0 : 1);
        }
    }
    for (int writer = 0; writer < kWriters; ++writer) {
        int status = 0;
        ASSERT_GT(wait(&status), 0);
        EXPECT_EQ(status, 0);
    }
    EXPECT_EQ(Parse(ReadWholeFile(RecordPath("alice", "1")))["properties"].size(), kWriters + 0u);
}

TEST_F(TaskStoreTest, AReaderSeesWholeRecordsWhileAWriterIsKilled) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    const std::string filling(50000, 'x');
    for (int round = 0; round < 40; ++round) {
        const pid_t writer = fork();
        if (writer == 0) {
            Task task("alice", "1");
            for (int number = 0;; ++number) {
                task.beginUpdate();
                task.setProperty("number", number);
                task.setProperty("body", filling + std::to_string(number));
                task.endUpdate();
            }
        }
        for (int look = 0; look < 10 + round; ++look) {
            const Task task("alice", "1");
            ASSERT_TRUE(task.hasProperty("info")) << "never half written, never gone";
            if (task.hasProperty("number")) {
                ASSERT_EQ(Json::asString(task.getProperty("body")),
                          filling + std::to_string(Json::asInt(task.getProperty("number"))));
            }
        }
        kill(writer, SIGKILL);
        ASSERT_EQ(waitpid(writer, nullptr, 0), writer);
    }
    EXPECT_TRUE(Task("alice", "1").setProperty("after", true)) << "the dead writer's lock is gone";
}

TEST_F(TaskStoreTest, RefusesAValueThatCouldNotBeReadAgain) {
    Json::Value deep;
    for (int level = 0; level < 300; ++level) {
        Json::Value outer(Json::arrayValue);
        outer.append(deep);
        deep.swap(outer);
    }
    ASSERT_TRUE(MakeRecord("alice", "1"));
    Task task("alice", "1");
    EXPECT_FALSE(task.setProperty("body", deep));
    EXPECT_FALSE(task.setProperty("body", std::string(9 << 20, 'x'))) << "longer than a record may be";
    EXPECT_TRUE(Task("alice", "1").hasProperty("info"));
}

TEST_F(TaskStoreTest, KeepsANumberThatJsonCannotHoldAsNull) {
    constexpr double kInfinity = std::numeric_limits<double>::infinity();
    Json::Value body = Parse(R"({"text":"1e+9999","part":0.5})");
    body["percent"] = kInfinity;
    body["left"].append(-kInfinity);
    body["left"].append(std::numeric_limits<double>::quiet_NaN());
    ASSERT_TRUE(MakeRecord("alice", "1"));
    EXPECT_TRUE(Task("alice", "1").setProperty("body", body));
    const Task task("alice", "1");
    EXPECT_TRUE(task.hasProperty("info")) << "the record can be read";
    EXPECT_EQ(Json::toString(task.getProperty("body")),
              R"({"left":[null,null],"part":0.5,"percent":null,"text":"1e+9999"})");
}

TEST_F(TaskStoreTest, KeepsTheOldRecordWhenAWriteFails) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    EXPECT_EQ(StatusOfChild([] {
                  const struct rlimit none = {10, 10};
                  setrlimit(RLIMIT_FSIZE, &none);
                  signal(SIGXFSZ, SIG_IGN);
                  return Task("alice", "1").setProperty("b", std::string(1000, 'b')) ? 1 : 0;
              }),
              0);
    EXPECT_TRUE(Task("alice", "1").hasProperty("info"));
    EXPECT_EQ(FilesIn(TaskFolder()).size(), 1u);
}

// ---- ids ----

TEST_F(TaskStoreTest, GivesIdsThatNobodyGuesses) {
    std::set<std::string> ids;
    for (int number = 0; number < 1000; ++number) {
        const std::string id = TaskUtil::getUniqueID("alice", "copy-");
        EXPECT_EQ(id.substr(0, 5), "copy-");
        EXPECT_EQ(id.size(), 5u + 32u);
        ids.insert(id);
    }
    EXPECT_EQ(ids.size(), 1000u);
    EXPECT_EQ(TaskUtil::getUniqueID("alice", nullptr).size(), 32u);
}

TEST_F(TaskStoreTest, GivesNoIdForAnOwnerOrPrefixThatNamesNoTask) {
    EXPECT_EQ(TaskUtil::getUniqueID("", ""), "");
    EXPECT_EQ(TaskUtil::getUniqueID(nullptr, ""), "");
    EXPECT_EQ(TaskUtil::getUniqueID("a/b", ""), "");
    EXPECT_EQ(TaskUtil::getUniqueID("alice", "../"), "");
}

TEST_F(TaskStoreTest, AKeyThatNamesNoTaskIsARecordThatDoesNotExist) {
    WriteFile(InRoot("/run/zova/secret"), "{}");
    for (const char* id : {"", ".", "..", "../secret", "../../etc/passwd", "/etc/passwd", "a/b", "a\nb"}) {
        Task task("alice", id);
        EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id)) << id;
        EXPECT_FALSE(task.setProperty("a", 1)) << id;
        EXPECT_FALSE(task.finish(true)) << id;
        EXPECT_FALSE(task.remove()) << id;
        EXPECT_FALSE(task.waitForDataReady("a", 10)) << id;
        EXPECT_STREQ(task.getTaskId(), id);
    }
    for (const char* owner : {"", "..", "@root", "a/b", "../.."}) {
        Task task(owner, "1");
        if (std::string(owner) != "..") {
            EXPECT_FALSE(task.setProperty("a", 1)) << owner;
        }
        EXPECT_FALSE(TaskUtil::checkTaskExists(owner, "2")) << owner;
    }
    EXPECT_EQ(FilesIn(InRoot("/run/zova")), (std::vector<std::string>{"secret", "tasks", "tasks.swept"}));
    EXPECT_EQ(ReadWholeFile(InRoot("/run/zova/secret")), "{}");
}

TEST_F(TaskStoreTest, AnOwnerMadeOfPointsStaysInTheStore) {
    EXPECT_TRUE(MakeRecord("..", "1"));
    EXPECT_EQ(FilesIn(TaskFolder()), std::vector<std::string>{"2e2e.1"});
}

// ---- listing ----

TEST_F(TaskStoreTest, ListsTheOwnersIdsWithThePrefixInOrder) {
    for (const char* id : {"b-2", "a-1", "b-1"}) {
        ASSERT_TRUE(MakeRecord("alice", id));
    }
    ASSERT_TRUE(MakeRecord("alic", "e.9"));
    ASSERT_TRUE(MakeRecord("bob", "b-3"));
    EXPECT_EQ(Json::toString(TaskMgr("alice").getAllTaskId(nullptr)), R"(["a-1","b-1","b-2"])");
    EXPECT_EQ(Json::toString(TaskMgr("alice").getAllTaskId("b-")), R"(["b-1","b-2"])");
    EXPECT_EQ(Json::toString(TaskMgr("alice").getAllTaskId("../")), "[]");
    EXPECT_EQ(Json::toString(TaskMgr("nobody").getAllTaskId(nullptr)), "[]");
    EXPECT_EQ(Json::toString(TaskMgr("").getAllTaskId(nullptr)), "[]");
    EXPECT_EQ(Json::toString(TaskMgr(nullptr).getAllTaskId(nullptr)), "[]");
}

TEST_F(TaskStoreTest, ListsOnlyWhatIsARecord) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    WriteFile(RecordPath("alice", "broken"), "{");
    WriteFile(RecordPath("alice", "forged"), ReadWholeFile(RecordPath("alice", "1")), kBob.uid);
    WriteFile(TaskFolder() + "/garbage", "");
    ASSERT_EQ(mkdir(RecordPath("alice", "folder").c_str(), 0700), 0);
    EXPECT_EQ(Json::toString(TaskMgr("alice").getAllTaskId(nullptr)), R"(["1"])");
}

// ---- the end of a task ----

TEST_F(TaskStoreTest, FinishWithoutRemovalKeepsTheRecord) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    Task task("alice", "1");
    EXPECT_TRUE(task.finish(false));
    EXPECT_TRUE(task.isFinished());
    EXPECT_TRUE(Task("alice", "1").isFinished());
}

TEST_F(TaskStoreTest, ARecordToBeRemovedAnswersForAMinuteAndIsGoneThen) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    ASSERT_TRUE(Task("alice", "1").finish(true));
    AgeRemoval("alice", "1", 59);
    EXPECT_TRUE(TaskUtil::checkTaskExists("alice", "1"));
    EXPECT_TRUE(Task("alice", "1").isFinished());
    AgeRemoval("alice", "1", 1);
    EXPECT_FALSE(TaskUtil::checkTaskExists("alice", "1"));
    EXPECT_FALSE(Exists(RecordPath("alice", "1")));
}

TEST_F(TaskStoreTest, ALaterFinishDoesNotTakeARemovalBack) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    ASSERT_TRUE(Task("alice", "1").finish(true));
    const Json::Value before = Parse(ReadWholeFile(RecordPath("alice", "1")));
    ASSERT_TRUE(Task("alice", "1").finish(false));
    EXPECT_EQ(ReadWholeFile(RecordPath("alice", "1")), Json::toString(before));
}

TEST_F(TaskStoreTest, ARecordThatWasRemovedIsNotMadeAnew) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    Task late("alice", "1");
    EXPECT_TRUE(Task("alice", "1").remove());
    EXPECT_FALSE(late.setProperty("body", 1));
    EXPECT_FALSE(late.finish(false));
    EXPECT_FALSE(late.reload());
    EXPECT_FALSE(late.remove());
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}

// ---- housekeeping ----

TEST_F(TaskStoreTest, SweepsWhatIsOverAndNothingElse) {
    for (const char* id : {"over", "fresh", "kept", "crashed", "running", "new"}) {
        ASSERT_TRUE(MakeRecord("alice", id));
    }
    ASSERT_TRUE(Task("alice", "over").finish(true));
    ASSERT_TRUE(Task("alice", "fresh").finish(true));
    ASSERT_TRUE(Task("alice", "kept").finish(false));
    ASSERT_TRUE(Task("alice", "running").setCreatePid(getpid()));
    WriteFile(TaskFolder() + "/.new-0123", "{");
    WriteFile(TaskFolder() + "/garbage", "");
    WriteFile(RecordPath("alice", "broken"), "{");
    constexpr long kTwoDays = 2 * 24 * 60 * 60;
    for (const char* id : {"over", "kept", "crashed", "running", "broken"}) {
        MakeOlder(RecordPath("alice", id), kTwoDays);
    }
    MakeOlder(TaskFolder() + "/.new-0123", 61);
    MakeOlder(TaskFolder() + "/garbage", kTwoDays);
    MakeOlder(InRoot("/run/zova/tasks.swept"), 31);
    TaskUtil::checkTaskExists("alice", "1");
    const std::vector<std::string> files = FilesIn(TaskFolder());
    const std::string alice = "616c696365.";
    EXPECT_EQ(files, (std::vector<std::string>{alice + "fresh", alice + "kept", alice + "new", alice + "running"}));
}

TEST_F(TaskStoreTest, SweepsNoRecordOnlyBecauseNobodyKnowsItsUser) {
    for (const char* id : {"crashed", "kept", "linked", "open", "running"}) {
        ASSERT_TRUE(MakeRecord("far", id));
        ASSERT_TRUE(Task("far", id).setCreatePid(id == std::string("crashed") ? 0 : getpid()));
    }
    ASSERT_TRUE(Task("far", "kept").finish(false));
    ASSERT_EQ(link(RecordPath("far", "linked").c_str(), InRoot("/run/zova/link").c_str()), 0);
    ASSERT_EQ(chmod(RecordPath("far", "open").c_str(), 0644), 0);
    // What "far" keeps is not believed while the user database does not know "far".
    for (const char* id : {"crashed", "kept", "linked", "open", "running"}) {
        ASSERT_EQ(chown(RecordPath("far", id).c_str(), kUnknownUid, kUnknownUid), 0);
        ASSERT_FALSE(TaskUtil::checkTaskExists("far", id));
    }
    ASSERT_TRUE(MakeRecord("far", "forged"));
    ASSERT_TRUE(Task("far", "forged").setCreatePid(getpid()));
    ASSERT_EQ(chown(RecordPath("far", "forged").c_str(), kAlice.uid, kAlice.uid), 0);
    SweepAfterTwoDays();
    EXPECT_EQ(FilesIn(TaskFolder()), (std::vector<std::string>{"666172.kept", "666172.running"}));
}

TEST_F(TaskStoreTest, SweepsNoRecordOnlyBecauseItCannotBeOpenedNow) {
    ASSERT_TRUE(MakeRecord("alice", "1"));
    ASSERT_TRUE(Task("alice", "1").setCreatePid(getpid()));
    ASSERT_TRUE(TaskUtil::checkTaskExists("alice", "1"));
    // The first goes to the list of the folder, the second to the record.
    for (const int descriptors : {1, 2}) {
        EXPECT_EQ(StatusOfChild([descriptors] {
                      const rlim_t lowest = static_cast<rlim_t>(dup(STDERR_FILENO));
                      close(static_cast<int>(lowest));
                      const struct rlimit few = {lowest + descriptors, lowest + descriptors};
                      if (setrlimit(RLIMIT_NOFILE, &few) != 0) {
                          return 1;
                      }
                      SweepAfterTwoDays();
                      return ::testing::Test::HasFailure() ? 2 : 0;
                  }),
                  0);
        EXPECT_TRUE(Task("alice", "1").hasProperty("info")) << descriptors;
    }
}

TEST_F(TaskStoreTest, SweepsAtMostOnceInHalfAMinute) {
    TaskUtil::checkTaskExists("alice", "1");
    WriteFile(TaskFolder() + "/.new-0123", "{");
    MakeOlder(TaskFolder() + "/.new-0123", 100);
    TaskUtil::checkTaskExists("alice", "1");
    EXPECT_TRUE(Exists(TaskFolder() + "/.new-0123"));
    MakeOlder(InRoot("/run/zova/tasks.swept"), 30);
    TaskUtil::checkTaskExists("alice", "1");
    EXPECT_FALSE(Exists(TaskFolder() + "/.new-0123"));
}
