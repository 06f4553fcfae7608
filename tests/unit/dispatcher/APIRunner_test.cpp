// The frame: from a run description to the result.

#include <cstdlib>
#include <cstring>
#include <stdexcept>

#include "ChildRun.h"
#include "DeviceTest.h"
#include "webapi/Json.h"

using unit::J;
using unit::TestRunner;

namespace {

class APIRunnerTest : public unit::DeviceTest {
protected:
    APIRunnerTest() {
        descriptions["ZOVA.Entry.Request"] = Good();
        descriptions["ZOVA.Entry.Request"]["methods"]["1"] = J(R"(["request", "other"])");
        platform.files["ZOVA.Entry.lib"] = Json::toString(descriptions);
    }

    static Json::Value Run(TestRunner& runner, const std::string& description) {
        runner.Run(J(description));
        return runner.GetResponse();
    }
};

void Callback(void* argument) {
    fake::FakePlatform::Required("callback").Enter("callback", static_cast<const char*>(argument), 0);
}

void ThrowingCallback(void*) {
    throw std::runtime_error("line\nbreak");
}

// ---- construction ----

TEST_F(APIRunnerTest, ConstructionLeadsASessionAndThenReadsTheDefaults) {
    const TestRunner runner;
    EXPECT_EQ(platform.CallsOf({"setsid", "ReadJsonFile"}),
              (std::vector<std::string>{"setsid()", "ReadJsonFile(/usr/zova/zovaman/webapi/lib.def)"}));
}

TEST_F(APIRunnerTest, ConstructionSurvivesARefusedSessionAndMissingDefaults) {
    platform.Fail("setsid", EPERM);
    platform.Fail("ReadJsonFile", ENOENT, 0, 1);
    TestRunner runner;
    EXPECT_JSON(runner.Defaults(), "{}");
    EXPECT_TRUE(CallGood(runner, "by_default"));
}

TEST_F(APIRunnerTest, ABareRunnerLetsEverythingThrough) {
    ZOVA::APIRunner runner;
    EXPECT_TRUE(runner.CheckSharingPermission(nullptr, nullptr));
    EXPECT_FALSE(runner.NeedPermission(nullptr));
    EXPECT_TRUE(runner.CheckPermission(nullptr, nullptr));
    EXPECT_TRUE(runner.HandleUpload(nullptr, nullptr));
    EXPECT_TRUE(runner.SkipPermission(nullptr));
    EXPECT_FALSE(runner.CanProcessSocket(nullptr));
}

// ---- Run ----

TEST_F(APIRunnerTest, ANullDescriptionAnswers101AndInitializesNothing) {
    TestRunner runner;
    runner.Run(Json::Value());
    EXPECT_EQ(runner.Response()->GetError(), 101);
    EXPECT_TRUE(runner.asked.empty());
    EXPECT_JSON(runner.Request()->GetEnv("", Json::Value()), "{}");
}

TEST_F(APIRunnerTest, AnEmptyDescriptionAnswers101AfterTheEnvironmentWasTaken) {
    setenv("UNIT_VARIABLE", "here", 1);
    TestRunner runner;
    EXPECT_JSON(Run(runner, "{}"), R"({"success": false, "error": {"code": 101}, "httpd_restart": false})");
    EXPECT_EQ(runner.asked, (std::vector<std::string>{"Initialize"}));
    EXPECT_EQ(runner.Request()->GetEnv("UNIT_VARIABLE", "").asString(), "here");
}

TEST_F(APIRunnerTest, ADescriptionThatIsNoObjectAnswers101) {
    for (const char* description : {"5", "\"text\"", "[1]", "[]", "true", "0", "\"\""}) {
        TestRunner runner;
        EXPECT_NO_THROW(Run(runner, description)) << description;
        EXPECT_EQ(runner.Response()->GetError(), 101) << description;
    }
}

TEST_F(APIRunnerTest, ADescriptionWithoutAnAPIAnswers101) {
    TestRunner runner;
    Run(runner, R"({"postParam": {"version": 1, "method": "success"}})");
    EXPECT_EQ(runner.Response()->GetError(), 101);
    EXPECT_EQ(platform.CountOf("prctl"), 0);
}

TEST_F(APIRunnerTest, RunsADescription) {
    TestRunner runner;
    EXPECT_JSON(Run(runner, R"({"getParam": {"api": "ZOVA.Test.Good", "version": 1, "method": "nothing", "a": 1},
                                "postParam": {"method": "echo", "b": 2}, "unknown": 1})"),
                R"({"success": true, "httpd_restart": false,
                    "data": {"api": "ZOVA.Test.Good", "version": 1, "method": "echo", "a": 1, "b": 2}})");
}

TEST_F(APIRunnerTest, TheDescriptionsVariablesWinOverTheProcesss) {
    setenv("UNIT_VARIABLE", "process", 1);
    setenv("UNIT_OTHER", "process", 1);
    TestRunner runner;
    Run(runner, R"({"environ": {"UNIT_VARIABLE": "description", "UNIT_NUMBER": 5}})");
    EXPECT_EQ(runner.Request()->GetEnv("UNIT_VARIABLE", "").asString(), "description");
    EXPECT_EQ(runner.Request()->GetEnv("UNIT_OTHER", "").asString(), "process");
    EXPECT_FALSE(runner.Request()->HasEnv("UNIT_NUMBER"));
}

TEST_F(APIRunnerTest, ASessionOfTheDescriptionIsThereAtAdmission) {
    TestRunner runner;
    const Json::Value answer = Run(runner, R"({"session": {"username": "alice"},
        "postParam": {"api": "ZOVA.Test.Good", "version": 1, "method": "session"}})");
    EXPECT_EQ(answer["data"]["user"].asString(), "alice");
}

TEST_F(APIRunnerTest, AttributesAreTakenFromAnObjectOnly) {
    TestRunner runner;
    Run(runner, R"({"attr": {"a": 1, "b": {"c": 2}}})");
    EXPECT_JSON(runner.Request()->GetAttr("", Json::Value()), R"({"a": 1, "b": {"c": 2}})");
    for (const char* attributes : {"\"text\"", "5", "null", "[1]"}) {
        TestRunner other;
        const Json::Value answer =
            Run(other, std::string(R"({"postParam": {"api": "ZOVA.Test.Good", "version": 1, "method": "success"},
                                      "attr": )") +
                           attributes + "}");
        EXPECT_TRUE(answer["success"].asBool()) << attributes;
        EXPECT_JSON(other.Request()->GetAttr("", Json::Value()), "{}");
    }
}

TEST_F(APIRunnerTest, SectionsOfAnyTypeAreSurvived) {
    for (const char* description :
         {R"({"environ": 5, "session": "x", "getParam": [], "postParam": null})", R"({"getParam": 5})",
          R"({"postParam": "api=1"})", R"({"environ": null, "session": [1]})"}) {
        TestRunner runner;
        EXPECT_NO_THROW(Run(runner, description)) << description;
        EXPECT_EQ(runner.Response()->GetError(), 101) << description;
    }
}

TEST_F(APIRunnerTest, ARelayParameterAnswers101InAPlainRunAnd109InProcess) {
    TestRunner runner;
    Run(runner, R"({"postParam": {"api": "ZOVA.Test.Good", "version": 1, "method": "success", "relay_zn": null}})");
    EXPECT_EQ(runner.Response()->GetError(), 101);
    EXPECT_FALSE(Call(runner, "ZOVA.Test.Good", 1, "success", J(R"({"relay_zn": "peer"})")));
    EXPECT_EQ(runner.Response()->GetError(), 109);
}

// ---- InitEnv ----

TEST_F(APIRunnerTest, TheEnvironmentIsSplitAtTheFirstEqualsSign) {
    setenv("UNIT_VARIABLE", "a=b=c", 1);
    setenv("UNIT_EMPTY", "", 1);
    char without[] = "UNIT_WITHOUT_EQUALS";
    putenv(without);
    TestRunner runner;
    Json::Value env(Json::objectValue);
    EXPECT_TRUE(runner.InitEnv(env));
    EXPECT_EQ(env["UNIT_VARIABLE"].asString(), "a=b=c");
    EXPECT_EQ(env["UNIT_EMPTY"].asString(), "");
    EXPECT_FALSE(env.isMember("UNIT_WITHOUT_EQUALS"));
    EXPECT_EQ(runner.Response()->GetError(), 0);
}

TEST_F(APIRunnerTest, TheEnvironmentRefusesAnythingButAnObject) {
    for (const char* text : {"[]", "5", "\"x\"", "true"}) {
        TestRunner runner;
        Json::Value env = J(text);
        EXPECT_FALSE(runner.InitEnv(env)) << text;
        EXPECT_EQ(runner.Response()->GetError(), 101) << text;
    }
}

// ---- the entry API ----

TEST_F(APIRunnerTest, TheEntryAPIWithoutCompoundAnswers110) {
    TestRunner runner;
    EXPECT_FALSE(Call(runner, "ZOVA.Entry.Request", 1, "request"));
    EXPECT_EQ(runner.Response()->GetError(), 110);
    EXPECT_TRUE(runner.asked.empty()) << "it passes no gate of its own";
}

TEST_F(APIRunnerTest, AnotherMethodOfTheEntryAPIIsFalseAndLeavesTheResponseAsItWas) {
    TestRunner runner;
    const Json::Value before = runner.Response()->Serialize();
    EXPECT_FALSE(Call(runner, "ZOVA.Entry.Request", 1, "other"));
    EXPECT_EQ(runner.Response()->Serialize(), before);
}

TEST_F(APIRunnerTest, EntryDepthIsBackAfterABatch) {
    TestRunner runner;
    Call(runner, "ZOVA.Entry.Request", 1, "request", J(R"({"compound": []})"));
    EXPECT_EQ(runner.EntryDepth(), 0);
}

// ---- GetResponse ----

TEST_F(APIRunnerTest, TheResultHoldsTheRestartFlagAlsoAfterAnError) {
    TestRunner runner;
    EXPECT_JSON(runner.GetResponse(), R"({"httpd_restart": false})");
    runner.Response()->SetError(105, Json::Value());
    runner.Response()->SetHttpdRestart(true);
    EXPECT_JSON(runner.GetResponse(), R"({"success": false, "error": {"code": 105}, "httpd_restart": true})");
    EXPECT_JSON(runner.Response()->GetBody(), R"({"success": false, "error": {"code": 105}})");
}

// ---- callbacks ----

TEST_F(APIRunnerTest, WithoutCallbacksNothingIsForked) {
    TestRunner runner;
    runner.HandleCallback(nullptr);
    runner.HandleCallback(runner.Response());
    EXPECT_EQ(platform.CountOf("QLIBCProcFork"), 0);
}

TEST_F(APIRunnerTest, TheParentAndARefusedForkReturnAtOnce) {
    TestRunner runner;
    char argument[] = "first";
    runner.Response()->SetCallbackFunc(Callback, argument);
    runner.HandleCallback(runner.Response());
    platform.forkAs = fake::ForkAs::kRefused;
    runner.HandleCallback(runner.Response());
    EXPECT_EQ(platform.CountOf("QLIBCProcFork"), 2);
    EXPECT_EQ(platform.CountOf("callback"), 0);
    EXPECT_EQ(platform.CountOf("sleep"), 0);
}

class CallbackChild : public APIRunnerTest {
protected:
    CallbackChild() {
        platform.forkAs = fake::ForkAs::kChild;
        platform.process.hats = {"DefaultHat"};
    }

    /** Runs one callback, and another after it, in the child; gives its calls from the fork on. */
    Json::Value Run(void (*callback)(void*) = Callback) {
        const unit::ChildResult result = unit::RunInChild(
            "",
            [&] {
                char first[] = "first";
                char second[] = "second";
                TestRunner runner;
                runner.Response()->SetCallbackFunc(callback, first);
                runner.Response()->SetCallbackFunc(Callback, second);
                platform.calls.clear();
                runner.HandleCallback(runner.Response());
                return Json::Value("came back");
            },
            [](int) { return unit::CallsToJson(); });
        EXPECT_TRUE(result.orderly) << result.end;
        return result.report;
    }
};

TEST_F(CallbackChild, RunsTheOthersAfterOneThatThrows) {
    ExpectLog(LOG_ERR, "a callback threw: line?break");
    EXPECT_JSON(Run(ThrowingCallback), R"j(["QLIBCProcFork()", "setsid()", "sleep(1)",
        "ZOVA_aa_has_profile_restricted()", "callback(second)", "exit(0)"])j");
}

TEST_F(CallbackChild, RunsTheCallbacksInOrderAndEnds) {
    EXPECT_JSON(Run(), R"j(["QLIBCProcFork()", "setsid()", "sleep(1)", "ZOVA_aa_has_profile_restricted()",
        "callback(first)", "callback(second)", "exit(0)"])j");
}

TEST_F(CallbackChild, WearsTheDefaultHatWhereTheProcessIsConfined) {
    platform.confined = true;
    EXPECT_JSON(Run(), R"j(["QLIBCProcFork()", "setsid()", "sleep(1)", "ZOVA_aa_has_profile_restricted()",
        "aa_change_hat(DefaultHat)", "callback(first)", "callback(second)", "aa_change_hat(null)", "exit(0)"])j");
}

TEST_F(CallbackChild, GoesOnWithoutAHatAndLogsIt) {
    platform.confined = true;
    platform.process.hats.clear();
    const Json::Value calls = Run();
    ExpectLog(LOG_ERR, "AppArmor: chagehat failed [No such file or directory]", "APIRunner.cpp");
    ExpectLog(LOG_ERR, "AppArmor: chagehat Original Hat failed [Operation not permitted]", "APIRunner.cpp");
    EXPECT_EQ(calls[5].asString(), "callback(first)");
}

}  // namespace
