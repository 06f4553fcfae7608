#include <stdexcept>

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"

using unit::J;
using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

class HttpHeadersTest : public unit::FrameworkTest {
protected:
    HttpHeadersTest() { platform.clock = 0; }

    std::string Cookie(long expire, const std::string& domain = "", bool secure = false, bool httpOnly = false) {
        EXPECT_TRUE(response.AddCookie("id", "a b", "/", expire, domain, secure, httpOnly));
        const Json::Value cookies = response.GetCookies();
        return cookies[cookies.size() - 1].asString();
    }

    void ClientTime(const std::string& value) {
        request.InitParam(J("{\"getParam\": {\"client_time\": " + value + "}}"), true);
    }

    APIRequest request{Json::Value()};
    APIResponse response{&request};
};

// ---- headers ----

TEST_F(HttpHeadersTest, HeadersAreKeptAsSpelled) {
    EXPECT_TRUE(response.SetHeader("Content-Type", "text/plain"));
    EXPECT_TRUE(response.SetHeader("X", "1"));
    EXPECT_TRUE(response.SetHeader("X", "2"));
    EXPECT_FALSE(response.SetHeader("", "x"));
    EXPECT_JSON(response.GetHeaders(), R"({"Content-type": "application/json; charset=\"UTF-8\"",
        "Content-Type": "text/plain", "X": "2"})");
    EXPECT_TRUE(response.HasHeader("X"));
    EXPECT_FALSE(response.HasHeader("x"));
    EXPECT_EQ(response.GetHeader("X", "d"), "2");
    EXPECT_EQ(response.GetHeader("Y", "d"), "d");
    EXPECT_EQ(response.GetHeader("", "d"), "d");
}

TEST_F(HttpHeadersTest, ACookieOfADocumentWithoutThemIsRefusedAndLeavesItAsItIs) {
    Json::Value document = J(R"({"headers": {"X": "1"}})");
    response.Deserialize(document);
    EXPECT_FALSE(response.AddCookie("id", "v", "/", 0, "", false, false));
    EXPECT_JSON(response.Serialize(), R"({"headers": {"X": "1"}})");
}

// ---- status ----

TEST_F(HttpHeadersTest, AResponseWithoutAStatusHas200) {
    EXPECT_EQ(response.GetStatus(), 200);
    EXPECT_EQ(response.GetHeader("Status", "d"), "d");
}

TEST_F(HttpHeadersTest, AStatusIsItsNumberAndItsMessage) {
    EXPECT_TRUE(response.SetStatus(ZOVA::HTTP_STATUS_NOT_FOUND, "missing"));
    EXPECT_EQ(response.GetHeader("Status", "d"), "404");
    EXPECT_EQ(response.GetStatus(), 404);
    EXPECT_JSON(response.Serialize()["option"], R"({"statusMsg": "missing"})");
    EXPECT_TRUE(response.SetStatus(ZOVA::HTTP_STATUS_OK, ""));
    EXPECT_JSON(response.Serialize()["option"], R"({"statusMsg": ""})");
}

TEST_F(HttpHeadersTest, AMessageThatCannotBeStoredLeavesTheHeader) {
    Json::Value document = J(R"({"headers": {}})");
    response.Deserialize(document);
    EXPECT_FALSE(response.SetStatus(ZOVA::HTTP_STATUS_NOT_FOUND, "m"));
    EXPECT_EQ(response.GetStatus(), 404);
}

struct StatusCase {
    const char* name;
    const char* text;
    int status;
};

class StatusText : public HttpHeadersTest, public ::testing::WithParamInterface<StatusCase> {};

TEST_P(StatusText, IsReadFromItsFront) {
    response.SetHeader("Status", GetParam().text);
    EXPECT_EQ(static_cast<int>(response.GetStatus()), GetParam().status);
}

INSTANTIATE_TEST_SUITE_P(Rows, StatusText,
                         ::testing::Values(StatusCase{"Number", "404", 404}, StatusCase{"TextBehind", "404 Not", 404},
                                           StatusCase{"LettersBehind", "404x", 404},
                                           StatusCase{"BlankBefore", " 404", 404}, StatusCase{"Text", "Not found", 0},
                                           StatusCase{"Empty", "", 0}, StatusCase{"Sign", "-", 0},
                                           StatusCase{"Plus", "+204", 204},
                                           StatusCase{"TooLarge", "99999999999999999999", 2147483647}),
                         [](const auto& row) { return std::string(row.param.name); });

// ---- cookies ----

TEST_F(HttpHeadersTest, ASessionCookieIsKeyValueAndPath) {
    EXPECT_EQ(Cookie(0), "id=a%20b; path=/");
}

TEST_F(HttpHeadersTest, AttributesComeInTheirOrder) {
    ClientTime("0");
    EXPECT_EQ(Cookie(60, "example.org", true, true),
              "id=a%20b; path=/; expires=Thu, 01-Jan-1970 01:00:00 GMT; domain=example.org; secure; httponly");
    EXPECT_EQ(Cookie(0, "d", false, true), "id=a%20b; path=/; domain=d; httponly");
    EXPECT_EQ(Cookie(0, "", true, false), "id=a%20b; path=/; secure");
}

TEST_F(HttpHeadersTest, ADeletedCookieHasTheFixedDateAndUsesNoClock) {
    platform.clock = 1700000000;
    EXPECT_EQ(Cookie(-1), "id=a%20b; path=/; expires=Thu, 01-Jan-1970 00:00:01 GMT");
    EXPECT_EQ(platform.CountOf("time"), 0);
    EXPECT_NE(Cookie(1), "");
    EXPECT_EQ(platform.CountOf("time"), 1) << "the clock is seen where it is used";
}

TEST_F(HttpHeadersTest, WithoutClientTimeTheClockCounts) {
    platform.clock = 1700000000;
    EXPECT_EQ(Cookie(1), "id=a%20b; path=/; expires=Tue, 14-Nov-2023 22:14:20 GMT");
}

TEST_F(HttpHeadersTest, AResponseWithoutARequestUsesTheClock) {
    platform.clock = 0;
    APIResponse alone(nullptr);
    EXPECT_TRUE(alone.AddCookie("k", "v", "/", 1, "", false, false));
    EXPECT_EQ(alone.GetCookies()[0].asString(), "k=v; path=/; expires=Thu, 01-Jan-1970 00:01:00 GMT");
}

struct ClientTimeCase {
    const char* name;
    const char* value;
    const char* date;
};

class ClientTimeValue : public HttpHeadersTest, public ::testing::WithParamInterface<ClientTimeCase> {};

TEST_P(ClientTimeValue, IsReadAsANumberAndClamped) {
    platform.clock = 1700000000;
    ClientTime(GetParam().value);
    EXPECT_EQ(Cookie(60), std::string("id=a%20b; path=/; expires=") + GetParam().date);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, ClientTimeValue,
    ::testing::Values(ClientTimeCase{"Zero", "0", "Thu, 01-Jan-1970 01:00:00 GMT"},
                      ClientTimeCase{"Number", "86400", "Fri, 02-Jan-1970 01:00:00 GMT"},
                      ClientTimeCase{"DecimalText", "\"86400\"", "Fri, 02-Jan-1970 01:00:00 GMT"},
                      ClientTimeCase{"Text", "\"now\"", "Thu, 01-Jan-1970 01:00:00 GMT"},
                      ClientTimeCase{"Null", "null", "Thu, 01-Jan-1970 01:00:00 GMT"},
                      ClientTimeCase{"Array", "[5]", "Thu, 01-Jan-1970 01:00:00 GMT"},
                      ClientTimeCase{"Object", "{}", "Thu, 01-Jan-1970 01:00:00 GMT"},
                      ClientTimeCase{"TooLarge", "9223372036854775807", "Fri, 31-Dec-9999 23:59:59 GMT"},
                      ClientTimeCase{"TooLargeUnsigned", "18446744073709551615", "Fri, 31-Dec-9999 23:59:59 GMT"},
                      ClientTimeCase{"TooLargeReal", "1e300", "Fri, 31-Dec-9999 23:59:59 GMT"},
                      ClientTimeCase{"TooLargeText", "\"99999999999999999999\"", "Fri, 31-Dec-9999 23:59:59 GMT"}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(HttpHeadersTest, AnEndlessExpiryIsClamped) {
    platform.clock = 1700000000;
    EXPECT_EQ(Cookie(9223372036854775807L), "id=a%20b; path=/; expires=Fri, 31-Dec-9999 23:59:59 GMT");
}

TEST_F(HttpHeadersTest, CookiesAreNeverReplaced) {
    Cookie(0);
    Cookie(0);
    EXPECT_EQ(response.GetCookies().size(), 2U);
}

TEST_F(HttpHeadersTest, AnEmptyKeyOrPathIsRefusedWithoutALine) {
    EXPECT_FALSE(response.AddCookie("", "v", "/", 0, "", false, false));
    EXPECT_FALSE(response.AddCookie("k", "v", "", 0, "", false, false));
    EXPECT_EQ(response.GetCookies().size(), 0U);
}

TEST_F(HttpHeadersTest, AKeyOfLettersDigitsUnderscoreAndDashIsTaken) {
    EXPECT_TRUE(response.AddCookie("aZ09_-", "v", "/", 0, "", false, false));
}

TEST_F(HttpHeadersTest, AnyOtherKeyIsRefusedWithItsLine) {
    const std::pair<std::string, std::string> keys[] = {{"a.b", "a.b"},
                                                        {"a b", "a b"},
                                                        {"a=b", "a=b"},
                                                        {"a;", "a;"},
                                                        {"a\r\nb", "a??b"},
                                                        {"\xc3\xa4", "??"},
                                                        {std::string("a\0b", 3), "a?b"}};
    for (const auto& [key, shown] : keys) {
        platform.process.log.clear();
        EXPECT_FALSE(response.AddCookie(key, "v", "/", 0, "", false, false)) << shown;
        ASSERT_EQ(platform.process.log.size(), 1U) << shown;
        const fake::LogLine& line = platform.process.log[0];
        EXPECT_EQ(line.priority, LOG_ERR);
        EXPECT_EQ(line.whole.substr(0, 12), "APIResponse(");
        EXPECT_EQ(line.whole.substr(line.whole.find(')')), ")AddCookie: key[" + shown + "] contains invalid character");
    }
    platform.process.log.clear();
    EXPECT_EQ(response.GetCookies().size(), 0U);
}

TEST_F(HttpHeadersTest, AValueIsEncodedWhateverItsBytes) {
    EXPECT_TRUE(response.AddCookie("k", std::string("\r\n;\0\xff=", 6), "/", 0, "", false, false));
    EXPECT_EQ(response.GetCookies()[0].asString(), "k=%0D%0A%3B%00%FF%3D; path=/");
}

// ---- redirect ----

TEST_F(HttpHeadersTest, ARedirectLeadsToTheHostThatTheClientNamed) {
    request.InitEnv(J(R"({"HTTP_HOST": "nas:5001", "HTTPS": "on"})"));
    EXPECT_TRUE(response.Redirect("index.cgi"));
    EXPECT_EQ(response.GetHeader("Location", ""), "https://nas:5001/index.cgi");
    EXPECT_EQ(response.GetStatus(), 302);
    EXPECT_TRUE(response.Redirect("/index.cgi"));
    EXPECT_EQ(response.GetHeader("Location", ""), "https://nas:5001/index.cgi");
}

TEST_F(HttpHeadersTest, ARedirectNeverLeadsToAnotherSite) {
    request.InitEnv(J(R"({"HTTP_HOST": "nas"})"));
    EXPECT_TRUE(response.Redirect("https://evil.example/x"));
    EXPECT_EQ(response.GetHeader("Location", ""), "http://nas/https://evil.example/x");
    EXPECT_TRUE(response.Redirect("//evil.example/x"));
    EXPECT_EQ(response.GetHeader("Location", ""), "http://nas//evil.example/x");
    EXPECT_TRUE(response.Redirect("@evil.example"));
    EXPECT_EQ(response.GetHeader("Location", ""), "http://nas/@evil.example");
}

TEST_F(HttpHeadersTest, WithoutARequestNothingIsRedirected) {
    APIResponse alone(nullptr);
    EXPECT_FALSE(alone.Redirect("/x"));
    EXPECT_FALSE(alone.HasHeader("Location"));
}

TEST_F(HttpHeadersTest, AnEmptyURLIsOutOfRange) {
    EXPECT_THROW(response.Redirect(""), std::out_of_range);
}

TEST_F(HttpHeadersTest, ARedirectThatCannotBeStoredIsFalse) {
    Json::Value document = J(R"({"option": {}})");
    response.Deserialize(document);
    EXPECT_FALSE(response.Redirect("/x"));
    EXPECT_EQ(response.GetStatus(), 200);
}

}  // namespace
