#include <cstdlib>

#include "GateTest.h"

using unit::GateTest;
using unit::Serve;
using unit::TestWebEntry;
using unit::WebAnswer;
using unit::WebCall;

namespace {

// ---- authLevel ----

struct LevelCase {
    const char* name;
    /** JSON text; null: absent, also in `lib.def`. */
    const char* level;
    bool needs;
    bool skips;
};

class AuthLevel : public GateTest, public ::testing::WithParamInterface<LevelCase> {};

TEST_P(AuthLevel, SelectsWhoMeetsTheGateAndWhoIsForgiven) {
    const LevelCase& row = GetParam();
    TestWebEntry entry;
    Json::Value info = unit::J(R"({"lib": "x"})");
    if (row.level != nullptr) {
        info["authLevel"] = unit::J(row.level);
    }
    entry.Request()->InitAPIInfo(info);
    EXPECT_EQ(entry.NeedPermission(entry.Request()), row.needs);
    EXPECT_EQ(entry.SkipPermission(entry.Request()), row.skips);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, AuthLevel,
    ::testing::Values(LevelCase{"Absent", nullptr, true, false}, LevelCase{"Zero", "0", false, false},
                      LevelCase{"One", "1", true, false}, LevelCase{"Two", "2", true, true},
                      LevelCase{"Three", "3", true, false}, LevelCase{"Minus", "-1", true, false},
                      LevelCase{"Null", "null", true, false}, LevelCase{"TextZero", "\"0\"", true, false},
                      LevelCase{"TextTwo", "\"2\"", true, false}, LevelCase{"Text", "\"open\"", true, false},
                      LevelCase{"False", "false", true, false}, LevelCase{"Object", "{}", true, false},
                      LevelCase{"Array", "[0]", true, false}, LevelCase{"Real", "0.5", true, false},
                      LevelCase{"WrapsToZero", "4294967296", true, false}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(GateTest, ANullRequestNeedsPermissionAndIsNotForgiven) {
    TestWebEntry entry;
    EXPECT_TRUE(entry.NeedPermission(nullptr));
    EXPECT_FALSE(entry.SkipPermission(nullptr));
}

TEST_F(GateTest, WithoutDefaultsADescriptionWithoutAuthLevelAsksForALogin) {
    platform.files.erase("/usr/zova/zovaman/webapi/lib.def");
    Good().removeMember("authLevel");
    Install();
    EXPECT_EQ(Serve(Session("")).ErrorCode(), 119);
}

TEST_F(GateTest, AuthLevelZeroNeverTouchesTheLogin) {
    Good()["authLevel"] = 0;
    Install();
    const WebAnswer answer = Serve(Session("alice-sid"));
    EXPECT_EQ(answer.body["data"]["user"].asString(), "");
    EXPECT_TRUE(answer.CallsOf("ZovaCgiIsAuthorizedEx").empty());
    EXPECT_TRUE(answer.CallsOf("ZovaCgiGetOption").empty());
    EXPECT_JSON(answer.request["session"], R"({"uiLang": "enu", "tokenEnable": 0})");
}

TEST_F(GateTest, AuthLevelTwoWithoutCredentialsRunsTheMethodWithNobodyLoggedIn) {
    Good()["authLevel"] = 2;
    Install();
    const WebAnswer answer = Serve(Session(""));
    EXPECT_EQ(answer.ErrorCode(), 0);
    EXPECT_EQ(answer.body["data"]["error"].asInt(), 117);
    EXPECT_FALSE(answer.request["session"].isMember("username"));
    EXPECT_EQ(answer.body["data"]["authResult"].asInt(), -5);
    EXPECT_EQ(answer.Header("x-request-error"), "unauth") << "a server error word stays";
}

TEST_F(GateTest, AuthLevelTwoTakesUpAValidLogin) {
    Good()["authLevel"] = 2;
    Install();
    const WebAnswer answer = Serve(Session("alice-sid"));
    EXPECT_EQ(answer.body["data"]["user"].asString(), "alice");
    EXPECT_EQ(answer.Header("x-request-error"), "");
}

// ---- the result table ----

struct ResultCase {
    int result;
    int error;
    const char* word;
};

class AuthorizationResult : public GateTest, public ::testing::WithParamInterface<ResultCase> {};

TEST_P(AuthorizationResult, BecomesItsErrorAndItsWord) {
    const ResultCase& row = GetParam();
    platform.sessions["s"] = {"alice", row.result, 1000, {}};
    const WebAnswer answer = Serve(Session("s"));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(answer.ErrorCode(), row.error);
    EXPECT_EQ(answer.Header("x-request-error"), row.word);
    if (row.result == -7) {
        ExpectLog(LOG_ERR, "Token Authentication Fail.", "PermissionGate.cpp");
    }
    if (row.error != 0) {
        EXPECT_EQ(answer.request["session"]["authResult"].asInt(), row.result);
        EXPECT_TRUE(answer.CallsOf("dlopen").empty());
    }
}

INSTANTIATE_TEST_SUITE_P(Rows, AuthorizationResult,
                         ::testing::Values(ResultCase{-9, 105, "noprivilege"}, ResultCase{-8, 150, "errorip"},
                                           ResultCase{-7, 105, "noprivilege"}, ResultCase{-6, 105, "noprivilege"},
                                           ResultCase{-5, 119, "unauth"}, ResultCase{-4, 105, "noprivilege"},
                                           ResultCase{-3, 105, "noprivilege"}, ResultCase{-2, 105, "noprivilege"},
                                           ResultCase{-1, 106, "timeout"}, ResultCase{0, 105, "noprivilege"},
                                           ResultCase{1, 0, ""}, ResultCase{2, 0, ""},
                                           ResultCase{3, 105, "noprivilege"},
                                           ResultCase{2147483647, 105, "noprivilege"},
                                           ResultCase{-2147483647 - 1, 105, "noprivilege"}),
                         [](const auto& row) {
                             const std::string number = std::to_string(row.param.result);
                             return number[0] == '-' ? "Minus" + number.substr(1) : number;
                         });

TEST_F(GateTest, AFailedTokenIsLoggedForALoginThatIsRequiredOnly) {
    Good()["authLevel"] = 2;
    Install();
    platform.sessions["s"] = {"alice", -7, 1000, {}};
    const WebAnswer answer = Serve(Session("s"));
    EXPECT_EQ(answer.ErrorCode(), 0);
}

// ---- credentials ----

TEST_F(GateTest, WithoutAnyCredentialNothingIsAskedAndNoIdentityIsSet) {
    const WebAnswer answer = Serve(Session(""));
    EXPECT_EQ(answer.ErrorCode(), 119);
    EXPECT_TRUE(answer.CallsOf("ZovaCgiIsAuthorizedEx").empty());
    EXPECT_FALSE(answer.environment.isMember("ZOVA_WEBAPI_USERNAME"));
}

TEST_F(GateTest, ATimedOutSessionIsAcceptedWhereTheMethodAllowsIt) {
    platform.sessions["s"] = {"alice", -1, 1000, {}};
    EXPECT_EQ(Serve(Session("s")).ErrorCode(), 106);
    const WebAnswer answer =
        Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=timeout_allowed").With("HTTP_COOKIE", "id=s"));
    EXPECT_EQ(answer.CallsOf("ZovaCgiIsAuthorizedEx"),
              (std::vector<std::string>{"ZovaCgiIsAuthorizedEx(s, 493, flags 31, allowTimeout 1, 0)"}));
    EXPECT_EQ(answer.ErrorCode(), 121) << "admitted, and then not in the table";
}

TEST_F(GateTest, AChangedAddressIsAcceptedWhereTheMethodAllowsIt) {
    platform.sessions["s"] = {"alice", -8, 1000, {}};
    EXPECT_EQ(Serve(Session("s")).ErrorCode(), 150);
    const WebAnswer answer =
        Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=any_address").With("HTTP_COOKIE", "id=s"));
    EXPECT_EQ(answer.ErrorCode(), 121) << "admitted, and then not in the table";
    EXPECT_TRUE(answer.request["session"]["isSkipCheckIP"].asBool());
}

TEST_F(GateTest, ADeviceTokenLogsIn) {
    platform.deviceTokens["T"] = {"alice", {{"ZOVA.Test.Good", "session"}}};
    const WebAnswer answer = Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=session&tid=T"));
    EXPECT_EQ(answer.body["data"]["user"].asString(), "alice");
    EXPECT_EQ(answer.CallsOf("ZovaAccessTokenGrant"),
              (std::vector<std::string>{"ZovaAccessTokenGrant(T, ZOVA.Test.Good, session, 493)"}));
    EXPECT_TRUE(answer.CallsOf("ZovaCgiIsAuthorizedEx").empty());
}

TEST_F(GateTest, ADeviceTokenForAnotherMethodReadsUnauthenticatedAndTheSessionIsBuiltAllTheSame) {
    platform.deviceTokens["T"] = {"alice", {{"ZOVA.Test.Good", "other"}}};
    const WebAnswer answer = Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=session&tid=T"));
    EXPECT_EQ(answer.ErrorCode(), 119);
    EXPECT_EQ(answer.Header("x-request-error"), "unauth");
    EXPECT_TRUE(answer.request["session"]["isAuthorized"].asBool());
    EXPECT_EQ(answer.request["session"]["authResult"].asInt(), -5);
    EXPECT_EQ(answer.request["session"]["username"].asString(), "");
}

TEST_F(GateTest, AFailedSessionIsRescuedByADeviceToken) {
    platform.sessions["s"] = {"mallory", -1, 1000, {}};
    platform.deviceTokens["T"] = {"alice", {{"ZOVA.Test.Good", "session"}}};
    const WebAnswer answer =
        Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=session&tid=T").With("HTTP_COOKIE", "id=s"));
    EXPECT_EQ(answer.body["data"]["user"].asString(), "alice");
}

TEST_F(GateTest, AValidSessionBesideABadTokenIsAuthorisedByTheSession) {
    const WebAnswer answer =
        Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=session&tid=bad").With("HTTP_COOKIE", "id=alice-sid"));
    EXPECT_EQ(answer.body["data"]["user"].asString(), "alice");
    EXPECT_TRUE(answer.CallsOf("ZovaAccessTokenGrant").empty());
}

// ---- the session that is built ----

TEST_F(GateTest, TheSessionHoldsWhatTheCheckFoundOut) {
    platform.language = "fre";
    platform.tokenEnable = 1;
    platform.sessions["alice-sid"].options = {{1, "1"}, {6, "read"}, {7, "photo"}, {10, "45"}};
    Good()["appPriv"] = "ZOVA.App";
    Install();
    platform.appPrivileges.insert({"alice", "ZOVA.App", "192.0.2.7"});
    const WebAnswer answer = Serve(Session("alice-sid"));
    EXPECT_JSON(answer.request["session"], R"({"username": "alice", "isAdmin": false,
        "sessFile": "/run/fake/sessions/alice-sid", "isTimeout": false, "timeout": 45, "isSkipCheckIP": true,
        "uiLang": "fre", "app": "photo", "webapi": "read", "isAuthorized": true, "tokenEnable": true,
        "appPriv": "ZOVA.App"})");
    EXPECT_EQ(answer.environment["ZOVA_WEBAPI_USERNAME"].asString(), "alice");
    EXPECT_EQ(answer.CallsOf("QLIBGroupIsAdminGroupMem"),
              (std::vector<std::string>{"QLIBGroupIsAdminGroupMem(alice, 0)"}));
}

struct SessionOptionCase {
    const char* name;
    int option;
    const char* text;
    int timeout;
    bool skips;
};

class SessionOption : public GateTest, public ::testing::WithParamInterface<SessionOptionCase> {};

TEST_P(SessionOption, FallsBackToTheSystems) {
    const SessionOptionCase& row = GetParam();
    platform.cgiTimeout = 15;
    platform.cgiSkipCheckIP = 1;
    if (row.text != nullptr) {
        platform.sessions["alice-sid"].options[row.option] = row.text;
    }
    const WebAnswer answer = Serve(Session("alice-sid"));
    EXPECT_EQ(answer.request["session"]["timeout"].asInt(), row.timeout);
    EXPECT_EQ(answer.request["session"]["isSkipCheckIP"].asBool(), row.skips);
}

INSTANTIATE_TEST_SUITE_P(Rows, SessionOption,
                         ::testing::Values(SessionOptionCase{"NoneOfItsOwn", 0, nullptr, 15, true},
                                           SessionOptionCase{"TimeoutZero", 10, "0", 15, true},
                                           SessionOptionCase{"TimeoutOfItsOwn", 10, "7", 7, true},
                                           SessionOptionCase{"TimeoutThatIsNoNumber", 10, "soon", 15, true},
                                           SessionOptionCase{"TimeoutTooLarge", 10, "99999999999999999999", 2147483647,
                                                             true},
                                           SessionOptionCase{"AddressCheckOfItsOwn", 1, "0", 15, false},
                                           SessionOptionCase{"AddressCheckEmpty", 1, "", 15, false},
                                           SessionOptionCase{"AddressCheckSkipped", 1, "1", 15, true}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(GateTest, AfterAPassedGateTheRequestsResultIsWhatInitSessionLeft) {
    const WebAnswer answer = Serve(Session("alice-sid"));
    EXPECT_EQ(answer.body["data"]["authResult"].asInt(), -4);
}

// ---- permCache ----

TEST_F(GateTest, TheAuthorisationRunsOncePerKindOfCheck) {
    TestWebEntry entry;
    Prepare(entry, "alice-sid");
    EXPECT_EQ(entry.CheckPermission(true), 0);
    EXPECT_EQ(entry.CheckPermission(true), 0);
    EXPECT_EQ(platform.CountOf("ZovaCgiIsAuthorizedEx"), 1);
    EXPECT_EQ(entry.CheckPermission(false), 0);
    EXPECT_EQ(entry.CheckPermission(false), 0);
    EXPECT_EQ(platform.CountOf("ZovaCgiIsAuthorizedEx"), 2);
    EXPECT_EQ(platform.CallsOf({"ZovaCgiIsAuthorizedEx"})[1],
              "ZovaCgiIsAuthorizedEx(alice-sid, 493, flags 31, allowTimeout 0, 0)");
}

TEST_F(GateTest, ARefusalIsKeptLikeAPass) {
    TestWebEntry entry;
    Prepare(entry, "unknown");
    EXPECT_EQ(entry.CheckPermission(false), 105);
    platform.sessions["unknown"] = {"alice", 1, 1000, {}};
    EXPECT_EQ(entry.CheckPermission(false), 105);
    EXPECT_EQ(platform.CountOf("ZovaCgiIsAuthorizedEx"), 1);
    EXPECT_EQ(entry.Request()->GetAuthResult(), -2);
}

TEST_F(GateTest, AllowUserIsTestedAnewForEachCall) {
    TestWebEntry entry;
    Prepare(entry, "alice-sid");
    EXPECT_TRUE(entry.CheckPermission(entry.Request(), entry.Response()));
    Json::Value info = entry.Request()->GetAPIInfo("", Json::Value());
    info["allowUser"] = unit::J(R"(["admin.local"])");
    entry.Request()->InitAPIInfo(info);
    EXPECT_FALSE(entry.CheckPermission(entry.Request(), entry.Response()));
    EXPECT_EQ(entry.Response()->GetError(), 105);
    EXPECT_EQ(platform.CountOf("ZovaCgiIsAuthorizedEx"), 1);
}

TEST_F(GateTest, APassedGateLeavesASuccessWithoutData) {
    TestWebEntry entry;
    Prepare(entry, "alice-sid");
    EXPECT_TRUE(entry.CheckPermission(entry.Request(), entry.Response()));
    EXPECT_JSON(entry.Response()->GetBody(), R"({"success": true})");
}

}  // namespace
