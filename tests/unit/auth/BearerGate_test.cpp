// A bearer token at the web entry's gate.

#include "GateTest.h"
#include "TokenTest.h"

using unit::Serve;
using unit::WebAnswer;
using unit::WebCall;

namespace {

class BearerGate : public unit::GateTest {
protected:
    static WebCall WithToken(const std::string& sid = "") {
        return Session(sid).With("HTTP_AUTHORIZATION", "Bearer secret-token");
    }

    static int Exchanges(const WebAnswer& answer) {
        return static_cast<int>(answer.CallsOf("curl_easy_perform").size());
    }

    unit::TokenDevice device{platform};
};

TEST_F(BearerGate, AGoodTokenRunsTheMethodAsItsUser) {
    const WebAnswer answer = Serve(WithToken());
    EXPECT_EQ(answer.ErrorCode(), 0) << answer.child.output;
    EXPECT_EQ(answer.body["data"]["user"].asString(), "alice");
    EXPECT_EQ(answer.environment["ZOVA_WEBAPI_USERNAME"].asString(), "alice");
    EXPECT_TRUE(answer.request["session"]["isAuthorized"].asBool());
    EXPECT_FALSE(answer.request["session"]["isAdmin"].asBool());
    EXPECT_EQ(Exchanges(answer), 1);
}

TEST_F(BearerGate, AServerThatIsALocalApiDoesNotLeaveTheAdministratorBehindAsTheUser) {
    device.SetServers(R"([{"enabled": true, "params":
        "api=ZOVA.Test.Good&version=1&method=echo&user=alice&scope=read&t={access_token}",
        "expect": {"data": {"user": "{userName}", "scope": "{scope}"}}}])");
    const WebAnswer answer = Serve(WithToken());
    EXPECT_EQ(answer.body["data"]["user"].asString(), "alice") << answer.child.output;
    EXPECT_EQ(answer.environment["ZOVA_WEBAPI_USERNAME"].asString(), "alice");
    EXPECT_FALSE(answer.environment.isMember("USERNAME"));
}

TEST_F(BearerGate, ATokenAloneCountsAlsoBesideASessionId) {
    const WebAnswer answer = Serve(WithToken("admin-sid"));
    EXPECT_EQ(answer.body["data"]["user"].asString(), "alice");
    EXPECT_TRUE(answer.CallsOf("ZovaCgiIsAuthorizedEx").empty());
}

TEST_F(BearerGate, ATokenWhoseScopeFailsIsRefusedWithoutTryingTheSession) {
    device.SetScopes(R"([{"id": "read", "apis": [{"params": ["method=other"]}]}])");
    const WebAnswer answer = Serve(WithToken("admin-sid"));
    EXPECT_EQ(answer.ErrorCode(), 105);
    EXPECT_EQ(answer.Header("x-request-error"), "noprivilege");
    EXPECT_EQ(answer.request["session"]["authResult"].asInt(), -2);
    EXPECT_FALSE(answer.request["session"].isMember("username"));
    EXPECT_TRUE(answer.CallsOf("ZovaCgiIsAuthorizedEx").empty());
    EXPECT_TRUE(answer.CallsOf("ZovaAccessTokenGrant").empty());
    EXPECT_FALSE(answer.environment.isMember("ZOVA_WEBAPI_USERNAME"));
}

TEST_F(BearerGate, ARefusedTokenIsNotRescuedByADeviceToken) {
    platform.deviceTokens["tid"] = {"admin", {{"ZOVA.Test.Good", "session"}}};
    device.SetScopes(R"([{"id": "other", "apis": []}])");
    const WebAnswer answer =
        Serve(WithToken().With("QUERY_STRING", "api=ZOVA.Test.Good&version=1&method=session&tid=tid"));
    EXPECT_EQ(answer.ErrorCode(), 105);
    EXPECT_TRUE(answer.CallsOf("ZovaAccessTokenGrant").empty());
}

TEST_F(BearerGate, ATokenThatNoServerAcceptsIsRefusedAs105) {
    device.SetServers("[]");
    const WebAnswer answer = Serve(WithToken());
    EXPECT_EQ(answer.ErrorCode(), 105);
    EXPECT_EQ(answer.Header("x-request-error"), "noprivilege");
    EXPECT_EQ(answer.request["session"]["authResult"].asInt(), -6);
}

TEST_F(BearerGate, TheKindOfUserIsTestedForATokenToo) {
    Good()["allowUser"] = unit::J(R"(["admin.local"])");
    Install();
    EXPECT_EQ(Serve(WithToken()).ErrorCode(), 105);
}

TEST_F(BearerGate, ATokensFiltersAreTypedAsTheParametersAre) {
    device.SetScopes(R"([{"id": "read", "apis": [{"params": ["version=1&method=session&n=5"]}]}])");
    const WebCall call = WithToken();
    const std::string query = call.environment.at("QUERY_STRING");
    EXPECT_EQ(Serve(call.With("QUERY_STRING", query + "&n=5")).ErrorCode(), 0);
    EXPECT_EQ(Serve(call.With("QUERY_STRING", query + "&n=6")).ErrorCode(), 105);
    EXPECT_EQ(Serve(call).ErrorCode(), 105);
}

TEST_F(BearerGate, ABatchExchangesItsTokenOnceForAllEntriesOfAKind) {
    Json::Value entry(Json::objectValue);
    entry["ZOVA.Entry.Request"] = Good();
    entry["ZOVA.Entry.Request"]["methods"]["1"] = unit::J(R"([{"request": {"grantable": true}}])");
    entry["ZOVA.Entry.Request"]["authLevel"] = 0;
    platform.files["ZOVA.Entry.lib"] = Json::toString(entry);
    device.SetScopes(R"([{"id": "read", "apis": [{"params": ["api=ZOVA.Entry."]}]}])");
    const WebAnswer answer = Serve(WebCall::Post(
        "api=ZOVA.Entry.Request&version=1&method=request&_oat=secret-token&compound="
        R"([{"api":"ZOVA.Test.Good","version":1,"method":"granted"},{"api":"ZOVA.Test.Good","version":1,"method":"granted"}])"));
    ASSERT_TRUE(answer.wellFormed) << answer.child.output;
    EXPECT_EQ(answer.body["data"]["has_fail"].asBool(), false) << answer.child.output;
    EXPECT_EQ(answer.body["data"]["result"].size(), 2U);
    EXPECT_EQ(Exchanges(answer), 1) << "the filters met the call that carried the token";
}

TEST_F(BearerGate, WhateverFailsOnTheWayNobodyButTheTokensUserGetsIn) {
    constexpr int kMostCalls = 300;
    int number = 0;
    std::string failed;
    do {
        ++number;
        const WebAnswer answer =
            Serve(WithToken("admin-sid"), [&](fake::FakePlatform& fakes) { fakes.FailCall(number); });
        failed = answer.failedCall;
        SCOPED_TRACE("failed call " + std::to_string(number) + ": " + failed);
        // Each failure has lines of its own, which other tests name.
        platform.process.log.clear();
        ASSERT_TRUE(answer.child.orderly) << answer.child.end;
        EXPECT_TRUE(answer.wellFormed) << answer.child.output;
        EXPECT_TRUE(answer.CallsOf("ZovaCgiIsAuthorizedEx").empty());
        if (answer.body["success"] == true) {
            EXPECT_EQ(answer.body["data"]["user"].asString(), "alice");
        }
    } while (!failed.empty() && number < kMostCalls);
    EXPECT_TRUE(failed.empty());
    EXPECT_GT(number, 60);
}

}  // namespace
