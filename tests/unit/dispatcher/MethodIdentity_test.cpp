// Under which identity a method runs, and the way back.

#include <cerrno>

#include "ProcessLibTest.h"

using unit::ProcessLibTest;
using unit::Snapshot;
using unit::TestRunner;

namespace {

struct IdentityCase {
    const char* method;
    const char* runsAs;
    const char* user;
    const char* group;
    const char* groups;
    bool restored;
    const char* lasting = "";
};

class IdentityModeTest : public unit::DeviceTest, public ::testing::WithParamInterface<IdentityCase> {};

TEST_P(IdentityModeTest, RunsTheMethodAsTheDescriptionSays) {
    const IdentityCase& row = GetParam();
    const unit::ChildResult result = unit::RunInChild("", [&] {
        Json::Value report(Json::objectValue);
        TestRunner runner;
        runner.Request()->InitSession(unit::J(R"({"username": "alice"})"));
        report["before"] = Snapshot();
        report["called"] = CallGood(runner, row.method);
        report["inside"] = Json::member(runner.Response()->GetBody(), "data");
        report["after"] = Snapshot();
        report["credentials"] = Json::Value(Json::arrayValue);
        for (const std::string& call : platform.CallsOf({"ResetCredentialsByName"})) {
            report["credentials"].append(call);
        }
        return report;
    });
    ASSERT_TRUE(result.orderly) << result.end;
    const Json::Value& report = result.report;
    EXPECT_TRUE(report["called"].asBool());
    EXPECT_JSON(report["inside"]["user"], row.user);
    EXPECT_JSON(report["inside"]["group"], row.group);
    EXPECT_JSON(report["inside"]["groups"], row.groups);
    EXPECT_EQ(Json::asString(report["credentials"][0]), row.runsAs);
    if (row.restored) {
        for (const char* key : {"user", "group", "groups", "nice"}) {
            EXPECT_EQ(report["after"][key], report["before"][key]) << key;
        }
    } else {
        EXPECT_JSON(report["after"]["groups"], row.groups);
        EXPECT_EQ("[" + report["after"]["user"].asString() + "]", row.lasting);
    }
}

INSTANTIATE_TEST_SUITE_P(Rows, IdentityModeTest,
                         ::testing::Values(IdentityCase{"granted", "ResetCredentialsByName(service, keep)", "[0,500,0]",
                                                        "[0,50,0]", "[50]", true},
                                           IdentityCase{"lasting", "ResetCredentialsByName(service, for good)",
                                                        "[500,500,500]", "[50,50,50]", "[50]", false, "[500/500/500]"},
                                           IdentityCase{"by_user", "ResetCredentialsByName(alice, keep)", "[0,1000,0]",
                                                        "[0,100,0]", "[100,200]", true},
                                           IdentityCase{"by_user_lasting", "ResetCredentialsByName(alice, for good)",
                                                        "[1000,1000,1000]", "[100,100,100]", "[100,200]", false,
                                                        "[1000/1000/1000]"},
                                           IdentityCase{"by_default", "", "[0,0,0]", "[0,0,0]", "[0]", true}),
                         [](const auto& row) { return std::string(row.param.method); });

TEST_F(ProcessLibTest, GrantByDefaultStaysEffectiveRootAndIsPutBackWhateverGrantableSays) {
    platform.process.user = {0, 33, 0};
    platform.process.group = {0, 33, 0};
    platform.process.groups = {33};
    Good()["priority"] = 0;
    Install();
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "by_default");
    ExpectAuthLog(LOG_INFO, "WARNING: setresgid(-1, 0, -1)");
    ExpectAuthLog(LOG_INFO, "WARNING: setresuid(-1, 0, -1)");
    EXPECT_JSON(DataOf(runner)["user"], "[0,0,0]");
    EXPECT_EQ(platform.CountOf("ResetCredentialsByName"), 0);
}

TEST_F(ProcessLibTest, GrantByDefaultWinsOverGrantByUser) {
    Good()["methods"]["1"][9] = unit::J(R"({"probe": {"grantByDefault": true, "grantByUser": true}})");
    Install();
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "probe");
    EXPECT_JSON(DataOf(runner)["user"], "[0,0,0]");
}

TEST_F(ProcessLibTest, ARefusedGrantByDefaultNeverRunsTheMethod) {
    platform.process.user = {33, 33, 33};
    platform.process.group = {33, 33, 33};
    TestRunner runner;
    EXPECT_FALSE(CallGood(runner, "by_default"));
    ExpectAuthLog(LOG_ERR, "ERROR: setresgid(-1, 0, -1) [Operation not permitted]");
    ExpectLog(LOG_ERR, "grantByDefault failed. [Operation not permitted]");
    EXPECT_EQ(ErrorOf(runner), 117);
    EXPECT_EQ(platform.CallsOf({"mark"}), (std::vector<std::string>{"mark(GetAPITable)"}));
}

TEST_F(ProcessLibTest, AMethodWhoseAttributesAreNoObjectRunsWithTheDefaultsLikeOneWithout) {
    // The defaults say "grantable": without them the identity would be lost for good.
    Good()["methods"]["1"] = unit::J(R"([{"probe": "text"}])");
    Install();
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "probe");
    EXPECT_EQ(platform.CallsOf({"ResetCredentialsByName"}),
              (std::vector<std::string>{"ResetCredentialsByName(service, keep)"}));
}

TEST_F(ProcessLibTest, GrantByUserWithoutALoginFailsWith117AndItsLine) {
    TestRunner runner;
    CallAndFindProcessAsBefore(runner, "by_user", false);
    ExpectLog(LOG_ERR, "grantByUser: failed to get login username.");
    EXPECT_EQ(ErrorOf(runner), 117);
}

TEST_F(ProcessLibTest, GrantByUserOfAnUnknownUserFailsWith117AndItsLine) {
    TestRunner runner;
    runner.Request()->InitSession(unit::J(R"({"username": "gone"})"));
    CallAndFindProcessAsBefore(runner, "by_user", false);
    ExpectLog(LOG_ERR, "grantByUser failed. [No such file or directory]");
    EXPECT_EQ(ErrorOf(runner), 117);
}

TEST_F(ProcessLibTest, AnIdentityTakenInPartNeverRunsTheMethod) {
    platform.breakCredentials = fake::BreakCredentials::kAfterGroup;
    TestRunner runner;
    EXPECT_FALSE(CallGood(runner, "granted"));
    ExpectLog(LOG_ERR, "grantable failed. [Operation not permitted]");
    EXPECT_EQ(ErrorOf(runner), 117);
    EXPECT_EQ(platform.CallsOf({"mark"}), (std::vector<std::string>{"mark(GetAPITable)"}));
}

TEST_F(ProcessLibTest, IdsThatCannotBeReadNeverRunTheMethod) {
    for (const char* call : {"getresuid", "getresgid"}) {
        platform.StopFailing();
        platform.Fail(call, EFAULT);
        TestRunner runner;
        CallAndFindProcessAsBefore(runner, "granted", false);
        EXPECT_EQ(ErrorOf(runner), 117) << call;
    }
    EXPECT_EQ(platform.CountOf("ResetCredentialsByName"), 0);
}

TEST_F(ProcessLibTest, ARunAsOfTheMethodReplacesTheAPIs) {
    Good()["methods"]["1"][9] = unit::J(R"({"probe": {"grantable": true, "runAs": "alice"}})");
    Install();
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "probe"));
    EXPECT_JSON(DataOf(runner)["user"], "[0,1000,0]");
}

TEST_F(ProcessLibTest, WithoutRunAsAMethodRunsAsSystem) {
    Good().removeMember("runAs");
    Install();
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "granted"));
    EXPECT_EQ(platform.CallsOf({"ResetCredentialsByName"}),
              (std::vector<std::string>{"ResetCredentialsByName(system, keep)"}));
}

TEST_F(ProcessLibTest, AFailedWayBackLeavesTheMethodsAnswer) {
    platform.Fail("setresuid", EPERM, 1);
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "granted"));
    ExpectAuthLog(LOG_ERR, "ERROR: setresuid(-1, 0, -1) [Operation not permitted]");
    ExpectLog(LOG_ERR, "set eid to root failed [Operation not permitted]");
    ExpectAuthLog(LOG_ERR, "ERROR: setresuid(0, 0, 0) [Operation not permitted]");
    EXPECT_EQ(ErrorOf(runner), 0);
}

TEST_F(ProcessLibTest, TheIdentityIsBackBeforeNiceValueDirectoryAndHat) {
    platform.confined = true;
    platform.process.hats = {"DefaultHat"};
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "granted"));
    std::vector<std::string> order =
        platform.CallsOf({"setgroups", "setresgid", "setresuid", "setpriority", "chdir", "aa_change_hat", "setenv"});
    order.erase(order.begin(), order.end() - 6);
    EXPECT_EQ(order[0], "setresgid(0, 0, 0)");
    EXPECT_EQ(order[1], "setresuid(0, 0, 0)");
    EXPECT_EQ(order[2], "setpriority(0)");
    EXPECT_EQ(order[3].substr(0, 6), "chdir(");
    EXPECT_EQ(order[4], "aa_change_hat(null)");
    EXPECT_EQ(order[5], "setenv(APPARMOR_HAT_ARRAY, [])");
}

}  // namespace
