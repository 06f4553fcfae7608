// Queries between APIs: what is sent where, and what a failure leaves.

#include <cerrno>

#include "Hooks.h"
#include "SubrequestTest.h"
#include "webapi/APIUtils.h"

using unit::J;
using ZOVA::APIUtils::QueryFastWebapi;
using ZOVA::APIUtils::QueryWebapi;

namespace {

using Texts = std::vector<std::string>;

constexpr const char* kSocket = "/run/zovascgi-fastapi.sock";

// ---- the fast API service ----

class FastQueryTest : public unit::FrameworkTest {
protected:
    FastQueryTest() {
        platform.services[kSocket] = [this](const std::string& text) {
            sent = text;
            return answer;
        };
    }

    std::string sent;
    std::string answer = R"({"success":true,"data":1} )";
};

TEST_F(FastQueryTest, GivesTheAnswerAsItCameAndClosesTheConnection) {
    std::string text = "old";
    EXPECT_TRUE(QueryFastWebapi(J(R"({"params": {"api": "A"}})"), text));
    EXPECT_EQ(text, answer);
    EXPECT_EQ(platform.CallsOf({"DomainSockConnection::Connect"}),
              (Texts{std::string("DomainSockConnection::Connect(") + kSocket + ")"}));
    EXPECT_EQ(platform.CountOf("SockConnection::Close"), 1);
    EXPECT_EQ(platform.openConnections, 0);
}

struct RunnerCase {
    const char* name;
    const char* description;
    const char* sent;
};

class FastQueryRunner : public FastQueryTest, public ::testing::WithParamInterface<RunnerCase> {};

TEST_P(FastQueryRunner, IsTheAdministratorWhereNobodyIsNamed) {
    const Json::Value description = J(GetParam().description);
    std::string text;
    EXPECT_TRUE(QueryFastWebapi(description, text));
    EXPECT_EQ(sent, Json::toString(J(GetParam().sent)));
    EXPECT_JSON(description, GetParam().description);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, FastQueryRunner,
    ::testing::Values(RunnerCase{"NoRunner", R"({"params": {"api": "A"}})",
                                 R"({"params": {"api": "A"}, "runner": {"username": "admin"}})"},
                      RunnerCase{"RunnerWithoutName", R"({"runner": {"uid": 1}})",
                                 R"({"runner": {"uid": 1, "username": "admin"}})"},
                      RunnerCase{"RunnerWithName", R"({"runner": {"uid": 1, "username": "bob"}})",
                                 R"({"runner": {"uid": 1, "username": "bob"}})"},
                      RunnerCase{"EmptyName", R"({"runner": {"username": ""}})", R"({"runner": {"username": ""}})"},
                      RunnerCase{"NullRunner", R"({"runner": null})", R"({"runner": {"username": "admin"}})"},
                      RunnerCase{"Null", "null", R"({"runner": {"username": "admin"}})"}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(FastQueryTest, ADescriptionWithNoPlaceForANameIsRefused) {
    for (const char* description : {"[]", "5", R"("x")", R"({"runner": "bob"})", R"({"runner": ["bob"]})"}) {
        std::string text = "old";
        EXPECT_FALSE(QueryFastWebapi(J(description), text)) << description;
        EXPECT_EQ(text, "old");
        ExpectLog(LOG_ERR, "the run description or its runner is no object", "APIUtils");
    }
    EXPECT_EQ(platform.CountOf("DomainSockConnection::Connect"), 0);
}

TEST_F(FastQueryTest, EachFailureHasItsLineAndClosesTheConnection) {
    const char* const rows[][2] = {{"DomainSockConnection::Connect", "Can not access zovascgi-fastapi.sock. "},
                                   {"SockConnection::Send", "Can not send zovascgi-fastapi.sock. "},
                                   {"SockConnection::Recv", "Can not recv zovascgi-fastapi.sock. "}};
    for (const auto& [call, line] : rows) {
        platform.StopFailing();
        platform.Fail(call, EIO);
        std::string text = "old";
        EXPECT_FALSE(QueryFastWebapi(J("{}"), text)) << call;
        EXPECT_EQ(text, "old");
        EXPECT_EQ(platform.openConnections, 0);
        ExpectLog(LOG_ERR, line + std::string(R"({"runner":{"username":"admin"}})"), "APIUtils");
    }
}

TEST_F(FastQueryTest, TheLineOfAFailureIsPrintableAndBounded) {
    platform.services.clear();
    Json::Value description(Json::objectValue);
    description["params"] = "\xc3\xa4" + std::string(1000, 'x');
    std::string text;
    EXPECT_FALSE(QueryFastWebapi(description, text));
    ExpectLog(LOG_ERR, "Can not access zovascgi-fastapi.sock. {\"params\":\"??" + std::string(499, 'x'), "APIUtils");
}

TEST_F(FastQueryTest, TheJsonFormParsesTheAnswer) {
    Json::Value value;
    EXPECT_TRUE(QueryFastWebapi(J("{}"), value));
    EXPECT_JSON(value, R"({"success": true, "data": 1})");
}

TEST_F(FastQueryTest, TheJsonFormIsFalseForAnAnswerThatIsNone) {
    for (const char* text : {"", "{", "not json", "{} x"}) {
        answer = text;
        Json::Value value = J("[1]");
        EXPECT_FALSE(QueryFastWebapi(J("{}"), value)) << text;
        EXPECT_JSON(value, "[1]");
    }
}

TEST_F(FastQueryTest, TheJsonFormFailsWithTheQuery) {
    platform.services.clear();
    Json::Value value;
    EXPECT_FALSE(QueryFastWebapi(J("{}"), value));
    ExpectLog(LOG_ERR, R"(Can not access zovascgi-fastapi.sock. {"runner":{"username":"admin"}})", "APIUtils");
}

// ---- which way a query goes ----

class QueryTest : public unit::SubrequestTest {
protected:
    bool Query(const std::string& endpoint) { return QueryWebapi(endpoint, headers, body); }

    void ExpectUntouched() const {
        EXPECT_EQ(headers, "X-A: 1");
        EXPECT_EQ(body, "a=1");
    }

    std::string headers = "X-A: 1";
    std::string body = "a=1";
};

struct EndpointCase {
    const char* name;
    const char* endpoint;
    const char* url;
};

class QueryEndpoint : public QueryTest, public ::testing::WithParamInterface<EndpointCase> {};

TEST_P(QueryEndpoint, BecomesItsUrl) {
    platform.httpServers[GetParam().url] = {{"HTTP/1.1 200 OK\r\n", "\r\n"}, {"answer"}};
    EXPECT_TRUE(Query(GetParam().endpoint));
    EXPECT_EQ(body, "answer");
    EXPECT_EQ(headers, "HTTP/1.1 200 OK\r\n\r\n");
    ASSERT_EQ(platform.httpRequests.size(), 1U);
    EXPECT_EQ(platform.httpRequests[0].options.at("URL"), GetParam().url);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, QueryEndpoint,
    ::testing::Values(EndpointCase{"Https", "https://idp.example/token", "https://idp.example/token"},
                      EndpointCase{"HttpsInCapitals", "HTTPS://idp.example/token", "HTTPS://idp.example/token"},
                      EndpointCase{"Path", "webapi/front.cgi", "https://127.0.0.1:5001/webapi/front.cgi"},
                      EndpointCase{"PathWithASlash", "/webapi/front.cgi", "https://127.0.0.1:5001//webapi/front.cgi"},
                      EndpointCase{"PathThatLooksLikeAHost", "@evil.example/",
                                   "https://127.0.0.1:5001/@evil.example/"}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(QueryTest, ThePortIsTheWebServers) {
    platform.httpsPort = 65535;
    EXPECT_FALSE(Query("x"));
    ASSERT_EQ(platform.httpRequests.size(), 1U);
    EXPECT_EQ(platform.httpRequests[0].options.at("URL"), "https://127.0.0.1:65535/x");
    EXPECT_EQ(platform.CallsOf({"GetHttpsPort"}), (Texts{"GetHttpsPort()"}));
}

TEST_F(QueryTest, PlainHttpIsRefusedInAnySpelling) {
    for (const char* endpoint : {"http://idp.example/", "HTTP://idp.example/", "hTTp://"}) {
        EXPECT_FALSE(Query(endpoint)) << endpoint;
        ExpectLog(LOG_ERR, "Not support http schema", "APIUtils");
    }
    ExpectUntouched();
    EXPECT_TRUE(platform.httpRequests.empty());
}

TEST_F(QueryTest, AnyOtherSchemeIsRefusedWhereverItStands) {
    for (const char* endpoint : {"ftp://idp.example/", "://", "path?to=https://x", " https://x"}) {
        EXPECT_FALSE(Query(endpoint)) << endpoint;
        ExpectLog(LOG_ERR, std::string("FATAL: endpoint support http(s) url or path only. ") + endpoint, "APIUtils");
    }
    ExpectUntouched();
    EXPECT_TRUE(platform.httpRequests.empty());
}

TEST_F(QueryTest, AnEndpointIsPrintableInTheLog) {
    EXPECT_FALSE(Query("x://\n"));
    ExpectLog(LOG_ERR, "FATAL: endpoint support http(s) url or path only. x://?", "APIUtils");
}

TEST_F(QueryTest, AFailedTransferLeavesHeadersAndBodyAndIsNotLogged) {
    EXPECT_FALSE(Query("https://nobody.example/"));
    ExpectUntouched();
}

TEST_F(QueryTest, WithoutEndpointAndBodyThereIsNothingToAsk) {
    body.clear();
    EXPECT_FALSE(Query(""));
    ExpectLog(LOG_ERR, "Both endpoint and body are empty", "APIUtils");
    EXPECT_EQ(headers, "X-A: 1");
}

// ---- a call in this process ----

class InProcessQuery : public QueryTest {
protected:
    InProcessQuery() { platform.redirects["/usr/zova/zovaman/webapi/"] = described.Path() + "/"; }

    unit::TemporaryDirectory described;
};

TEST_F(InProcessQuery, RunsTheNamedMethodAsTheAdministratorWithTheRestAsParameters) {
    body = "api=ZOVA.Test.Hook&method=local&version=1&do=tell_request&number=5&text=\"5\"&plus=a+b%20c";
    EXPECT_TRUE(Query(""));
    const Json::Value answer = J(body);
    EXPECT_TRUE(answer["success"].asBool()) << body;
    EXPECT_EQ(answer["data"]["user"].asString(), "admin");
    EXPECT_EQ(answer["data"]["param"]["number"], 5);
    EXPECT_EQ(answer["data"]["param"]["text"], "5");
    EXPECT_EQ(answer["data"]["param"]["plus"], "a+b%20c");
    EXPECT_EQ(headers, "X-A: 1");
    EXPECT_EQ(platform.CountOf("dlopen"), 1) << "no libcurl";
}

TEST_F(InProcessQuery, IsTrueWhateverTheCallAnswers) {
    body = "api=ZOVA.Test.Hook&method=local&version=1&do=fail&code=400";
    EXPECT_TRUE(Query(""));
    EXPECT_EQ(J(body)["error"]["code"], 400);
    body = "api=ZOVA.Test.NoSuch&method=local&version=1";
    EXPECT_TRUE(Query(""));
    EXPECT_EQ(J(body)["error"]["code"], 102);
}

TEST_F(InProcessQuery, TheVersionMayBeQuoted) {
    body = "api=ZOVA.Test.Hook&method=local&version=\"1\"&do=succeed";
    EXPECT_TRUE(Query(""));
    EXPECT_TRUE(J(body)["success"].asBool());
}

TEST_F(InProcessQuery, ABodyWithoutApiMethodOrVersionIsRefused) {
    for (const char* text :
         {"x", "&", "api=A&method=m", "api=A&version=1", "method=m&version=1", "api=A&method=m&version=0",
          "api=A&method=m&version=-1", "api=A&method=m&version=x", "api=A&method=m&version=[]",
          "api=A&method=m&version=4294967297", "api=&method=m&version=1", "api=A&method=&version=1",
          "api={}&method=m&version=1", "api=A&method=[1]&version=1"}) {
        body = text;
        EXPECT_FALSE(Query("")) << text;
        EXPECT_EQ(body, text);
        ExpectLog(LOG_ERR, "body must be api=xxx&method=xxx&version=1 when endpoint is empty.", "APIUtils");
    }
}

TEST_F(InProcessQuery, ABodyThatCannotBeParsedIsRefused) {
    platform.Fail("strPairToJsonObj", EINVAL);
    body = "api=ZOVA.Test.Hook&method=local&version=1&do=succeed";
    EXPECT_FALSE(Query(""));
    ExpectLog(LOG_ERR, "body must be api=xxx&method=xxx&version=1 when endpoint is empty.", "APIUtils");
}

}  // namespace
