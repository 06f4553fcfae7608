// A call in this process: what the method finds, and what is as before afterwards.

#include <unistd.h>

#include <cstdlib>
#include <iostream>

#include "ChildRun.h"
#include "ProcessLibTest.h"
#include "webapi/Json.h"

using unit::ProcessLibTest;
using unit::Snapshot;
using unit::TestRunner;

namespace {

// ---- the answer ----

TEST_F(ProcessLibTest, AMethodAnswersThroughItsResponse) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "success");
    ExpectServiceTraces();
    EXPECT_EQ(Json::toString(runner.Response()->GetBody()), R"({"success":true})");
}

TEST_F(ProcessLibTest, AMethodThatDoesNothingAnswers117) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "nothing");
    ExpectServiceTraces();
    EXPECT_EQ(ErrorOf(runner), 117);
}

TEST_F(ProcessLibTest, TheMethodFindsThePresetError) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "session");
    EXPECT_EQ(DataOf(runner)["error"].asInt(), 117);
}

TEST_F(ProcessLibTest, AnExceptionOfTheMethodIsLoggedAndAnswers117WithEverythingPutBack) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "throw");
    ExpectLog(LOG_ERR, "the method of ZOVA.Test.Good version 1 method throw threw: made up?forged line");
    EXPECT_EQ(Json::toString(runner.Response()->GetBody()), R"({"error":{"code":117},"success":false})");
}

TEST_F(ProcessLibTest, AThrownIntIsLoggedAndAnswers117WithEverythingPutBack) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "throw_int");
    ExpectLog(LOG_ERR, "the method of ZOVA.Test.Good version 1 method throw_int threw: not a std::exception");
    EXPECT_EQ(ErrorOf(runner), 117);
}

TEST_F(ProcessLibTest, AMethodThatChangesDirectoryNiceValueAndStreamsChangesNothingForItsCaller) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "mess");
    EXPECT_EQ(ErrorOf(runner), 0);
    EXPECT_TRUE(std::cin.good());
    EXPECT_TRUE(std::cout.good());
}

TEST_F(ProcessLibTest, AMethodThatThrowsOutOfItsMessChangesNothingForItsCaller) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "throw_mess");
    ExpectLog(LOG_ERR, "the method of ZOVA.Test.Good version 1 method throw_mess threw: out of the mess");
    EXPECT_EQ(ErrorOf(runner), 117);
}

TEST_F(ProcessLibTest, AMethodWithoutATableRowAnswers121) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "not_in_table", false);
    EXPECT_EQ(ErrorOf(runner), 121);
    EXPECT_EQ(platform.CountOf("ResetCredentialsByName"), 0);
}

TEST_F(ProcessLibTest, ARowWithoutAFunctionAnswers121) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "null_function", false);
    EXPECT_EQ(ErrorOf(runner), 121);
}

// ---- the gate in front ----

TEST_F(ProcessLibTest, AGateRefusalLeavesNoHatNoVariableAndNoNiceValueBehind) {
    platform.confined = true;
    platform.process.hats = {"DefaultHat"};
    TestRunner runner;
    runner.needsPermission = true;
    runner.permissionError = 119;
    EXPECT_FALSE(CallGood(runner, "success"));
    EXPECT_EQ(ErrorOf(runner), 119);
    EXPECT_EQ(runner.asked, (std::vector<std::string>{"NeedPermission", "CheckPermission", "SkipPermission"}));
    for (const char* call : {"aa_change_hat", "setenv", "getpriority", "dlopen", "ZOVA_aa_has_profile_restricted"}) {
        EXPECT_EQ(platform.CountOf(call), 0) << call;
    }
    EXPECT_EQ(getenv("APPARMOR_HAT_ARRAY"), nullptr);
}

TEST_F(ProcessLibTest, AForgivenRefusalRunsTheMethod) {
    TestRunner runner;
    runner.needsPermission = true;
    runner.permissionError = 119;
    runner.skipsPermission = true;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(ErrorOf(runner), 0);
}

TEST_F(ProcessLibTest, WithoutNeedOfPermissionNobodyIsAskedAboutIt) {
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(runner.asked, (std::vector<std::string>{"NeedPermission"}));
}

TEST_F(ProcessLibTest, ASharingRequestMeetsTheSharingGateAlone) {
    TestRunner runner;
    runner.sharingError = 126;
    runner.needsPermission = true;
    runner.Request()->InitEnv(unit::J(R"({"HTTP_X_FAKE_SHARING": "hash"})"));
    EXPECT_FALSE(CallGood(runner, "success"));
    EXPECT_EQ(ErrorOf(runner), 126);
    EXPECT_EQ(runner.asked, (std::vector<std::string>{"CheckSharingPermission", "SkipPermission"}));
}

// ---- stages of one call ----

TEST_F(ProcessLibTest, ACheckSeesWhatTheGateLeftAndTheMethodThePreset) {
    TestRunner runner;
    runner.needsPermission = true;
    runner.permissionError = 119;
    runner.skipsPermission = true;
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Checked", 1, "notes_error"));
    EXPECT_EQ(platform.CallsOf({"mark"}), (std::vector<std::string>{"mark(check sees 119)", "mark(method sees 117)"}));
    EXPECT_EQ(ErrorOf(runner), 0);
}

TEST_F(ProcessLibTest, AForgivenCallWhoseMethodSetsNothingAnswers117) {
    TestRunner runner;
    runner.needsPermission = true;
    runner.permissionError = 119;
    runner.skipsPermission = true;
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Checked", 1, "notes_error_silently"));
    EXPECT_EQ(ErrorOf(runner), 117);
}

// ---- check tables ----

struct CheckCase {
    const char* method;
    bool called;
    int error;
    const char* log;
};

class CheckTableTest : public unit::DeviceTest, public ::testing::WithParamInterface<CheckCase> {};

TEST_P(CheckTableTest, DecidesWhetherTheMethodIsCalled) {
    const CheckCase& row = GetParam();
    const Json::Value before = Snapshot();
    TestRunner runner;
    runner.needsPermission = true;
    runner.permissionError = 150;
    runner.skipsPermission = true;
    EXPECT_EQ(Call(runner, "ZOVA.Test.Checked", 1, row.method), row.called);
    EXPECT_EQ(runner.Response()->GetError(), row.error);
    if (row.log != nullptr) {
        ExpectLog(LOG_ERR, row.log);
    }
    const Json::Value after = Snapshot();
    for (const char* key : {"user", "group", "groups", "nice", "cin", "cout", "directory"}) {
        EXPECT_EQ(after[key], before[key]) << key;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Rows, CheckTableTest,
    ::testing::Values(CheckCase{"passes", true, 0, nullptr}, CheckCase{"refused_with_error", false, 777, nullptr},
                      CheckCase{"refused_silently", false, 150, nullptr},
                      CheckCase{"throws", false, 117,
                                "the check of ZOVA.Test.Checked version 1 method throws threw: a check that fails"},
                      CheckCase{"null_check", true, 0, nullptr}, CheckCase{"no_row", true, 0, nullptr}),
    [](const auto& row) { return std::string(row.param.method); });

TEST_F(ProcessLibTest, WhatACheckRenamesDoesNotChangeTheCallThatRuns) {
    TestRunner runner;
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Checked", 1, "renames"));
    EXPECT_JSON(DataOf(runner), R"({"api": "ZOVA.Test.Checked", "version": 1, "method": "renames"})");
    EXPECT_EQ(platform.CallsOf({"ResetCredentialsByName"}),
              (std::vector<std::string>{"ResetCredentialsByName(service, keep)"}));
    EXPECT_EQ(platform.process.threadName, std::string("ZOVA.Test.Checked_1_renames").substr(0, 15));
}

TEST_F(ProcessLibTest, WhatAnUploadsFormFieldsRenameDoesNotChangeTheCallThatRuns) {
    const unit::ChildResult result = unit::RunInChild("", [&] {
        TestRunner runner;
        runner.uploadedParams =
            unit::J(R"({"postParam": {"api": "ZOVA.Test.Other", "version": 2, "method": "by_default", "more": 1}})");
        runner.Request()->InitEnv(unit::J(R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
        Json::Value report(Json::objectValue);
        report["called"] = CallGood(runner, "keep_input");
        report["api"] = runner.Request()->GetAPIClass();
        report["version"] = runner.Request()->GetAPIVersion();
        report["method"] = runner.Request()->GetAPIMethod();
        report["more"] = runner.Request()->GetParam("more", 0);
        report["answer"] = runner.Response()->GetBody();
        return report;
    });
    ASSERT_TRUE(result.orderly) << result.end;
    EXPECT_JSON(result.report, R"({"called": true, "api": "ZOVA.Test.Good", "version": 1, "method": "keep_input",
        "more": 1, "answer": {"success": true, "data": {"text": ""}}})");
}

// ---- uploads ----

TEST_F(ProcessLibTest, ARefusedUploadEndsTheCallWithTheHooksError) {
    TestRunner runner;
    runner.uploadError = 108;
    runner.Request()->InitEnv(unit::J(R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
    CallAndFindProcessAsBefore(runner, "keep_input", false);
    EXPECT_EQ(ErrorOf(runner), 108);
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
}

// ---- streams ----

TEST_F(ProcessLibTest, WithoutUploadAMethodReadsEndOfFileFromStandardInput) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "read_input");
    EXPECT_EQ(DataOf(runner)["text"].asString(), "");
}

TEST_F(ProcessLibTest, WithUploadAMethodKeepsStandardInputAndWithDownloadStandardOutput) {
    const unit::ChildResult result = unit::RunInChild("the body", [&] {
        Json::Value report(Json::objectValue);
        TestRunner runner;
        CallGood(runner, "keep_input");
        report["input"] = DataOf(runner)["text"];
        CallGood(runner, "write_output");
        report["goodIntoNothing"] = DataOf(runner)["good"];
        CallGood(runner, "keep_output");
        return report;
    });
    ASSERT_TRUE(result.orderly) << result.end;
    EXPECT_EQ(result.report["input"].asString(), "the body");
    EXPECT_TRUE(result.report["goodIntoNothing"].asBool());
    EXPECT_EQ(result.output, "written by the method");
}

// ---- nice value ----

TEST_F(ProcessLibTest, TheMethodRunsAtTheDescriptionsNiceValueAndTheProcessIsAtItsOwnAgain) {
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "probe"));
    EXPECT_EQ(DataOf(runner)["nice"].asInt(), 5);
    EXPECT_EQ(platform.process.nice, 0);
}

TEST_F(ProcessLibTest, TheNiceValueIsGivenBackOnFailurePathsToo) {
    TestRunner runner;
    EXPECT_FALSE(CallGood(runner, "not_in_table"));
    EXPECT_EQ(platform.CallsOf({"setpriority"}), (std::vector<std::string>{"setpriority(5)", "setpriority(0)"}));
    platform.users.erase("service");
    EXPECT_FALSE(CallGood(runner, "success"));
    EXPECT_EQ(platform.process.nice, 0);
    ExpectLog(LOG_ERR, "grantable failed. [No such file or directory]");
}

// ---- hat ----

TEST_F(ProcessLibTest, TheMethodRunsInItsHatAndTheLibraryIsOpenedInIt) {
    platform.confined = true;
    platform.process.hats = {"ZOVA.Test.Good.probe", "ZOVA.Test.Good"};
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "probe"));
    EXPECT_EQ(DataOf(runner)["hat"].asString(), "ZOVA.Test.Good.probe");
    EXPECT_EQ(DataOf(runner)["stack"].asString(), R"(["ZOVA.Test.Good.probe"])");
    EXPECT_EQ(platform.process.hat, "");
    EXPECT_STREQ(getenv("APPARMOR_HAT_ARRAY"), "[]");
    const std::vector<std::string> order =
        platform.CallsOf({"aa_change_hat", "dlopen", "ResetCredentialsByName", "mark", "chdir"});
    ASSERT_EQ(order.size(), 7U);
    EXPECT_EQ(order[0], "aa_change_hat(ZOVA.Test.Good.probe)");
    EXPECT_EQ(order[1], "dlopen(" + unit::LibraryPath("good") + ", lazy)");
    EXPECT_EQ(order[2], "mark(GetAPITable)");
    EXPECT_EQ(order[3], "ResetCredentialsByName(service, keep)");
    EXPECT_EQ(order[4], "mark(probe)");
    EXPECT_EQ(order[5].substr(0, 6), "chdir(");
    EXPECT_EQ(order[6], "aa_change_hat(null)");
}

TEST_F(ProcessLibTest, AnInnerCallGoesBackToTheOuterOnesHat) {
    platform.confined = true;
    platform.process.hats = {"ZOVA.Test.Good.nest", "ZOVA.Test.Good", "ZOVA.Test.Other"};
    TestRunner runner;
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Good", 1, "nest",
                     unit::J(R"({"inner": {"api": "ZOVA.Test.Good", "version": 1, "method": "probe"}})")));
    const Json::Value data = DataOf(runner);
    EXPECT_EQ(data["outer"]["stack"].asString(), R"(["ZOVA.Test.Good.nest"])");
    EXPECT_EQ(data["inner"]["data"]["stack"].asString(), R"(["ZOVA.Test.Good.nest","ZOVA.Test.Good"])");
    EXPECT_EQ(data["inner"]["data"]["hat"].asString(), "ZOVA.Test.Good");
    for (const char* key : {"stack", "hat", "user", "group", "groups", "nice", "directory"}) {
        EXPECT_EQ(data["again"][key], data["outer"][key]) << key;
    }
    EXPECT_EQ(platform.process.hat, "");
}

}  // namespace
