#include <sys/resource.h>
#include <sys/wait.h>

#include <cerrno>
#include <stdexcept>

#include "PollingFixture.h"

using ZOVA::APIPolling;
using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

using TaskStartTest = PollingTest;

constexpr const char* kCall = R"({"api":"ZOVA.Test","version":2,"method":"go","folder":"/x","secret":"y"})";

/** Tells in its report what it finds. */
void Describe(APIRequest* request, APIResponse* response, void* data) {
    Json::Value report(Json::objectValue);
    report["full"] = request->GetPollingTaskId();
    report["task"] = request->IsPollingTask();
    report["id"] = request->GetEnv("task_id", "");
    report["user"] = request->GetEnv("task_user", "");
    report["leader"] = getsid(0) == getpid();
    report["data"] = data == nullptr ? "" : static_cast<const char*>(data);
    report["param"] = request->GetParam("folder", "");
    response->SetSuccess(report);
}

void ReportNothing(APIRequest*, APIResponse*, void*) {}

void ReportAnError(APIRequest*, APIResponse* response, void*) {
    response->SetError(1001, Json::Value("why"));
}

void Throw(APIRequest*, APIResponse*, void*) {
    throw std::runtime_error("line\nbreak");
}

void DieAtOnce(APIRequest*, APIResponse*, void*) {
    kill(getpid(), SIGKILL);
}

void KeepRecord(APIRequest* request, APIResponse* response, void*) {
    ZELM::Task task(Json::asString(request->GetEnv("task_user", "")).c_str(),
                    Json::asString(request->GetEnv("task_id", "")).c_str());
    task.setProperty("auto_remove", false);
    response->SetSuccess(Json::Value());
}

/** Reports 1, and once a file is there 2. */
void ReportTwice(APIRequest*, APIResponse* response, void*) {
    response->SetSuccess(Json::Value(1));
    Eventually([] { return Exists(InRoot("/tree/go")); });
    response->SetSuccess(Json::Value(2));
    pause();
}

}  // namespace

TEST_F(TaskStartTest, AnswersTheFullIdWhenTheChildHasReported) {
    TaskCall call("alice", kCall);
    ASSERT_TRUE(call.Start(ReportAndWork));
    const std::string id = call.TaskId();
    EXPECT_EQ(call.Body(), R"({"data":{"task_id":")" + id + R"("},"success":true})");
    EXPECT_EQ(OwnerOf(id), "alice");
    EXPECT_EQ(IdOf(id).size(), 32u);
    EXPECT_GT(PidOf(id), 0);
    EXPECT_EQ(Json::toString(call.Status(id)["data"]), "\"working\"") << "the report was there before the answer";
}

TEST_F(TaskStartTest, TheChildIsAPollingTaskInASessionOfItsOwn) {
    TaskCall call("alice", kCall);
    char data[] = "given";
    ASSERT_TRUE(call.Start(Describe, data));
    const Json::Value report = call.Status(call.TaskId())["data"];
    EXPECT_EQ(report["full"], call.TaskId());
    EXPECT_EQ(report["id"], IdOf(call.TaskId()));
    EXPECT_EQ(report["user"], "alice");
    EXPECT_EQ(report["task"], true);
    EXPECT_EQ(report["leader"], true);
    EXPECT_EQ(report["data"], "given");
    EXPECT_EQ(report["param"], "/x");
    EXPECT_FALSE(call.request.IsPollingTask()) << "the parent is none";
}

TEST_F(TaskStartTest, TheRecordTellsWhatTheTaskWasStartedFor) {
    TaskCall call("alice", kCall);
    call.polling.SetPrefixAttr("test-");
    call.polling.SetGroupAttr("everyone");
    ASSERT_TRUE(call.Start(ReportAndWork));
    EXPECT_EQ(call.TaskId().substr(0, 12), "@users/test-");
    EXPECT_EQ(Json::toString(call.Status(call.TaskId())["info"]),
              R"({"api":"ZOVA.Test","group":"everyone","method":"go","param":{"folder":"/x","secret":"y"},)"
              R"("prefix":"test-","version":2})");
    EXPECT_EQ(call.Status(call.TaskId())["auto_remove"], true);
}

TEST_F(TaskStartTest, AParameterOfTheMethodsOwnThatIsNamedLikeTheCallsIsLostFromTheRecord) {
    TaskCall call("alice", R"({"api":"ZOVA.Test","version":2,"method":"go","of":{"method":"kept"}})");
    ASSERT_TRUE(call.Start(ReportAndWork));
    EXPECT_EQ(Json::toString(call.Status(call.TaskId())["info"]["param"]), R"({"of":{"method":"kept"}})");
}

TEST_F(TaskStartTest, ParametersStayOutOfTheRecordIfAsked) {
    TaskCall call("alice", kCall);
    call.polling.SetRemoveParam(true);
    call.polling.SetRemoveAttr(false);
    ASSERT_TRUE(call.Start(ReportAndEnd));
    EXPECT_EQ(Json::toString(call.Status(call.TaskId())["info"]),
              R"({"api":"ZOVA.Test","group":"","method":"go","prefix":"","version":2})");
    EXPECT_EQ(ReadWholeFile(RecordPath("alice", IdOf(call.TaskId()))).find("secret"), std::string::npos);
    EXPECT_EQ(call.Status(call.TaskId())["auto_remove"], false);
}

TEST_F(TaskStartTest, AFinishedTaskIsRemovedUnlessItsRecordIsKept) {
    TaskCall removed("alice", kCall);
    ASSERT_TRUE(removed.Start(ReportAndEnd));
    ASSERT_TRUE(Eventually([&] { return IsFinished(removed.TaskId()); }));
    EXPECT_EQ(Parse(ReadWholeFile(RecordPath("alice", IdOf(removed.TaskId()))))["removed"], true);
    TaskCall kept("alice", kCall);
    ASSERT_TRUE(kept.Start(KeepRecord));
    ASSERT_TRUE(Eventually([&] { return IsFinished(kept.TaskId()); }));
    EXPECT_EQ(Parse(ReadWholeFile(RecordPath("alice", IdOf(kept.TaskId()))))["removed"], false)
        << "what the work function wrote counts";
}

TEST_F(TaskStartTest, EachReportReplacesTheOneBefore) {
    TaskCall call("alice", kCall);
    ASSERT_TRUE(call.Start(ReportTwice));
    EXPECT_EQ(Json::toString(call.Status(call.TaskId())["data"]), "1");
    WriteFile(InRoot("/tree/go"), "");
    EXPECT_TRUE(Eventually([&] { return Json::toString(call.Status(call.TaskId())["data"]) == "2"; }));
}

TEST_F(TaskStartTest, AnErrorIsAReport) {
    TaskCall call("alice", kCall);
    ASSERT_TRUE(call.Start(ReportAnError));
    const Json::Value status = call.Status(call.TaskId());
    EXPECT_EQ(status["success"], false);
    EXPECT_EQ(Json::toString(status["error"]), R"({"code":1001,"errors":"why"})");
    EXPECT_TRUE(Eventually([&] { return IsFinished(call.TaskId()); }));
}

TEST_F(TaskStartTest, WhatTheWorkFunctionThrowsBecomesAnError) {
    TaskCall call("alice", kCall);
    ASSERT_TRUE(call.Start(Throw));
    EXPECT_EQ(Json::toString(call.Status(call.TaskId())["error"]), R"({"code":117})");
    EXPECT_TRUE(Eventually([&] { return IsFinished(call.TaskId()); }));
}

TEST_F(TaskStartTest, AWorkFunctionThatReportsNothingKeepsTheParentWaiting) {
    const pid_t parent = fork();
    if (parent == 0) {
        TaskCall call("alice", kCall);
        call.Start(ReportNothing);
        _exit(0);
    }
    std::string id;
    ASSERT_TRUE(Eventually([&] {
        const Json::Value ids = ZELM::TaskMgr("alice").getAllTaskId(nullptr);
        id = ids.empty() ? "" : ids[0].asString();
        return !id.empty() && IsFinished("alice/" + id);
    }));
    EXPECT_FALSE(ZELM::Task("alice", id.c_str()).hasProperty("body"));
    usleep(300000);
    EXPECT_EQ(waitpid(parent, nullptr, WNOHANG), 0) << "still waiting";
    kill(parent, SIGKILL);
    waitpid(parent, nullptr, 0);
}

TEST_F(TaskStartTest, AProcessThatDiesUnreportedDoesNotKeepTheParentWaiting) {
    TaskCall call("alice", kCall);
    EXPECT_LT(SecondsOf([&] { EXPECT_TRUE(call.Start(DieAtOnce)); }), 20);
    const Json::Value status = call.Status(call.TaskId());
    EXPECT_EQ(status["finish"], false);
    EXPECT_FALSE(status.isMember("success"));
}

TEST_F(TaskStartTest, TheTaskHoldsNeitherTheClientsConnectionNorAPipeOfItsParent) {
    EXPECT_EQ(StatusOfChild([] {
                  int client[2];
                  if (pipe(client) != 0) {
                      return 1;
                  }
                  dup2(client[1], STDOUT_FILENO);
                  close(client[1]);
                  TaskCall call("alice", kCall);
                  if (!call.Start(ReportAndWork)) {
                      return 2;
                  }
                  const bool runs = PidOf(call.TaskId()) > 0;
                  close(STDOUT_FILENO);
                  char byte;
                  return runs && read(client[0], &byte, 1) == 0 ? 0 : 3;
              }),
              0);
}

TEST_F(TaskStartTest, LeavesNoZombie) {
    TaskCall call("alice", kCall);
    ASSERT_TRUE(call.Start(ReportAndEnd));
    ASSERT_TRUE(Eventually([&] { return IsFinished(call.TaskId()); }));
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1);
    EXPECT_EQ(errno, ECHILD);
}

// ---- identities ----

TEST_F(TaskStartTest, AnAdministratorsTaskBelongsToAllOfThem) {
    TaskCall call("boss", kCall);
    ASSERT_TRUE(call.polling.SetGroupAttr("admin"));
    ASSERT_TRUE(call.Start(ReportAndWork));
    EXPECT_EQ(OwnerOf(call.TaskId()), "@administrators");
}

TEST_F(TaskStartTest, AMethodThatBecameItsUserKeepsItsTaskItself) {
    EXPECT_EQ(StatusOfChild(
                  [] {
                      TaskCall call("alice", kCall);
                      return call.Start(ReportAndWork) && PidOf(call.TaskId()) > 0 ? 0 : 1;
                  },
                  kAlice.uid),
              0);
    const Json::Value ids = ZELM::TaskMgr("alice").getAllTaskId(nullptr);
    ASSERT_EQ(ids.size(), 1u);
    const std::string id = "alice/" + ids[0].asString();
    TaskCall root("alice");
    EXPECT_EQ(root.Status(id)["data"], "working");
    const int pid = PidOf(id);
    ASSERT_GT(pid, 0) << "root knows the user's process";
    EXPECT_TRUE(root.polling.Stop(id, true));
    EXPECT_TRUE(Eventually([pid] { return !IsRunning(pid); }));
    EXPECT_TRUE(IsFinished(id));
}

// ---- refusals ----

TEST_F(TaskStartTest, RefusesWithoutARequest) {
    APIResponse response(nullptr);
    APIPolling polling;
    EXPECT_FALSE(polling.Start(&response, ReportAndEnd, nullptr));
    EXPECT_EQ(polling.GetError(), 502);
    EXPECT_EQ(LoggedTimes("unknown request"), 1);
}

TEST_F(TaskStartTest, RefusesWithoutAResponseOrWorkFunction) {
    TaskCall call("alice");
    EXPECT_FALSE(call.polling.Start(nullptr, ReportAndEnd, nullptr));
    EXPECT_FALSE(call.Start(nullptr));
    EXPECT_EQ(call.polling.GetError(), 502);
    EXPECT_EQ(LoggedTimes("bad parameters"), 2);
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}

TEST_F(TaskStartTest, RefusesAnAdministratorsTaskOfAUser) {
    TaskCall call("boss");
    ASSERT_TRUE(call.polling.SetGroupAttr("admin"));
    APIRequest alice(RequestOf("alice"));
    call.polling.SetRequest(&alice);
    EXPECT_FALSE(call.Start(ReportAndEnd));
    EXPECT_EQ(call.Body(), R"({"error":{"code":105},"success":false})");
    EXPECT_EQ(call.polling.GetError(), 500);
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}

TEST_F(TaskStartTest, RefusesAGroupThatIsNone) {
    TaskCall call("alice");
    ZOVA::APIPollingPrivate polling(nullptr, &call.request);
    polling.SetData("polling_attribute", "share_to_group", "friends", true);
    EXPECT_FALSE(polling.Start(&call.response, ReportAndEnd, nullptr));
    EXPECT_EQ(call.Body(), R"({"error":{"code":114},"success":false})");
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}

TEST_F(TaskStartTest, ARecordThatCannotBeWrittenIsToldByTheLogAlone) {
    TaskCall nobody("");
    EXPECT_FALSE(nobody.Start(ReportAndEnd));
    TaskCall call("alice");
    call.polling.SetPrefixAttr("../../etc/");
    EXPECT_FALSE(call.Start(ReportAndEnd));
    EXPECT_EQ(call.Body(), "{}");
    EXPECT_EQ(call.polling.GetError(), 500);
    call.polling.SetPrefixAttr(std::string("test-\0x", 7));
    EXPECT_FALSE(call.Start(ReportAndEnd));
    TaskCall other(std::string("alice\0x", 7));
    EXPECT_FALSE(other.Start(ReportAndEnd));
    EXPECT_EQ(LoggedTimes("Failed to set property."), 4);
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}

TEST_F(TaskStartTest, ARefusedForkTakesTheRecordAway) {
    EXPECT_EQ(StatusOfChild(
                  [] {
                      const struct rlimit none = {1, 1};
                      setrlimit(RLIMIT_NPROC, &none);
                      TaskCall call("alice");
                      call.polling.SetGroupAttr("everyone");
                      const bool started = call.Start(ReportAndEnd);
                      return !started && call.Body() == R"({"error":{"code":110},"success":false})" &&
                                     LoggedTimes("Failed to fork(). Resource temporarily unavailable") == 1 &&
                                     call.polling.GetError() == 500
                                 ? 0
                                 : 1;
                  },
                  kBob.uid),
              0);
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}
