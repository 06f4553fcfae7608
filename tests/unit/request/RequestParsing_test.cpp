// Cookies, request method and the parts of the URL.

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"

using unit::J;
using ZOVA::APIRequest;

namespace {

class RequestParsingTest : public unit::FrameworkTest {
protected:
    void Set(const std::string& name, const std::string& value) {
        Json::Value env(Json::objectValue);
        env[name] = value;
        request.InitEnv(env);
    }

    const Json::Value& Section(const char* name) const { return request.Serialize()[name]; }

    APIRequest request{Json::Value()};
};

// ---- cookies ----

struct CookieCase {
    const char* name;
    const char* header;
    const char* cookies;
};

class Cookies : public RequestParsingTest, public ::testing::WithParamInterface<CookieCase> {};

TEST_P(Cookies, AreSplitAndDecoded) {
    Set("HTTP_COOKIE", GetParam().header);
    EXPECT_JSON(Section("cookie"), GetParam().cookies);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, Cookies,
    ::testing::Values(CookieCase{"ElementsWithoutEqualsAreSkipped", "a=1;b=x%20y;c", R"({"a": "1", "b": "x y"})"},
                      CookieCase{"BlankAfterTheSeparator", "a=1; b=2", R"({"a": "1", "b": "2"})"},
                      CookieCase{"FirstEqualsCounts", "k=v=w", R"({"k": "v=w"})"},
                      CookieCase{"EmptyName", "=v", R"({"": "v"})"}, CookieCase{"EmptyValue", "a=", R"({"a": ""})"},
                      CookieCase{"ALaterOneWins", "a=1; a=2", R"({"a": "2"})"},
                      CookieCase{"NamesAreNotDecoded", "%61=1", R"({"%61": "1"})"},
                      CookieCase{"BrokenEscape", "a=%zz%4", R"({"a": "%zz%4"})"}, CookieCase{"Nothing", "", "{}"},
                      CookieCase{"OnlySeparators", ";;; ;", "{}"},
                      CookieCase{"NulByteInAValue", "a=x%00y", R"({"a": "x\u0000y"})"}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(RequestParsingTest, ACookieOfTheEmptyNameIsThereAndReadsAsTheDefault) {
    Set("HTTP_COOKIE", "=v");
    EXPECT_TRUE(request.HasCookie(""));
    EXPECT_EQ(request.GetCookie("", "d"), "d");
}

TEST_F(RequestParsingTest, ACookieThatIsGoneFromALaterHeaderStays) {
    Set("HTTP_COOKIE", "a=1; b=1");
    Set("HTTP_COOKIE", "b=2");
    EXPECT_JSON(Section("cookie"), R"({"a": "1", "b": "2"})");
}

TEST_F(RequestParsingTest, CookiesAreReadAgainAlsoWhenTheEnvironmentWasRefused) {
    Json::Value sections = request.Serialize();
    sections["environ"]["HTTP_COOKIE"] = "a=1";
    request.Deserialize(sections);
    EXPECT_FALSE(request.HasCookie("a"));
    request.InitEnv(Json::Value());
    EXPECT_TRUE(request.HasCookie("a"));
}

TEST_F(RequestParsingTest, TenThousandCookiesAreRead) {
    std::string header;
    for (int i = 0; i < 10000; ++i) {
        header.append("c").append(std::to_string(i)).append("=v; ");
    }
    Set("HTTP_COOKIE", header);
    EXPECT_EQ(Section("cookie").size(), 10000U);
}

// ---- method ----

struct MethodCase {
    const char* name;
    const char* text;
    int number;
};

class RequestMethod : public RequestParsingTest, public ::testing::WithParamInterface<MethodCase> {};

TEST_P(RequestMethod, IsComparedExactly) {
    Set("REQUEST_METHOD", GetParam().text);
    EXPECT_EQ(request.GetRequestMethod(), GetParam().number);
}

INSTANTIATE_TEST_SUITE_P(Rows, RequestMethod,
                         ::testing::Values(MethodCase{"Get", "GET", 1}, MethodCase{"Post", "POST", 2},
                                           MethodCase{"Head", "HEAD", 3}, MethodCase{"SmallLetters", "get", 0},
                                           MethodCase{"Put", "PUT", 0}, MethodCase{"Empty", "", 0},
                                           MethodCase{"BlankBehind", "GET ", 0}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(RequestParsingTest, AnUnknownMethodKeepsTheEarlierOne) {
    Set("REQUEST_METHOD", "POST");
    Set("REQUEST_METHOD", "PUT");
    EXPECT_EQ(request.GetRequestMethod(), 2);
}

// ---- URL ----

struct HostCase {
    const char* name;
    const char* host;
    bool secure;
    const char* expectedHost;
    int port;
};

class URLHost : public RequestParsingTest, public ::testing::WithParamInterface<HostCase> {};

TEST_P(URLHost, IsCutIntoHostAndPort) {
    const HostCase& row = GetParam();
    Set("HTTP_HOST", row.host);
    Set("HTTPS", row.secure ? "on" : "");
    EXPECT_EQ(request.GetURLHost("x"), row.expectedHost);
    EXPECT_EQ(request.GetURLPort(-7), row.port);
    EXPECT_EQ(request.GetURLProto("x"), row.secure ? "https" : "http");
}

INSTANTIATE_TEST_SUITE_P(Rows, URLHost,
                         ::testing::Values(HostCase{"PortGiven", "example:5000", true, "example", 5000},
                                           HostCase{"DefaultSecure", "example", true, "example", 443},
                                           HostCase{"DefaultPlain", "example", false, "example", 80},
                                           HostCase{"ColonAtTheEnd", "example:", true, "example", 443},
                                           HostCase{"Literal", "[fe80::1]:5001", false, "[fe80::1]", 5001},
                                           HostCase{"LiteralWithoutPort", "[fe80::1]", false, "[fe80::1]", 80},
                                           HostCase{"LiteralWithoutPortSecure", "[fe80::1]", true, "[fe80::1]", 443},
                                           HostCase{"LiteralColonAtTheEnd", "[fe80::1]:", false, "[fe80::1]", 80},
                                           HostCase{"LiteralTextBetween", "[fe80::1]x:9", false, "[fe80::1]", 9},
                                           HostCase{"LiteralWithoutEnd", "[fe80::1", false, "x", -7},
                                           HostCase{"LiteralWithoutBrackets", "fe80::1", false, "fe80:", 1},
                                           HostCase{"Empty", "", false, "x", -7},
                                           HostCase{"OnlyColon", ":", false, "", 80},
                                           HostCase{"PortOfLetters", "h:http", false, "h", 0},
                                           HostCase{"PortWithLettersBehind", "h:80x", false, "h", 0},
                                           HostCase{"PortTooLarge", "h:99999999999999999999", false, "h", 2147483647},
                                           HostCase{"PortNegative", "h:-5", false, "h", -5}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(RequestParsingTest, ThePortIsKeptAsTheClientSentIt) {
    Set("HTTP_HOST", "h:0080");
    EXPECT_EQ(request.GetURLPort(0), 80);
    EXPECT_EQ(Section("url")["urlPort"].asString(), "0080");
}

struct ProtocolCase {
    const char* name;
    const char* environment;
    const char* protocol;
};

class URLProtocol : public RequestParsingTest, public ::testing::WithParamInterface<ProtocolCase> {};

TEST_P(URLProtocol, IsTakenFromTheServerOrItsProxy) {
    request.InitEnv(J(GetParam().environment));
    EXPECT_EQ(request.GetURLProto("x"), GetParam().protocol);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, URLProtocol,
    ::testing::Values(ProtocolCase{"Nothing", "{}", "http"}, ProtocolCase{"On", R"({"HTTPS": "ON"})", "https"},
                      ProtocolCase{"OnInSmallLetters", R"({"HTTPS": "on"})", "https"},
                      ProtocolCase{"Off", R"({"HTTPS": "off"})", "http"},
                      ProtocolCase{"One", R"({"HTTPS": "1"})", "http"},
                      ProtocolCase{"Proxy", R"({"HTTPS": "off", "HTTP_X_FORWARDED_PROTO": "HTTPS"})", "https"},
                      ProtocolCase{"ProxyList", R"({"HTTP_X_FORWARDED_PROTO": "https, http"})", "http"}),
    [](const auto& row) { return std::string(row.param.name); });

struct PathCase {
    const char* name;
    const char* uri;
    const char* path;
    const char* file;
};

class URLPath : public RequestParsingTest, public ::testing::WithParamInterface<PathCase> {};

TEST_P(URLPath, IsCutAtItsLastSlash) {
    Set("REQUEST_URI", GetParam().uri);
    EXPECT_EQ(request.GetURLPath("x"), GetParam().path);
    EXPECT_EQ(request.GetURLName("x"), GetParam().file);
}

INSTANTIATE_TEST_SUITE_P(Rows, URLPath,
                         ::testing::Values(PathCase{"Query", "/webapi/front.cgi?a=/b", "/webapi/", "front.cgi"},
                                           PathCase{"Root", "/", "/", ""}, PathCase{"Empty", "", "x", "x"},
                                           PathCase{"NoSlash", "front.cgi", "x", "x"},
                                           PathCase{"SlashInQueryOnly", "a?b/c", "x", "x"},
                                           PathCase{"TrailingSlash", "/a/b/", "/a/b/", ""},
                                           PathCase{"TwoQuestions", "/a?b?c", "/", "a"}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(RequestParsingTest, TheURLIsParsedAtTheFirstQuestionAndNeverAgain) {
    Set("HTTP_HOST", "first");
    EXPECT_FALSE(Section("url").isMember("initialized"));
    EXPECT_EQ(request.GetURLHost(""), "first");
    Set("HTTP_HOST", "second");
    EXPECT_EQ(request.GetURLHost(""), "first");
    EXPECT_TRUE(Section("url")["initialized"].asBool());
}

TEST_F(RequestParsingTest, AReceiverKeepsTheSendersViewOfTheURL) {
    Set("HTTP_HOST", "sender");
    request.GetURLHost("");
    Json::Value travelled = request.Serialize();
    travelled["environ"]["HTTP_HOST"] = "receiver";
    APIRequest received{Json::Value()};
    received.Deserialize(travelled);
    EXPECT_EQ(received.GetURLHost(""), "sender");
    Json::Value unasked = J(R"({"environ": {"HTTP_HOST": "receiver"}, "url": {"initialized": null}})");
    received.Deserialize(unasked);
    EXPECT_EQ(received.GetURLHost("x"), "x") << "the presence of the marker counts, not its value";
}

TEST_F(RequestParsingTest, ParsingLogsNothing) {
    Set("HTTP_COOKIE", std::string("\xff;=;%", 5));
    Set("HTTP_HOST", "[[[");
    Set("REQUEST_URI", "\x01");
    request.GetURLHost("");
    EXPECT_TRUE(platform.process.log.empty());
}

}  // namespace
