// A call that is passed on to a peer device: what goes in, what comes out, and who may.

#include <cerrno>

#include "GateTest.h"

using unit::GateTest;
using unit::J;
using unit::Serve;
using unit::WebAnswer;
using unit::WebCall;

namespace {

constexpr const char* kAnswer = R"({ "from" : "the peer", "success":true })";

class RelayTest : public GateTest {
protected:
    RelayTest() { platform.peers[7] = kAnswer; }

    /** A call of alice's to peer 7, with more parameters. */
    static WebCall Call(const std::string& more = "") {
        return WebCall::Get("api=ZOVA.Test.Good&version=1&method=session&relay_zn=7" + more)
            .With("HTTP_COOKIE", "id=alice-sid");
    }

    static WebCall Upload(const std::string& query, const std::string& body) {
        return WebCall::Post(body)
            .With("CONTENT_TYPE", "multipart/form-data; boundary=x")
            .With("QUERY_STRING", query)
            .With("HTTP_COOKIE", "id=alice-sid");
    }

    static void ExpectNothingAsked(const WebAnswer& answer) {
        EXPECT_TRUE(answer.CallsOf("AddWebAPIRequest").empty());
        EXPECT_TRUE(answer.CallsOf("AddRelayRequest").empty());
        EXPECT_TRUE(answer.CallsOf("CredRequestMgr::Run").empty());
    }
};

// ---- a plain call ----

TEST_F(RelayTest, ThePeersAnswerIsTheBodyAsItStands) {
    const WebAnswer answer = Serve(Call());
    EXPECT_EQ(answer.bodyText, kAnswer);
    EXPECT_EQ(answer.CallsOf("CredRequestMgr::Run").size(), 1u);
    EXPECT_TRUE(answer.CallsOf("dlopen").empty()) << "nothing runs here";
}

TEST_F(RelayTest, AnAnswerThatIsNoJsonPassesUnparsed) {
    platform.peers[7] = std::string("no \0 JSON\r\n\r\n\xff", 14);
    EXPECT_EQ(Serve(Call()).bodyText, platform.peers[7]);
}

TEST_F(RelayTest, AnEmptyAnswerIsAnEmptyBody) {
    platform.peers[7] = "";
    const WebAnswer answer = Serve(Call());
    EXPECT_EQ(answer.bodyText, "");
    EXPECT_TRUE(answer.HasHeader("Expires: 0"));
}

TEST_F(RelayTest, TheHeadersAreThisDevices) {
    EXPECT_EQ(Serve(Call()).headers,
              (std::vector<std::string>{"Content-type: application/json; charset=\"UTF-8\"",
                                        "X-Content-Type-Options: nosniff", "X-XSS-Protection: 1; mode=block",
                                        "Cache-Control: max-age=0, no-cache, no-store, must-revalidate",
                                        "Pragma: no-cache", "Expires: 0"}));
}

TEST_F(RelayTest, TheNameOfTheCallTravelsAsArgumentsAndAmongTheParametersButTheRelayKeysDoNot) {
    const WebAnswer answer = Serve(Call("&relay_timeout=5&list=[1,\"2\"]&text=\"1\""));
    EXPECT_EQ(answer.CallsOf("AddWebAPIRequest"),
              (std::vector<std::string>{
                  "AddWebAPIRequest(7, ZOVA.Test.Good, 1, session, {\"api\":\"ZOVA.Test.Good\",\"list\":[1,\"2\"],"
                  "\"method\":\"session\",\"text\":\"1\",\"version\":1}, alice)"}));
}

TEST_F(RelayTest, TheParametersOfABodyTravelToo) {
    WebCall call = WebCall::Post("api=ZOVA.Test.Good&version=2&method=success&a=b&relay_zn=7");
    const WebAnswer answer = Serve(call.With("HTTP_COOKIE", "id=admin-sid"));
    EXPECT_EQ(answer.CallsOf("AddWebAPIRequest"),
              (std::vector<std::string>{"AddWebAPIRequest(7, ZOVA.Test.Good, 2, success, {\"a\":\"b\",\"api\":"
                                        "\"ZOVA.Test.Good\",\"method\":\"success\",\"version\":2}, admin)"}));
}

// ---- the number of the peer ----

struct NumberCase {
    const char* name;
    const char* text;
    long number;
};

class PeerNumber : public RelayTest, public ::testing::WithParamInterface<NumberCase> {};

TEST_P(PeerNumber, IsReadAsANumberOf64Bits) {
    platform.peers[GetParam().number] = kAnswer;
    const WebAnswer answer =
        Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=session&relay_zn=" + std::string(GetParam().text))
                  .With("HTTP_COOKIE", "id=alice-sid"));
    const std::vector<std::string> asked = answer.CallsOf("AddWebAPIRequest");
    ASSERT_EQ(asked.size(), 1u);
    EXPECT_EQ(asked[0].substr(0, asked[0].find(',')), "AddWebAPIRequest(" + std::to_string(GetParam().number));
    EXPECT_EQ(answer.bodyText, kAnswer);
}

INSTANTIATE_TEST_SUITE_P(Rows, PeerNumber,
                         ::testing::Values(NumberCase{"Number", "12", 12}, NumberCase{"QuotedText", "\"12\"", 12},
                                           NumberCase{"Highest", "9223372036854775807", 9223372036854775807},
                                           NumberCase{"Lowest", "-9223372036854775808", -9223372036854775807 - 1},
                                           NumberCase{"BeyondTheRange", "9223372036854775808", 0},
                                           NumberCase{"Real", "3.9", 3}, NumberCase{"Word", "peer", 0},
                                           NumberCase{"Empty", "", 0}, NumberCase{"Null", "null", 0},
                                           NumberCase{"Array", "[7]", 0}, NumberCase{"Object", "{}", 0}),
                         [](const auto& row) { return std::string(row.param.name); });

// ---- the time-out ----

struct TimeoutCase {
    const char* name;
    const char* parameter;
    /** 0: none is set. */
    long seconds;
};

class RelayTimeout : public RelayTest, public ::testing::WithParamInterface<TimeoutCase> {};

TEST_P(RelayTimeout, IsSetOnlyIfItIsAboveZeroAndIsNotSent) {
    const WebAnswer answer = Serve(Call(GetParam().parameter));
    const long seconds = GetParam().seconds;
    std::vector<std::string> expected;
    if (seconds > 0) {
        expected.push_back("SetResponseTimeout(" + std::to_string(seconds) + ")");
    }
    EXPECT_EQ(answer.CallsOf("SetResponseTimeout"), expected);
    ASSERT_EQ(answer.CallsOf("AddWebAPIRequest").size(), 1u);
    EXPECT_EQ(answer.CallsOf("AddWebAPIRequest")[0].find("relay"), std::string::npos);
    EXPECT_EQ(answer.bodyText, kAnswer);
}

INSTANTIATE_TEST_SUITE_P(Rows, RelayTimeout,
                         ::testing::Values(TimeoutCase{"Absent", "", 0}, TimeoutCase{"One", "&relay_timeout=1", 1},
                                           TimeoutCase{"Text", "&relay_timeout=\"90\"", 90},
                                           TimeoutCase{"Zero", "&relay_timeout=0", 0},
                                           TimeoutCase{"Negative", "&relay_timeout=-1", 0},
                                           TimeoutCase{"Largest", "&relay_timeout=2147483647", 2147483647},
                                           TimeoutCase{"TooLarge", "&relay_timeout=2147483648", 0},
                                           TimeoutCase{"Word", "&relay_timeout=soon", 0},
                                           TimeoutCase{"Array", "&relay_timeout=[5]", 0}),
                         [](const auto& row) { return std::string(row.param.name); });

// ---- who may, and what ----

TEST_F(RelayTest, TheAPIMustBeKnownHereToo) {
    const std::pair<const char*, int> rows[] = {{"api=ZOVA.Unknown&version=1&method=session", 102},
                                                {"api=ZOVA.Test.Good&version=9&method=session", 104},
                                                {"api=ZOVA.Test.Good&version=1&method=unknown", 103},
                                                {"version=1&method=session", 101}};
    for (const auto& [query, error] : rows) {
        const WebAnswer answer =
            Serve(WebCall::Get(std::string(query) + "&relay_zn=7").With("HTTP_COOKIE", "id=alice-sid"));
        EXPECT_EQ(answer.ErrorCode(), error) << query;
        ExpectNothingAsked(answer);
    }
    ExpectLog(LOG_ERR, "WebAPI ZOVA.Unknown is not valid", "Descriptions.cpp");
}

struct RefusalCase {
    const char* name;
    int result;
    int error;
};

class RelayRefusal : public RelayTest, public ::testing::WithParamInterface<RefusalCase> {};

TEST_P(RelayRefusal, IsTheErrorAloneWithoutAWordForTheWebServerOrALine) {
    platform.sessions["alice-sid"].result = GetParam().result;
    const WebAnswer answer = Serve(Call());
    EXPECT_EQ(answer.ErrorCode(), GetParam().error);
    EXPECT_EQ(answer.Header("x-request-error"), "");
    ExpectNothingAsked(answer);
}

INSTANTIATE_TEST_SUITE_P(Rows, RelayRefusal,
                         ::testing::Values(RefusalCase{"Timeout", -1, 106}, RefusalCase{"Refused", -2, 105},
                                           RefusalCase{"Unknown", -5, 119}, RefusalCase{"TokenFailed", -7, 105},
                                           RefusalCase{"Address", -8, 150}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(RelayTest, WithoutACredentialTheAnswerIs119WhateverTheAuthLevelSays) {
    for (const int level : {0, 1, 2}) {
        Good()["authLevel"] = level;
        Install();
        const WebAnswer answer = Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=session&relay_zn=7"));
        EXPECT_EQ(answer.ErrorCode(), 119) << level;
        EXPECT_EQ(answer.Header("x-request-error"), "") << level;
        ExpectNothingAsked(answer);
    }
}

TEST_F(RelayTest, ALoginIsEnoughAtEveryAuthLevel) {
    for (const int level : {0, 1, 2}) {
        Good()["authLevel"] = level;
        Install();
        EXPECT_EQ(Serve(Call()).bodyText, kAnswer) << level;
    }
}

TEST_F(RelayTest, NeitherAllowUserNorAppPrivIsTestedHere) {
    Good()["allowUser"] = Json::Value(Json::arrayValue);
    Good()["appPriv"] = "ZOVA.App.Nobody";
    Install();
    EXPECT_EQ(Serve(Call()).bodyText, kAnswer);
}

TEST_F(RelayTest, SkipTimeoutOfTheAPIStandsInPlaceOfTheMethodsAllowTimeout) {
    const std::string query = "api=ZOVA.Test.Good&version=1&method=timeout_allowed&relay_zn=7";
    const auto options = [&] {
        const std::vector<std::string> calls =
            Serve(WebCall::Get(query).With("HTTP_COOKIE", "id=alice-sid")).CallsOf("ZovaCgiIsAuthorizedEx");
        return calls.empty() ? "" : calls[0];
    };
    const std::string without = options();
    Good()["skipTimeout"] = true;
    Install();
    const std::string with = options();
    EXPECT_NE(without.find("flags 31, allowTimeout 0"), std::string::npos) << without;
    EXPECT_NE(with.find("flags 31, allowTimeout 1"), std::string::npos) << with;
}

TEST_F(RelayTest, TheUserOfTheGateStandsInTheEnvironmentWhateverStoodThereBefore) {
    const WebAnswer answer = Serve(Call().With("ZOVA_WEBAPI_USERNAME", "admin"));
    ASSERT_EQ(answer.CallsOf("AddWebAPIRequest").size(), 1u);
    const std::string call = answer.CallsOf("AddWebAPIRequest")[0];
    EXPECT_EQ(call.substr(call.rfind(',')), ", alice)");
}

TEST_F(RelayTest, ADeviceTokenRelaysAsItsUserAndOnlyWhatItCovers) {
    platform.deviceTokens["token"] = {"admin", {{"ZOVA.Test.Good", "session"}}};
    const std::string query = "api=ZOVA.Test.Good&version=1&relay_zn=7&tid=token&method=";
    const WebAnswer answer = Serve(WebCall::Get(query + "session"));
    EXPECT_EQ(answer.bodyText, kAnswer);
    const std::string call = answer.CallsOf("AddWebAPIRequest").at(0);
    EXPECT_EQ(call.substr(call.rfind(',')), ", admin)");
    const WebAnswer refused = Serve(WebCall::Get(query + "success"));
    EXPECT_EQ(refused.ErrorCode(), 119);
    ExpectNothingAsked(refused);
}

// ---- failures ----

TEST_F(RelayTest, WhatCannotBeQueuedAnswers109AndLogsNothing) {
    platform.peers.clear();
    const WebAnswer answer = Serve(Call("&relay_timeout=5"));
    EXPECT_EQ(answer.ErrorCode(), 109);
    EXPECT_TRUE(answer.CallsOf("SetResponseTimeout").empty());
    EXPECT_TRUE(answer.CallsOf("CredRequestMgr::Run").empty());
}

TEST_F(RelayTest, AFailedTransportAnswers109AndLogsItsNumber) {
    platform.relayError = 9;
    const WebAnswer answer = Serve(Call(), [](fake::FakePlatform& fakes) { fakes.Fail("CredRequestMgr::Run", EIO); });
    EXPECT_TRUE(answer.wellFormed);
    EXPECT_EQ(answer.ErrorCode(), 109);
    ExpectLog(LOG_ERR, "relay request fail[9]", "Relay.cpp");
}

TEST_F(RelayTest, ABatchAsAWholeIsPassedOnAndAnEntryThatRelaysIsRefusedWith109) {
    platform.files["ZOVA.Entry.Request.lib"] = R"({"ZOVA.Entry.Request": {"lib": "none", "minVersion": 1,
        "maxVersion": 1, "authLevel": 0, "priority": 0, "methods": {"1": ["request"]}}})";
    const std::string batch = R"(&compound=[{"api":"ZOVA.Test.Good","version":1,"method":"session","relay_zn":7}])";
    const std::string query = "api=ZOVA.Entry.Request&version=1&method=request";
    const WebAnswer whole = Serve(WebCall::Get(query + "&relay_zn=7" + batch).With("HTTP_COOKIE", "id=alice-sid"));
    EXPECT_EQ(whole.bodyText, kAnswer);
    const WebAnswer entries = Serve(WebCall::Get(query + batch).With("HTTP_COOKIE", "id=alice-sid"));
    EXPECT_EQ(entries.body["data"]["result"][0]["error"]["code"].asInt(), 109) << entries.bodyText;
    ExpectNothingAsked(entries);
}

// ---- uploads ----

TEST_F(RelayTest, AnUploadsBodyGoesOnWithItsTypeAndLengthAndWithoutParameters) {
    const WebAnswer answer =
        Serve(Upload("api=ZOVA.Test.Good&version=1&method=upload&a=b&relay_zn=7&relay_timeout=9", "the body"));
    EXPECT_EQ(answer.CallsOf("AddRelayRequest"),
              (std::vector<std::string>{
                  "AddRelayRequest(7, ZOVA.Test.Good, 1, upload, {\"Content-Length\":\"8\",\"Content-Type\":"
                  "\"multipart/form-data; boundary=x\"}, the body, alice)"}));
    EXPECT_EQ(answer.CallsOf("SetResponseTimeout"), (std::vector<std::string>{"SetResponseTimeout(9)"}));
    EXPECT_EQ(answer.bodyText, kAnswer);
    EXPECT_EQ(answer.Header("Content-type"), "text/plain; charset=\"UTF-8\"");
    EXPECT_TRUE(answer.CallsOf("ZovaCgiLoadUploadAll").empty()) << "nothing is stored here";
}

TEST_F(RelayTest, AnUploadNamedByItsFirstFieldsSendsTheLengthThatIsLeft) {
    platform.upload.fields = {{"api", "ZOVA.Test.Good"}, {"version", "1"}, {"method", "upload"}};
    platform.upload.readBytes = 60;
    platform.upload.totalBytes = 68;
    const WebAnswer answer = Serve(Upload("relay_zn=7", "the rest"));
    EXPECT_EQ(answer.CallsOf("AddRelayRequest"),
              (std::vector<std::string>{
                  "AddRelayRequest(7, ZOVA.Test.Good, 1, upload, {\"Content-Length\":\"8\",\"Content-Type\":"
                  "\"multipart/form-data; boundary=x\"}, the rest, alice)"}));
}

TEST_F(RelayTest, AnUploadToAMethodThatTakesNoneIsRefusedHere) {
    const WebAnswer answer = Serve(Upload("api=ZOVA.Test.Good&version=1&method=session&relay_zn=7", "body"));
    EXPECT_EQ(answer.ErrorCode(), 115);
    ExpectNothingAsked(answer);
}

TEST_F(RelayTest, AnUploadThatFailsAnswers109AndLeavesNoFile) {
    platform.relayError = 13;
    const WebAnswer answer = Serve(Upload("api=ZOVA.Test.Good&version=1&method=upload&relay_zn=7", "body"),
                                   [](fake::FakePlatform& fakes) { fakes.Fail("CredRequestMgr::Run", EIO); });
    EXPECT_EQ(answer.ErrorCode(), 109);
    EXPECT_TRUE(answer.CallsOf("unlink").empty());
    ExpectLog(LOG_ERR, "relay request fail[13]", "Relay.cpp");
}

}  // namespace
