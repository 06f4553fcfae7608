// Entries in forked children: which ones fork, what comes back, and what a child leaves behind.

#include <pthread.h>
#include <signal.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>

#include "ChildRun.h"
#include "SubrequestTest.h"
#include "webapi/Json.h"

using unit::J;
using unit::List;
using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

using Texts = std::vector<std::string>;

class CompoundChildren : public unit::SubrequestTest {
protected:
    int Forks() const { return platform.CountOf("QLIBCProcForkEx"); }
};

// ---- which entries fork ----

TEST_F(CompoundChildren, OnlyAMethodThatCannotGiveItsIdentityBackForks) {
    EXPECT_EQ(Outcomes(Batch(List(Entry("local", "succeed"), Entry("by_default", "succeed")))),
              (Texts{"success", "success"}));
    EXPECT_EQ(Forks(), 0);
    EXPECT_EQ(Outcomes(Batch(List(Entry("child", "succeed")))), (Texts{"success"}));
    EXPECT_EQ(platform.CallsOf({"QLIBCProcForkEx"}), (Texts{"QLIBCProcForkEx(65)"}));
}

TEST_F(CompoundChildren, EveryEntryOfAParallelBatchForks) {
    EXPECT_EQ(Outcomes(Parallel(
                  List(Entry("local", "succeed"), Entry("by_default", "succeed"), Entry("child", "succeed"), J("{}")))),
              (Texts{"success", "success", "success", "101"}));
    EXPECT_EQ(Forks(), 4);
}

TEST_F(CompoundChildren, AMethodWithoutAttributesTakesThoseOfTheDefaults) {
    HookAPI()["methods"]["1"].append("no_attributes");
    Install();
    Batch(List(Entry("no_attributes", "succeed")));
    EXPECT_EQ(Forks(), 0);
    runner.Defaults()["methods"] = J("{}");
    Batch(List(Entry("no_attributes", "succeed")));
    EXPECT_EQ(Forks(), 1);
}

TEST_F(CompoundChildren, ASequentialChildHasAnsweredBeforeTheNextEntryBegins) {
    platform.calls.clear();
    Batch(List(Entry("child", "succeed"), Entry("child", "succeed")));
    EXPECT_EQ(platform.CallsOf({"pipe2", "QLIBCProcForkEx"}),
              (Texts{"pipe2()", "QLIBCProcForkEx(65)", "pipe2()", "QLIBCProcForkEx(65)"}));
    EXPECT_EQ(Outcomes(Batch(List(Entry("child", "fail", J(R"({"code": 9})")), Entry("child", "succeed")),
                             J(R"({"stop_when_error": true})"))),
              (Texts{"9", "112"}));
    EXPECT_EQ(Forks(), 3);
}

TEST_F(CompoundChildren, EntriesOfAParallelBatchRunAtOnce) {
    constexpr unsigned int kCount = 8;
    auto* meeting = static_cast<pthread_barrier_t*>(
        mmap(nullptr, sizeof(pthread_barrier_t), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0));
    ASSERT_NE(meeting, MAP_FAILED);
    pthread_barrierattr_t shared;
    pthread_barrierattr_init(&shared);
    pthread_barrierattr_setpshared(&shared, PTHREAD_PROCESS_SHARED);
    pthread_barrier_init(meeting, &shared, kCount);
    unit::Hooks()["meet"] = [meeting](APIRequest* request, APIResponse* response) {
        pthread_barrier_wait(meeting);
        response->SetSuccess(request->GetParam("number", Json::Value()));
    };
    Json::Value compound(Json::arrayValue);
    for (unsigned int i = 0; i < kCount; ++i) {
        Json::Value more(Json::objectValue);
        more["number"] = i;
        compound.append(Entry("local", "meet", more));
    }
    const Json::Value body = Parallel(compound);
    for (unsigned int i = 0; i < kCount; ++i) {
        EXPECT_EQ(body["data"]["result"][i]["data"].asUInt(), i);
    }
    pthread_barrier_destroy(meeting);
    munmap(meeting, sizeof(pthread_barrier_t));
}

// ---- what comes back ----

TEST_F(CompoundChildren, AParallelBatchAnswersAsASequentialOne) {
    const Json::Value compound =
        List(Entry("local", "succeed", J(R"({"data": {"a": [1, null]}})")), Entry("child", "fail", J(R"({"code": 8})")),
             Entry("no_such", "succeed"), J(R"({"version": 1})"), Entry("upload", "succeed"));
    const std::string sequential = Json::toString(Batch(compound));
    EXPECT_EQ(Json::toString(Parallel(compound)), sequential);
}

TEST_F(CompoundChildren, AFailureInAChildCountsForHasFail) {
    for (const char* mode : {"sequential", "parallel"}) {
        Json::Value more(Json::objectValue);
        more["mode"] = mode;
        const Json::Value body =
            Batch(List(Entry("child", "succeed"), Entry("child", "fail", J(R"({"code": 8})"))), more);
        EXPECT_TRUE(body["data"]["has_fail"].asBool()) << mode;
        EXPECT_FALSE(Batch(List(Entry("child", "succeed")), more)["data"]["has_fail"].asBool()) << mode;
    }
}

TEST_F(CompoundChildren, WhatAChildDoesToItsCopiesStaysThere) {
    unit::Hooks()["change"] = [](APIRequest* request, APIResponse* response) {
        request->SetAttr("changed", true);
        setenv("UNIT_CHANGED", "yes", 1);
        response->SetHeader("X-Changed", "yes");
        response->SetSuccess(Json::Value());
    };
    const Json::Value before = unit::Snapshot();
    const Json::Value body = Batch(List(Entry("child", "change"), Entry("local", "tell_request")));
    EXPECT_EQ(unit::Snapshot(), before);
    EXPECT_FALSE(body["data"]["result"][1]["data"]["attr"].isMember("changed"));
    EXPECT_EQ(getenv("UNIT_CHANGED"), nullptr);
}

TEST_F(CompoundChildren, NoDescriptorIsLeftOpen) {
    Batch(List(Entry("local", "succeed")));
    const std::vector<int> before = unit::OpenDescriptorNumbers();
    for (const char* mode : {"sequential", "parallel"}) {
        Json::Value more(Json::objectValue);
        more["mode"] = mode;
        Batch(List(Entry("child", "succeed"), Entry("child", "answer_long", J(R"({"size": 10})")),
                   Entry("child", "die"), Entry("local", "succeed")),
              more);
        EXPECT_EQ(unit::OpenDescriptorNumbers(), before) << mode;
        ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
        ExpectLog(LOG_ERR, "read compound json failed", "CompoundHandler.cpp");
    }
    TakeChildren();
}

TEST_F(CompoundChildren, AChildHoldsNoPipeButItsOwn) {
    unit::Hooks()["count_pipes"] = [](APIRequest*, APIResponse* response) {
        int pipes = 0;
        for (int fd : unit::OpenDescriptorNumbers()) {
            const fake::Suspended suspended;
            char target[64] = "";
            const std::string link = "/proc/self/fd/" + std::to_string(fd);
            pipes +=
                readlink(link.c_str(), target, sizeof(target) - 1) > 0 && std::string(target).rfind("pipe:", 0) == 0
                    ? 1
                    : 0;
        }
        response->SetSuccess(pipes);
    };
    const int own = Batch(List(Entry("child", "count_pipes")))["data"]["result"][0]["data"].asInt();
    const Json::Value body =
        Parallel(List(Entry("child", "count_pipes"), Entry("child", "count_pipes"), Entry("child", "count_pipes")));
    for (const Json::Value& result : body["data"]["result"]) {
        EXPECT_EQ(result["data"].asInt(), own);
    }
}

TEST_F(CompoundChildren, AChildEndsThere) {
    Batch(List(Entry("child", "succeed")));
    const std::vector<fake::ForkedChild> children = TakeChildren();
    ASSERT_EQ(children.size(), 1u);
    EXPECT_EQ(children[0].end, "status 0");
    EXPECT_EQ(children[0].calls.back(), "_exit(0)");
    EXPECT_EQ(std::count(children[0].calls.begin(), children[0].calls.end(), "dlclose()"), 0) << "no destructors";
}

// ---- identity ----

constexpr const char* kRootIds = R"({"user": [0, 0, 0], "group": [0, 0, 0], "groups": [0]})";

TEST_F(CompoundChildren, TheNextEntryHasTheBatchsIdentityAfterALastingChange) {
    runner.Request()->InitSession(J(R"({"username": "alice"})"));
    Json::Value lasting = Entry("child", "tell_ids");
    const Json::Value body = Batch(List(lasting, Entry("by_default", "tell_ids"), Entry("local", "tell_ids"),
                                        Entry("by_default", "tell_ids"), lasting));
    const Json::Value& results = body["data"]["result"];
    const char* service = R"({"user": [500, 500, 500], "group": [50, 50, 50], "groups": [50]})";
    EXPECT_JSON(results[0]["data"], service);
    EXPECT_JSON(results[1]["data"], kRootIds);
    EXPECT_EQ(results[2]["data"]["user"][1].asInt(), 500);
    EXPECT_JSON(results[3]["data"], kRootIds);
    EXPECT_JSON(results[4]["data"], service);
    EXPECT_EQ(platform.process.user.Text(), "0/0/0");
    EXPECT_EQ(platform.process.group.Text(), "0/0/0");
    EXPECT_EQ(platform.process.groups, (std::vector<gid_t>{0}));
}

TEST_F(CompoundChildren, ALastingChangeToTheLoginUserStaysInItsChild) {
    HookAPI()["methods"]["1"].append(J(R"({"gated": {"grantByUser": true}})"));
    HookAPI()["methods"]["1"].removeIndex(5, nullptr);
    Install();
    runner.Request()->InitSession(J(R"({"username": "alice"})"));
    const Json::Value body = Batch(List(Entry("gated", "tell_ids"), Entry("by_default", "tell_ids")));
    EXPECT_JSON(body["data"]["result"][0]["data"],
                R"({"user": [1000, 1000, 1000], "group": [100, 100, 100], "groups": [100, 200]})");
    EXPECT_JSON(body["data"]["result"][1]["data"], kRootIds);
}

// ---- children that fail ----

TEST_F(CompoundChildren, AChildThatDiesLeavesNullAndNoMarkInTheSequentialMode) {
    EXPECT_JSON(Batch(List(Entry("child", "die"), Entry("child", "leave"), Entry("local", "succeed"))),
                R"({"success": true, "data": {"has_fail": false, "result": [null, null,
                    {"success": true, "api": "ZOVA.Test.Hook", "version": 1, "method": "local"}]}})");
    for (int i = 0; i < 2; ++i) {
        ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
        ExpectLog(LOG_ERR, "read compound json failed", "CompoundHandler.cpp");
    }
    const std::vector<fake::ForkedChild> children = TakeChildren();
    EXPECT_EQ(children.at(0).end, "signal 9");
    EXPECT_EQ(children.at(1).end, "status 7");
}

TEST_F(CompoundChildren, AChildThatDiesDoesNotStopTheRest) {
    EXPECT_EQ(
        Outcomes(Batch(List(Entry("child", "die"), Entry("local", "succeed")), J(R"({"stop_when_error": true})"))),
        (Texts{"null", "success"}));
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
    ExpectLog(LOG_ERR, "read compound json failed", "CompoundHandler.cpp");
    TakeChildren();
}

TEST_F(CompoundChildren, ADeadChildKeepsItsPlaceholderInTheParallelMode) {
    EXPECT_JSON(Parallel(List(Entry("child", "succeed"), Entry("child", "die"), Entry("child", "leave"))),
                R"({"success": true, "data": {"has_fail": false, "result": [
                    {"success": true, "api": "ZOVA.Test.Hook", "version": 1, "method": "child"},
                    {"api": "ZOVA.Test.Hook", "version": 1, "method": "child"},
                    {"api": "ZOVA.Test.Hook", "version": 1, "method": "child"}]}})");
    for (int i = 0; i < 2; ++i) {
        ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
        ExpectLog(LOG_ERR, "read compound json failed", "CompoundHandler.cpp");
    }
    TakeChildren();
}

TEST_F(CompoundChildren, AnAnswerLongerThanOneReadDeliversIsLostAndHangsNobody) {
    for (const char* mode : {"sequential", "parallel"}) {
        Json::Value more(Json::objectValue);
        more["mode"] = mode;
        const Json::Value body =
            Batch(List(Entry("child", "answer_long", J(R"({"size": 200000})")),
                       Entry("child", "answer_long", J(R"({"size": 300000})")), Entry("child", "succeed")),
                  more);
        EXPECT_FALSE(body["data"]["has_fail"].asBool()) << mode;
        EXPECT_EQ(Outcomes(body)[2], "success") << mode;
        EXPECT_FALSE(body["data"]["result"][0].isMember("success")) << mode;
    }
    std::vector<fake::LogLine>& log = platform.process.log;
    EXPECT_EQ(std::count_if(log.begin(), log.end(),
                            [](const fake::LogLine& line) { return line.text == "read compound json failed"; }),
              4);
    for (const fake::ForkedChild& child : TakeChildren()) {
        EXPECT_TRUE(child.end == "status 0" || child.end == "signal 13") << child.end;
    }
    log.clear();
}

TEST_F(CompoundChildren, AnAnswerThatFillsThePipeArrives) {
    EXPECT_EQ(Outcomes(Parallel(List(Entry("child", "answer_long", J(R"({"size": 65000})")),
                                     Entry("child", "answer_long", J(R"({"size": 65000})"))))),
              (Texts{"success", "success"}));
}

TEST_F(CompoundChildren, AChildLogsAnAnswerThatItCannotWrite) {
    unit::Hooks()["break_write"] = [](APIRequest*, APIResponse* response) {
        fake::FakePlatform::Required("break_write").Fail("write", ENOSPC);
        response->SetSuccess(Json::Value());
    };
    EXPECT_EQ(Outcomes(Batch(List(Entry("child", "break_write")))), (Texts{"null"}));
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
    ExpectLog(LOG_ERR, "read compound json failed", "CompoundHandler.cpp");
    ExpectLog(LOG_ERR, "write json failed", "CompoundHandler.cpp");
}

// ---- pipes and forks that are refused ----

class Refused : public CompoundChildren, public ::testing::WithParamInterface<const char*> {};

INSTANTIATE_TEST_SUITE_P(InBothModes, Refused, ::testing::Values("sequential", "parallel"));

TEST_P(Refused, APipeOrForkRefusedAtAnyEntryAnswers117ThereAndOnlyThere) {
    Json::Value more(Json::objectValue);
    more["mode"] = GetParam();
    const std::vector<int> before = unit::OpenDescriptorNumbers();
    for (const char* call : {"pipe2", "QLIBCProcForkEx"}) {
        for (int refused = 0; refused < 3; ++refused) {
            platform.Fail(call, EAGAIN, refused, 1);
            const Json::Value body =
                Batch(List(Entry("child", "succeed"), Entry("child", "succeed"), Entry("child", "succeed")), more);
            Texts expected = {"success", "success", "success"};
            expected[static_cast<std::size_t>(refused)] = "117";
            EXPECT_EQ(Outcomes(body), expected) << call << " " << refused;
            EXPECT_TRUE(body["data"]["has_fail"].asBool());
            EXPECT_EQ(body["data"]["result"][refused]["method"], "child") << "the names are there all the same";
            const bool isPipe = std::string(call) == "pipe2";
            if (isPipe) {
                ExpectLog(LOG_ERR, "Pipe init failed", "CompoundHandler.cpp");
            }
            ExpectLog(LOG_ERR, isPipe ? "pipe init Fail" : "fork Fail", "CompoundHandler.cpp");
        }
    }
    TakeChildren();
    platform.StopFailing();
    EXPECT_EQ(unit::OpenDescriptorNumbers().size(), before.size());
}

TEST_P(Refused, WithoutAnyChildEveryEntryAnswers117) {
    Json::Value more(Json::objectValue);
    more["mode"] = GetParam();
    platform.Fail("QLIBCProcForkEx", EAGAIN);
    EXPECT_EQ(Outcomes(Batch(List(Entry("child", "succeed"), Entry("child", "succeed")), more)), (Texts{"117", "117"}));
    ExpectLog(LOG_ERR, "fork Fail", "CompoundHandler.cpp");
    ExpectLog(LOG_ERR, "fork Fail", "CompoundHandler.cpp");
}

TEST_F(CompoundChildren, ARefusedForkStopsTheRestWhereErrorsStop) {
    platform.Fail("QLIBCProcForkEx", EAGAIN);
    EXPECT_EQ(
        Outcomes(Batch(List(Entry("child", "succeed"), Entry("local", "succeed")), J(R"({"stop_when_error": true})"))),
        (Texts{"117", "112"}));
    ExpectLog(LOG_ERR, "fork Fail", "CompoundHandler.cpp");
}

}  // namespace
