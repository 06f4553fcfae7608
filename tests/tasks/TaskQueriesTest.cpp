#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include "PollingFixture.h"

namespace {

using TaskQueriesTest = PollingTest;

/** A record that no process serves. */
void MakeRecord(const std::string& owner, const std::string& id) {
    ZELM::Task task(owner.c_str(), id.c_str());
    task.beginUpdate();
    task.setProperty("info", Parse(R"({"api":"ZOVA.Test"})"));
    task.setProperty("auto_remove", true);
    ASSERT_TRUE(task.endUpdate());
}

struct BadIdRow {
    const char* name;
    std::string id;
    int status;
    int stop;
};

class BadTaskId : public TaskTest, public ::testing::WithParamInterface<BadIdRow> {};

bool IsPrintable(const std::string& line) {
    for (const char c : line) {
        if (c < 0x20 || c > 0x7e) {
            return false;
        }
    }
    return true;
}

}  // namespace

TEST_P(BadTaskId, IsRefusedAndForgesNoLogLine) {
    MakeRecord("alice", "1");
    MakeRecord("bob", "1");
    MakeRecord("@administrators", "1");
    TaskCall call("alice");
    Json::Value out = "untouched";
    EXPECT_FALSE(call.polling.Status(GetParam().id, out));
    EXPECT_EQ(call.polling.GetError(), GetParam().status);
    EXPECT_EQ(out, "untouched");
    EXPECT_FALSE(call.polling.Stop(GetParam().id, true));
    EXPECT_EQ(call.polling.GetError(), GetParam().stop);
    EXPECT_FALSE(LogLines().empty());
    for (const std::string& line : LogLines()) {
        EXPECT_TRUE(IsPrintable(line)) << line;
        EXPECT_EQ(line.rfind("APIPolling:", 0), 0u) << line;
    }
    for (const char* owner : {"alice", "bob", "@administrators"}) {
        EXPECT_FALSE(ZELM::Task(owner, "1").isFinished()) << owner;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Rows, BadTaskId,
    ::testing::Values(BadIdRow{"NoSlash", "1", 503, 502}, BadIdRow{"Empty", "", 502, 502},
                      BadIdRow{"AnotherUsers", "bob/1", 503, 503},
                      BadIdRow{"Administrators", "@administrators/1", 503, 503}, BadIdRow{"EmptyOwner", "/1", 503, 503},
                      BadIdRow{"EmptyId", "alice/", 508, 508}, BadIdRow{"Unknown", "alice/2", 508, 508},
                      BadIdRow{"Above", "alice/..", 508, 508}, BadIdRow{"Climbing", "alice/../bob/1", 508, 508},
                      BadIdRow{"MoreSlashes", "alice/1/2", 508, 508}, BadIdRow{"DoubleSlash", "alice//1", 508, 508},
                      BadIdRow{"Nul", std::string("alice/1\0x", 9), 508, 508},
                      BadIdRow{"NulInOwner", std::string("alice\0/1", 8), 503, 503},
                      BadIdRow{"Newline", "alice/1\nroot: all is well", 508, 508},
                      BadIdRow{"NotAscii", "alice/\xff\xfe", 508, 508}, BadIdRow{"Percent", "alice/%31", 508, 508},
                      BadIdRow{"Format", "alice/%s%n", 508, 508},
                      BadIdRow{"Long", "alice/" + std::string(100000, 'a'), 508, 508},
                      BadIdRow{"LongOwner", std::string(100000, 'a') + "/1", 503, 503}),
    [](const auto& row) { return std::string(row.param.name); });

// ---- status ----

TEST_F(TaskQueriesTest, ATaskThatHasNotReportedHasNoBody) {
    MakeRecord("alice", "1");
    EXPECT_EQ(Json::toString(TaskCall("alice").Status("alice/1")),
              R"({"auto_remove":true,"finish":false,"info":{"api":"ZOVA.Test"}})");
}

TEST_F(TaskQueriesTest, ARecordWithoutAnythingIsATaskAllTheSame) {
    ASSERT_TRUE(ZELM::Task("alice", "1").setCreatePid(0));
    EXPECT_EQ(Json::toString(TaskCall("alice").Status("alice/1")), R"({"auto_remove":null,"finish":false})");
}

TEST_F(TaskQueriesTest, ABodyThatIsNoObjectCountsAsNone) {
    ASSERT_TRUE(ZELM::Task("alice", "1").setProperty("body", Json::Value(5)));
    EXPECT_EQ(Json::toString(TaskCall("alice").Status("alice/1")), R"({"auto_remove":null,"finish":false})");
}

TEST_F(TaskQueriesTest, TakesACharacterPointerToo) {
    MakeRecord("alice", "1");
    TaskCall call("alice");
    Json::Value out;
    const char* id = "alice/1";
    EXPECT_TRUE(call.polling.Status(id, out));
    const char* none = nullptr;
    EXPECT_FALSE(call.polling.Status(none, out));
    EXPECT_EQ(call.polling.GetError(), 502);
}

TEST_F(TaskQueriesTest, SeveralTasksLeaveOutWhatIsNotTheCallersAndShowWhatIsGone) {
    MakeRecord("alice", "1");
    MakeRecord("bob", "1");
    MakeRecord("@users", "1");
    TaskCall call("alice");
    Json::Value out = "before";
    ASSERT_TRUE(call.polling.Status(Parse(R"(["alice/1","bob/1","@users/1","alice/2","x",7,null,{},["a/1"]])"), out));
    EXPECT_EQ(out.size(), 3u);
    EXPECT_EQ(out["alice/1"]["finish"], false);
    EXPECT_EQ(out["@users/1"]["finish"], false);
    EXPECT_EQ(Json::toString(out["alice/2"]), "{}");
    EXPECT_EQ(call.polling.GetError(), 500);
    EXPECT_EQ(LoggedTimes("Invalid task id[bob/1]"), 1);
}

TEST_F(TaskQueriesTest, NoTasksAreAnEmptyObject) {
    TaskCall call("alice");
    Json::Value out = "before";
    EXPECT_TRUE(call.polling.Status(Parse("[]"), out));
    EXPECT_EQ(Json::toString(out), "{}");
}

TEST_F(TaskQueriesTest, SeveralTasksMustBeAnArray) {
    TaskCall call("alice");
    Json::Value out;
    EXPECT_FALSE(call.polling.Status(Parse(R"({"a":1})"), out));
    EXPECT_EQ(call.polling.GetError(), 502);
}

TEST_F(TaskQueriesTest, NothingIsAnsweredWithoutARequest) {
    ZOVA::APIPolling polling;
    Json::Value out;
    EXPECT_FALSE(polling.Status(std::string("alice/1"), out));
    EXPECT_FALSE(polling.Status(Parse("[]"), out));
    EXPECT_FALSE(polling.Stop("alice/1", true));
    EXPECT_FALSE(polling.List("", Parse("[]"), out));
    EXPECT_EQ(polling.GetError(), 502);
    EXPECT_EQ(LoggedTimes("unknown request"), 4);
}

// ---- stop ----

TEST_F(TaskQueriesTest, StopEndsTheProcessAndKeepsTheRecordIfAsked) {
    TaskCall call("alice");
    ASSERT_TRUE(call.Start(ReportAndWork));
    const std::string id = call.TaskId();
    const int pid = PidOf(id);
    ASSERT_GT(pid, 0);
    TaskCall other("alice");
    EXPECT_TRUE(other.polling.Stop(id, false));
    EXPECT_TRUE(Eventually([pid] { return !IsRunning(pid); }));
    EXPECT_EQ(other.Status(id)["finish"], true);
    EXPECT_EQ(Parse(ReadWholeFile(RecordPath("alice", IdOf(id))))["removed"], false);
    EXPECT_TRUE(other.polling.Stop(id, true)) << "a stopped task can be stopped again";
    EXPECT_EQ(Parse(ReadWholeFile(RecordPath("alice", IdOf(id))))["removed"], true);
}

TEST_F(TaskQueriesTest, StatusAndStopAnswerAfterTheProcessWasKilled) {
    TaskCall call("alice");
    ASSERT_TRUE(call.Start(ReportAndWork));
    const std::string id = call.TaskId();
    const int pid = PidOf(id);
    ASSERT_EQ(kill(pid, SIGKILL), 0);
    ASSERT_TRUE(Eventually([pid] { return !IsRunning(pid); }));
    EXPECT_EQ(call.Status(id)["finish"], false);
    EXPECT_EQ(PidOf(id), 0);
    EXPECT_TRUE(call.polling.Stop(id, true));
    EXPECT_EQ(call.Status(id)["finish"], true);
}

TEST_F(TaskQueriesTest, StopOfATaskWithoutAProcessMarksItFinished) {
    MakeRecord("alice", "1");
    TaskCall call("alice");
    EXPECT_TRUE(call.polling.Stop("alice/1", false));
    EXPECT_EQ(call.Status("alice/1")["finish"], true);
}

TEST_F(TaskQueriesTest, StopNeverSignalsAProcessThatTookTheIdOver) {
    const pid_t other = fork();
    if (other == 0) {
        pause();
        _exit(0);
    }
    ASSERT_TRUE(ZELM::Task("alice", "1").setCreatePid(other));
    Json::Value record = Parse(ReadWholeFile(RecordPath("alice", "1")));
    record["process_start"] = Json::UInt64(record["process_start"].asUInt64() - 1);
    WriteFile(RecordPath("alice", "1"), Json::toString(record));
    EXPECT_TRUE(TaskCall("alice").polling.Stop("alice/1", false));
    EXPECT_TRUE(IsRunning(other));
    kill(other, SIGKILL);
    EXPECT_EQ(waitpid(other, nullptr, 0), other);
}

TEST_F(TaskQueriesTest, StopNeverSignalsAProcessOfAnotherUserThanTheRecords) {
    TaskCall call("alice");
    ASSERT_TRUE(call.Start(ReportAndWork));
    const std::string id = call.TaskId();
    const int pid = PidOf(id);
    ASSERT_GT(pid, 0);
    ASSERT_EQ(chown(RecordPath("alice", IdOf(id)).c_str(), kAlice.uid, kAlice.uid), 0);
    EXPECT_TRUE(call.polling.Stop(id, false));
    EXPECT_TRUE(IsFinished(id));
    EXPECT_TRUE(IsRunning(pid)) << "it is root's";
    kill(pid, SIGKILL);
}

TEST_F(TaskQueriesTest, StopTellsWhenTheProcessCannotBeSignalled) {
    const pid_t worker = fork();
    if (worker == 0) {
        // As a method that runs as the user, with the way back open.
        const bool changed = setresuid(static_cast<uid_t>(-1), kAlice.uid, static_cast<uid_t>(-1)) == 0;
        ZELM::Task("alice", "1").setCreatePid(changed ? getpid() : 0);
        pause();
        _exit(0);
    }
    ASSERT_TRUE(Eventually([worker] { return PidOf("alice/1") == worker; }));
    EXPECT_EQ(StatusOfChild(
                  [] {
                      TaskCall call("alice");
                      return !call.polling.Stop("alice/1", true) && call.polling.GetError() == 506 &&
                                     LoggedTimes("send SIGTERM to task id[alice/1] fail") == 1
                                 ? 0
                                 : 1;
                  },
                  kAlice.uid),
              0);
    EXPECT_FALSE(IsFinished("alice/1"));
    EXPECT_TRUE(TaskCall("alice").polling.Stop("alice/1", true)) << "root may";
    EXPECT_EQ(waitpid(worker, nullptr, 0), worker);
}

TEST_F(TaskQueriesTest, StopTellsWhenTheRecordCannotBeWritten) {
    MakeRecord("alice", "1");
    EXPECT_EQ(StatusOfChild([] {
                  const struct rlimit none = {1, 1};
                  setrlimit(RLIMIT_FSIZE, &none);
                  signal(SIGXFSZ, SIG_IGN);
                  TaskCall call("alice");
                  return !call.polling.Stop("alice/1", true) && call.polling.GetError() == 501 &&
                                 LoggedTimes("set task id[alice/1] to finish fail") == 1
                             ? 0
                             : 1;
              }),
              0);
}

TEST_F(TaskQueriesTest, AnAdministratorsTaskIsForAdministratorsOnly) {
    MakeRecord("@administrators", "1");
    TaskCall user("alice");
    EXPECT_FALSE(user.polling.Stop("@administrators/1", true));
    EXPECT_EQ(user.polling.GetError(), 503);
    EXPECT_EQ(LoggedTimes("Permission denied"), 1);
    TaskCall boss("boss");
    EXPECT_EQ(boss.Status("@administrators/1")["finish"], false);
    EXPECT_TRUE(boss.polling.Stop("@administrators/1", true));
}

// ---- list ----

TEST_F(TaskQueriesTest, ListsFullIdsByGroup) {
    MakeRecord("alice", "a-1");
    MakeRecord("alice", "b-1");
    MakeRecord("bob", "a-2");
    MakeRecord("@administrators", "a-3");
    TaskCall call("alice");
    Json::Value out;
    ASSERT_TRUE(call.polling.List("", Parse(R"(["user","everyone"])"), out));
    EXPECT_EQ(Json::toString(out), R"({"everyone":null,"user":["alice/a-1","alice/b-1"]})");
    ASSERT_TRUE(call.polling.List("b", Parse(R"(["user"])"), out));
    EXPECT_EQ(Json::toString(out), R"({"everyone":null,"user":["alice/b-1"]})");
    Json::Value all;
    TaskCall boss("boss");
    ASSERT_TRUE(boss.polling.List("a-", Parse(R"(["admin","user"])"), all));
    EXPECT_EQ(Json::toString(all), R"({"admin":["@administrators/a-3"],"user":null})");
}

TEST_F(TaskQueriesTest, ListingNoGroupsLeavesTheOutputAsItWas) {
    TaskCall call("alice");
    Json::Value out = Parse(R"({"x":1})");
    EXPECT_TRUE(call.polling.List("", Parse("[]"), out));
    EXPECT_EQ(Json::toString(out), R"({"x":1})");
}

TEST_F(TaskQueriesTest, AFailedListKeepsTheGroupsBeforeTheFailure) {
    MakeRecord("alice", "1");
    TaskCall call("alice");
    Json::Value out = Parse(R"({"x":1})");
    EXPECT_FALSE(call.polling.List("", Parse(R"(["user","admin","everyone"])"), out));
    EXPECT_EQ(call.polling.GetError(), 505);
    EXPECT_EQ(Json::toString(out), R"({"user":["alice/1"],"x":1})");
}

TEST_F(TaskQueriesTest, RefusesWhatIsNoListOfGroups) {
    TaskCall call("alice");
    Json::Value out;
    for (const char* groups : {R"(["foo"])", "[null]", "[{}]", "[7]", R"(["users"])"}) {
        EXPECT_FALSE(call.polling.List("", Parse(groups), out)) << groups;
        EXPECT_EQ(call.polling.GetError(), 503) << groups;
    }
    EXPECT_FALSE(call.polling.List("", Parse(R"("user")"), out));
    EXPECT_EQ(call.polling.GetError(), 502);
}

TEST_F(TaskQueriesTest, APrefixThatNoIdHasListsNothing) {
    MakeRecord("alice", "a-1");
    TaskCall call("alice");
    for (const std::string& prefix :
         {std::string("../"), std::string("a\0x", 3), std::string(1000, 'a'), std::string("*"), std::string("a\n")}) {
        Json::Value out;
        EXPECT_TRUE(call.polling.List(prefix, Parse(R"(["user"])"), out));
        EXPECT_EQ(Json::toString(out), R"({"user":null})");
    }
}
