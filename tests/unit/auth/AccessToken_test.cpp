// Bearer tokens: where one is found, whom its servers say it stands for, and the outcome for the call.

#include "FrameworkTest.h"
#include "TokenTest.h"
#include "webapi/APIAuth.h"

using unit::J;
using ZOVA::APIAuth;
using ZOVA::APIRequest;

namespace {

using Texts = std::vector<std::string>;

class TokenTest : public unit::FrameworkTest {
protected:
    TokenTest() {
        request.InitEnv(J(R"({"HTTP_AUTHORIZATION": "Bearer secret-token"})"));
        request.InitParam(J(R"({"getParam": {"api": "ZOVA.Test.Good", "version": 1, "method": "get"}})"), true);
    }

    /** The outcome of a call that carries a token. */
    int Check() {
        EXPECT_TRUE(APIAuth::CheckAccessToken(&request));
        return request.GetAuthResult();
    }

    void ExpectLine(const std::string& text) { ExpectLog(LOG_ERR, text, "AccessToken.cpp"); }

    void ExpectNoTokenInTheLog() {
        for (const fake::LogLine& line : platform.process.log) {
            EXPECT_EQ(line.whole.find("secret"), std::string::npos) << line.whole;
        }
    }

    Texts Asked() const {
        Texts apis;
        for (const Json::Value& query : device.service.queries) {
            apis.push_back(query["params"]["api"].asString());
        }
        return apis;
    }

    unit::TokenDevice device{platform};
    APIRequest request{Json::Value()};
};

// ---- where the token is ----

struct TokenCase {
    const char* name;
    const char* environment;
    const char* params;
    const char* token;
};

class BearerToken : public TokenTest, public ::testing::WithParamInterface<TokenCase> {};

TEST_P(BearerToken, IsTakenFromHeaderOrParameter) {
    APIRequest call{Json::Value()};
    call.InitEnv(J(GetParam().environment));
    Json::Value params(Json::objectValue);
    params["postParam"] = J(GetParam().params);
    call.InitParam(params, true);
    EXPECT_EQ(APIAuth::GetBearerToken(&call), GetParam().token);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, BearerToken,
    ::testing::Values(
        TokenCase{"Header", R"({"HTTP_AUTHORIZATION": "Bearer abc"})", "{}", "abc"},
        TokenCase{"AnotherSchemeInFront", R"({"HTTP_AUTHORIZATION": "Basic x, Bearer abc"})", "{}", "abc"},
        TokenCase{"TheFirstOccurrenceCounts", R"({"HTTP_AUTHORIZATION": "Bearer Bearer abc"})", "{}", "Bearer abc"},
        TokenCase{"EverythingBehindIt", R"({"HTTP_AUTHORIZATION": "Bearer a b, c "})", "{}", "a b, c "},
        TokenCase{"SmallLettersAreNoScheme", R"({"HTTP_AUTHORIZATION": "bearer abc"})", "{}", ""},
        TokenCase{"NoBlank", R"({"HTTP_AUTHORIZATION": "Bearer"})", "{}", ""},
        TokenCase{"Parameter", "{}", R"({"_oat": "abc"})", "abc"},
        TokenCase{"HeaderBeforeParameter", R"({"HTTP_AUTHORIZATION": "Bearer abc"})", R"({"_oat": "x"})", "abc"},
        TokenCase{"ParameterBehindAnEmptyHeader", R"({"HTTP_AUTHORIZATION": "Bearer "})", R"({"_oat": "x"})", "x"},
        TokenCase{"ParameterBehindAnotherHeader", R"({"HTTP_AUTHORIZATION": "Basic y"})", R"({"_oat": "x"})", "x"},
        TokenCase{"EmptyParameter", "{}", R"({"_oat": ""})", ""}, TokenCase{"Number", "{}", R"({"_oat": 5})", ""},
        TokenCase{"True", "{}", R"({"_oat": true})", ""}, TokenCase{"Null", "{}", R"({"_oat": null})", ""},
        TokenCase{"Array", "{}", R"({"_oat": ["x"]})", ""}, TokenCase{"Object", "{}", R"({"_oat": {"a": "x"}})", ""},
        TokenCase{"Nothing", "{}", "{}", ""}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(TokenTest, ACallWithoutATokenAsksNobodyAndKeepsItsResult) {
    APIRequest call{Json::Value()};
    EXPECT_FALSE(APIAuth::CheckAccessToken(&call));
    EXPECT_EQ(call.GetAuthResult(), ZOVA::AUTHORIZED_RESULT_INVALID);
    EXPECT_TRUE(device.service.queries.empty());
}

// ---- a good token ----

TEST_F(TokenTest, AGoodTokenNamesItsUserAndGivesOne) {
    EXPECT_EQ(Check(), 1);
    EXPECT_EQ(request.GetLoginUserName(), "alice");
    ExpectNoTokenInTheLog();
}

TEST_F(TokenTest, TheSystemIsAskedForScopesServersAndUserInThisOrderAsTheAdministrator) {
    EXPECT_EQ(Check(), 1);
    ASSERT_EQ(device.service.queries.size(), 3U);
    EXPECT_JSON(device.service.queries[0], R"({"params": {"api": "ZOVA.Core.OAuth.Scope", "method": "get",
        "version": 1}, "runner": {"username": "admin"}})");
    EXPECT_JSON(device.service.queries[1], R"({"params": {"api": "ZOVA.Core.OAuth.Server", "method": "get",
        "version": 1}, "runner": {"username": "admin"}})");
    EXPECT_JSON(device.service.queries[2], R"({"params": {"api": "ZOVA.Core.User", "method": "get", "version": 1,
        "name": "alice"}, "runner": {"username": "admin"}})");
}

TEST_F(TokenTest, TheServerGetsTheTokenInTheFirstPlaceOfItsTemplateUnencoded) {
    request.InitEnv(J(R"({"HTTP_AUTHORIZATION": "Bearer a/b+c%20="})"));
    device.SetServers(R"([{"enabled": true, "endpoint": "https://one.example/", "header": "X-A: 1\nX-B: 2",
        "params": "t={access_token}&u={access_token}", "expect": {"user": "{userName}", "scope": "{scope}"}}])");
    EXPECT_EQ(Check(), 1);
    ASSERT_EQ(platform.httpRequests.size(), 1U);
    EXPECT_EQ(platform.httpRequests[0].options.at("POSTFIELDS"), "t=a/b+c%20=&u={access_token}");
    EXPECT_EQ(platform.httpRequests[0].headers, (Texts{"X-A: 1", "X-B: 2"}));
}

TEST_F(TokenTest, ATemplateMayBeAnObject) {
    device.SetServers(R"([{"enabled": true, "endpoint": "https://one.example/", "params": {"t": "{access_token}"},
        "expect": {"user": "{userName}", "scope": "{scope}"}}])");
    EXPECT_EQ(Check(), 1);
    EXPECT_EQ(platform.httpRequests[0].options.at("POSTFIELDS"), R"({"t":"secret-token"})");
    EXPECT_TRUE(platform.httpRequests[0].headers.empty());
}

// ---- the scope list ----

TEST_F(TokenTest, ScopesThatCannotBeHadMakeTheCheckUnavailable) {
    const std::pair<const char*, const char*> rows[] = {
        {"", "null"},
        {"no json", "null"},
        {"null", "null"},
        {"5", "5"},
        {R"({"data":{"scope":[{"id":"read"}]}})", R"({"data":{"scope":[{"id":"read"}]}})"},
        {R"({"success":false,"error":{"code":102}})", R"({"error":{"code":102},"success":false})"},
        {R"({"data":{"scope":[1]},"success":"true"})", R"({"data":{"scope":[1]},"success":"true"})"},
        {R"({"success":true})", R"({"success":true})"},
        {R"({"data":null,"success":true})", R"({"data":null,"success":true})"},
        {R"({"data":[],"success":true})", R"({"data":[],"success":true})"},
        {R"({"data":{"scope":[]},"success":true})", R"({"data":{"scope":[]},"success":true})"},
        {R"({"data":{"scope":{}},"success":true})", R"({"data":{"scope":{}},"success":true})"},
        {R"({"data":{"scope":null},"success":true})", R"({"data":{"scope":null},"success":true})"}};
    for (const auto& [answer, shown] : rows) {
        device.service.answers[unit::kScopeAPI] = answer;
        EXPECT_EQ(Check(), -6) << answer;
        ExpectLine(std::string("Can not find scope (") + shown + ").");
    }
    EXPECT_TRUE(platform.httpRequests.empty()) << "no server is asked";
    EXPECT_EQ(request.GetLoginUserName(), "");
}

TEST_F(TokenTest, AServiceThatIsNotThereMakesTheCheckUnavailable) {
    platform.services.clear();
    EXPECT_EQ(Check(), -6);
    ExpectLog(LOG_ERR,
              R"(Can not access zovascgi-fastapi.sock. {"params":{"api":"ZOVA.Core.OAuth.Scope","method":"get",)"
              R"("version":1},"runner":{"username":"admin"}})",
              "APIUtils");
    ExpectLine("Can not find scope (null).");
}

// ---- the server list ----

TEST_F(TokenTest, ServersThatCannotBeHadMakeTheCheckUnavailable) {
    for (const char* answer : {"", "null", R"({"success": true})", R"({"success": false, "data": []})",
                               R"({"data": []})", R"({"success": true, "data": {}})",
                               R"({"success": true, "data": null})", R"({"success": true, "data": "x"})"}) {
        device.service.answers[unit::kServerAPI] = answer;
        EXPECT_EQ(Check(), -6) << answer;
        ExpectLine("Can not get oauth server information.");
    }
}

TEST_F(TokenTest, NoServerAtAllMakesTheCheckUnavailableWithoutALine) {
    device.SetServers("[]");
    EXPECT_EQ(Check(), -6);
    EXPECT_EQ(Asked(), (Texts{unit::kScopeAPI, unit::kServerAPI}));
}

TEST_F(TokenTest, OnlyAServerThatIsEnabledByABoolIsAsked) {
    for (const char* server : {"{}", R"({"enabled": false})", R"({"enabled": "true"})", R"({"enabled": 1})",
                               R"({"enabled": null})", R"({"enabled": [true]})", "null", "5", "[]", R"("x")"}) {
        device.SetServers(std::string("[").append(server).append("]"));
        EXPECT_EQ(Check(), -6) << server;
    }
}

TEST_F(TokenTest, AServerWithoutExpectIsPassedOver) {
    device.SetServers(R"([{"enabled": true, "endpoint": "https://one.example/", "params": "{access_token}"}])");
    EXPECT_EQ(Check(), -6);
    ExpectLine("ZOVA.Core.OAuth.Server must provide expect");
    EXPECT_TRUE(platform.httpRequests.empty());
}

TEST_F(TokenTest, AServerWithoutAPlaceForTheTokenIsPassedOver) {
    for (const char* params : {R"("")", R"("{access token}")", "null", "5", R"(["{access_token}"])", "{}"}) {
        device.SetServers(R"([{"enabled": true, "endpoint": "https://one.example/", "expect": {}, "params": )" +
                          std::string(params) + "}]");
        EXPECT_EQ(Check(), -6) << params;
        ExpectLine("ZOVA.Core.OAuth.Server must provide {access_token}");
    }
    EXPECT_TRUE(platform.httpRequests.empty());
}

TEST_F(TokenTest, HeaderAndEndpointOfAnotherTypeCountAsEmpty) {
    device.SetServers(R"([{"enabled": true, "endpoint": ["https://one.example/"], "header": 5,
        "params": "x={access_token}", "expect": {}}])");
    EXPECT_EQ(Check(), -6);
    ExpectLog(LOG_ERR, "body must be api=xxx&method=xxx&version=1 when endpoint is empty.", "APIUtils");
    EXPECT_TRUE(platform.httpRequests.empty());
}

TEST_F(TokenTest, AServerThatCannotBeReachedMakesTheCheckUnavailableWithoutALine) {
    platform.httpServers.clear();
    EXPECT_EQ(Check(), -6);
}

TEST_F(TokenTest, AnAnswerThatIsNoJsonIsLoggedWithTheEndpoint) {
    device.ServerAnswers("https://one.example/", "<html>");
    EXPECT_EQ(Check(), -6);
    ExpectLine("Can not read response from https://one.example/");
}

TEST_F(TokenTest, AnAnswerWithoutUserOrScopeAsTextIsLogged) {
    for (const char* answer : {"{}", "[]", "null", R"({"user":"alice"})", R"({"scope":"read"})",
                               R"({"scope":"read","user":5})", R"({"scope":["read"],"user":"alice"})"}) {
        device.ServerAnswers("https://one.example/", answer);
        EXPECT_EQ(Check(), -6) << answer;
        ExpectLine(std::string("Resolve ") + answer +
                   R"( with {"scope":"{scope}","user":"{userName}"} failed. Can not found userName or scope)");
    }
}

TEST_F(TokenTest, ATokenThatTheServerRepeatsIsNotLogged) {
    request.InitEnv(J(R"({"HTTP_AUTHORIZATION": "Bearer secret\"token"})"));
    device.ServerAnswers("https://one.example/", R"({"a":"secret\"token","b":"secret\"token!"})");
    EXPECT_EQ(Check(), -6);
    ExpectLine(R"(Resolve {"a":"***","b":"***!"} with {"scope":"{scope}","user":"{userName}"} failed. )"
               "Can not found userName or scope");
    ExpectNoTokenInTheLog();
}

// ---- several servers ----

class TwoServers : public TokenTest {
protected:
    TwoServers() {
        const std::string server = R"({"enabled": true, "params": "{access_token}",
            "expect": {"user": "{userName}", "scope": "{scope}"}, "endpoint": )";
        device.SetServers(std::string("[") + server + R"("https://one.example/"}, )" + server +
                          R"("https://two.example/"}])");
        device.ServerAnswers("https://two.example/", R"({"user": "bob", "scope": "read"})");
    }

    void ExpectRefusalOf(const char* answer) {
        ExpectLine(std::string("Resolve ") + answer +
                   R"( with {"scope":"{scope}","user":"{userName}"} failed. Can not found userName or scope)");
    }

    Texts AskedServers() const {
        Texts urls;
        for (const fake::HttpRequest& sent : platform.httpRequests) {
            urls.push_back(sent.options.at("URL"));
        }
        return urls;
    }
};

TEST_F(TwoServers, TheFirstThatAcceptsEndsTheSearch) {
    EXPECT_EQ(Check(), 1);
    EXPECT_EQ(request.GetLoginUserName(), "alice");
    EXPECT_EQ(AskedServers(), (Texts{"https://one.example/"}));
}

TEST_F(TwoServers, TheSecondIsAskedWhereTheFirstRefuses) {
    device.ServerAnswers("https://one.example/", R"({"error":"expired"})");
    EXPECT_EQ(Check(), 1);
    EXPECT_EQ(request.GetLoginUserName(), "bob");
    EXPECT_EQ(AskedServers(), (Texts{"https://one.example/", "https://two.example/"}));
    ExpectRefusalOf(R"({"error":"expired"})");
}

TEST_F(TwoServers, TheSecondIsAskedWhereTheFirstCannotBeReached) {
    platform.httpServers.erase("https://one.example/");
    EXPECT_EQ(Check(), 1);
    EXPECT_EQ(request.GetLoginUserName(), "bob");
}

TEST_F(TwoServers, AUserOfTheFirstNeverMeetsAScopeOfTheSecond) {
    device.ServerAnswers("https://one.example/", R"({"user":"admin"})");
    device.ServerAnswers("https://two.example/", R"({"scope":"read"})");
    EXPECT_EQ(Check(), -6);
    EXPECT_EQ(request.GetLoginUserName(), "");
    ExpectRefusalOf(R"({"user":"admin"})");
    ExpectRefusalOf(R"({"scope":"read"})");
}

TEST_F(TwoServers, WhatWasInTheOutputBeforeNeverCountsForAServer) {
    Json::Value out = J(R"({"userName": "admin", "old": 1})");
    device.ServerAnswers("https://one.example/", R"({"scope":"read"})");
    const Json::Value server = J(R"({"enabled": true, "params": "{access_token}", "endpoint": "https://one.example/",
        "expect": {"user": "{userName}", "scope": "{scope}"}})");
    EXPECT_FALSE(APIAuth::ExchangeAccessTokenByServer(server, "token", out));
    EXPECT_JSON(out, R"({"scope": "read"})");
    ExpectRefusalOf(R"({"scope":"read"})");
}

TEST_F(TwoServers, AnEmptyTokenIsExchangedLikeAnyOtherAndItsRefusalLoggedOnce) {
    Json::Value out;
    device.ServerAnswers("https://one.example/", R"({"scope":"read"})");
    device.ServerAnswers("https://two.example/", R"({"scope":"read"})");
    EXPECT_FALSE(APIAuth::ExchangeAccessToken("", out));
    ExpectRefusalOf(R"({"scope":"read"})");
    ExpectRefusalOf(R"({"scope":"read"})");
}

TEST_F(TwoServers, AnExchangeThatFailsLeavesItsOutputAlone) {
    platform.httpServers.clear();
    Json::Value out = J(R"({"old": 1})");
    EXPECT_FALSE(APIAuth::ExchangeAccessToken("token", out));
    EXPECT_JSON(out, R"({"old": 1})");
}

TEST_F(TwoServers, AnExchangeThatSucceedsGivesAllThatTheServersTemplateNames) {
    Json::Value out = J(R"({"old": 1})");
    EXPECT_TRUE(APIAuth::ExchangeAccessToken("token", out));
    EXPECT_JSON(out, R"({"userName": "alice", "scope": "read"})");
}

// ---- user and scope ----

TEST_F(TokenTest, AnEmptyUserOrScopeIsAnInvalidResponse) {
    const char* const rows[][2] = {
        {R"({"user": "", "scope": "read"})", R"({"scope":"read","userName":""})"},
        {R"({"user": "alice", "scope": ""})", R"({"scope":"","userName":"alice"})"},
        {R"({"user": "alice\u0000x", "scope": "read"})", R"({"scope":"read","userName":"alice\u0000x"})"}};
    for (const auto& [answer, shown] : rows) {
        device.ServerAnswers("https://one.example/", answer);
        EXPECT_EQ(Check(), -4) << answer;
        ExpectLine(std::string("FATAL: response invalid. ") + shown);
    }
    EXPECT_EQ(Asked().back(), unit::kServerAPI) << "no user is looked up";
    EXPECT_EQ(request.GetLoginUserName(), "");
}

TEST_F(TokenTest, AnUnknownUserIsRefused) {
    for (const char* answer :
         {"", "null", R"({"success": false, "error": {"code": 400}})", R"({"success": true})", R"({"data": {}})"}) {
        device.service.answers[unit::kUserAPI] = answer;
        EXPECT_EQ(Check(), -2) << answer;
        ExpectLine("Can not find user (alice). ");
    }
    EXPECT_EQ(request.GetLoginUserName(), "");
}

TEST_F(TokenTest, AnUnknownUsersNameIsPrintableInTheLog) {
    device.ServerAnswers("https://one.example/", R"({"user": "a\nb", "scope": "read"})");
    device.service.answers[unit::kUserAPI] = "";
    EXPECT_EQ(Check(), -2);
    ExpectLine("Can not find user (a?b). ");
}

TEST_F(TokenTest, ScopesThatDoNotCoverTheCallRefuseItWithoutALine) {
    device.SetScopes(R"([{"id": "read", "apis": [{"params": ["api=ZOVA.Other"]}]}])");
    EXPECT_EQ(Check(), -2);
    EXPECT_EQ(request.GetLoginUserName(), "");
}

// ---- a server that is a local API ----

TEST_F(TokenTest, ATokenCannotAddToACallThatRunsAsTheAdministrator) {
    request.InitEnv(J(R"({"HTTP_AUTHORIZATION": "Bearer x&api=ZOVA.Core.User&method=delete"})"));
    device.SetServers(R"([{"enabled": true, "params": "api=ZOVA.Test.Token&method=get&version=1&t={access_token}",
        "expect": {"data": {"user": "{userName}", "scope": "{scope}"}}}])");
    EXPECT_EQ(Check(), -6);
    ExpectLine("the token is no single value");
    EXPECT_EQ(platform.CountOf("strPairToJsonObj"), 0);
}

}  // namespace
