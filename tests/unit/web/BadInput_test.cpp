// Whatever a client sends: a header block, a JSON body, a process that ends by itself, and no file where none belongs.

#include "DeviceTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

using unit::Serve;
using unit::WebAnswer;
using unit::WebCall;

namespace {

class BadInputTest : public unit::DeviceTest {};

std::string Nested(const std::string& open, const std::string& close, int depth) {
    std::string text;
    for (int i = 0; i < depth; ++i) {
        text += open;
    }
    for (int i = 0; i < depth; ++i) {
        text += close;
    }
    return text;
}

/** Percent-encodes every byte. */
std::string Escaped(const std::string& bytes) {
    constexpr char kDigits[] = "0123456789abcdef";
    std::string text;
    for (unsigned char byte : bytes) {
        text += '%';
        text += kDigits[byte >> 4];
        text += kDigits[byte & 15];
    }
    return text;
}

// ---- API names ----

struct NameCase {
    const char* name;
    std::string api;
    std::string logged;
};

void PrintTo(const NameCase& row, std::ostream* out) {
    *out << row.name;
}

class APIName : public BadInputTest, public ::testing::WithParamInterface<NameCase> {};

TEST_P(APIName, ThatMayLeadElsewhereIs102AndTouchesNoFile) {
    const NameCase& row = GetParam();
    const WebAnswer answer = Serve(WebCall::Get("version=1&method=get&api=" + Escaped(row.api)));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(answer.ErrorCode(), 102);
    ExpectLog(LOG_ERR, "WebAPI " + row.logged + " is not valid", "Descriptions.cpp");
    EXPECT_TRUE(answer.CallsOf("QLIBCFileExist").empty());
    EXPECT_EQ(answer.CallsOf("ReadJsonFile").size(), 1U) << "lib.def alone";
    for (const std::string& call : answer.calls) {
        const bool printable = call.compare(0, 8, "openlog(") != 0 || call.find('\n') == std::string::npos;
        EXPECT_TRUE(printable) << call;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Rows, APIName,
    ::testing::Values(NameCase{"Absolute", "/etc/passwd", "/etc/passwd"}, NameCase{"Slash", "ZOVA/Test", "ZOVA/Test"},
                      NameCase{"Parent", "..", ".."}, NameCase{"ParentPath", "../../etc/x", "../../etc/x"},
                      NameCase{"HiddenParent", "ZOVA.../x", "ZOVA.../x"}, NameCase{"Dot", ".", "."},
                      NameCase{"LeadingDot", ".ZOVA.Test", ".ZOVA.Test"},
                      NameCase{"TrailingDot", "ZOVA.Test.", "ZOVA.Test."},
                      NameCase{"EmptyPart", "ZOVA..Test", "ZOVA..Test"},
                      NameCase{"LineFeed", "ZOVA.Test\nforged: line", "ZOVA.Test?forged: line"},
                      NameCase{"Escape", "ZOVA.\x1b[31m", "ZOVA.?[31m"}, NameCase{"Blank", "ZOVA Test", "ZOVA Test"},
                      NameCase{"Percent", "%s%n%m", "%s%n%m"}, NameCase{"Star", "ZOVA.*", "ZOVA.*"},
                      NameCase{"UTF8", "ZOVA.T\xc3\xa4st", "ZOVA.T??st"},
                      NameCase{"Long", std::string(70000, '/'), std::string(512, '/')}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(BadInputTest, AnAPINameWithANulByteIs102AndTouchesNoFile) {
    const WebAnswer answer = Serve(WebCall::Get("version=1&method=get&api=ZOVA.Test%00.Good"));
    EXPECT_EQ(answer.ErrorCode(), 102);
    EXPECT_TRUE(answer.CallsOf("QLIBCFileExist").empty());
    ExpectLog(LOG_ERR, "WebAPI ZOVA.Test?.Good is not valid", "Descriptions.cpp");
}

TEST_F(BadInputTest, NamesForTitleAndThreadArePrintable) {
    const WebAnswer answer = Serve(WebCall::Get("version=1&api=ZOVA.A&method=%0a%1b%25n"));
    ExpectLog(LOG_ERR, "WebAPI ZOVA.A is not valid", "Descriptions.cpp");
    const std::vector<std::string> idents = answer.CallsOf("openlog");
    ASSERT_FALSE(idents.empty());
    EXPECT_NE(idents[0].find("_ZOVA.A_1_??%n, "), std::string::npos) << idents[0];
    EXPECT_EQ(answer.CallsOf("prctl")[0], "prctl(ZOVA.A_1_??%n)");
}

// ---- names of any type ----

struct RequestCase {
    const char* name;
    std::string query;
    int error;
};

void PrintTo(const RequestCase& row, std::ostream* out) {
    *out << row.name;
}

class Query : public BadInputTest, public ::testing::WithParamInterface<RequestCase> {};

TEST_P(Query, IsAnsweredWithAHeaderBlockAndAJsonBody) {
    const RequestCase& row = GetParam();
    for (const WebCall& call : {WebCall::Get(row.query), WebCall::Post(row.query)}) {
        const WebAnswer answer = Serve(call);
        ASSERT_TRUE(answer.child.orderly) << answer.child.end;
        EXPECT_TRUE(answer.wellFormed) << answer.child.output;
        EXPECT_EQ(answer.ErrorCode(), row.error);
        if (row.error == 102) {
            ExpectLog(LOG_ERR, "WebAPI 5 is not valid", "Descriptions.cpp");
        }
    }
}

constexpr const char* kCall = "api=ZOVA.Test.Good&version=1&method=success";

INSTANTIATE_TEST_SUITE_P(
    Rows, Query,
    ::testing::Values(
        RequestCase{"Good", kCall, 0}, RequestCase{"VersionArray", "api=ZOVA.Test.Good&version=[]&method=success", 101},
        RequestCase{"VersionObject", "api=ZOVA.Test.Good&version={}&method=success", 101},
        RequestCase{"VersionNull", "api=ZOVA.Test.Good&version=null&method=success", 101},
        RequestCase{"VersionText", "api=ZOVA.Test.Good&version=one&method=success", 101},
        RequestCase{"VersionQuoted", "api=ZOVA.Test.Good&version=\"1\"&method=success", 0},
        RequestCase{"VersionNegative", "api=ZOVA.Test.Good&version=-1&method=success", 101},
        RequestCase{"VersionBeyondInt", "api=ZOVA.Test.Good&version=4294967297&method=success", 101},
        RequestCase{"VersionBeyond64Bits", "api=ZOVA.Test.Good&version=18446744073709551617&method=success", 101},
        RequestCase{"VersionOfThousandDigits", "api=ZOVA.Test.Good&method=success&version=" + std::string(1000, '9'),
                    101},
        RequestCase{"VersionHugeReal", "api=ZOVA.Test.Good&version=1e308&method=success", 101},
        RequestCase{"APIObject", "api={}&version=1&method=success", 101},
        RequestCase{"APIArray", "api=[\"ZOVA.Test.Good\"]&version=1&method=success", 101},
        RequestCase{"APINull", "api=null&version=1&method=success", 101},
        RequestCase{"APINumber", "api=5&version=1&method=success", 102},
        RequestCase{"MethodObject", "api=ZOVA.Test.Good&version=1&method={}", 101},
        RequestCase{"MethodArray", "api=ZOVA.Test.Good&version=1&method=[]", 101},
        RequestCase{"MethodNull", "api=ZOVA.Test.Good&version=1&method=null", 101},
        RequestCase{"MethodNumber", "api=ZOVA.Test.Good&version=1&method=7", 103},
        RequestCase{"BrokenEscapes", std::string(kCall) + "&a=%&b=%z&c=%4&%=1&%zz=%%%", 0},
        RequestCase{"OnlySeparators", "&&&===&=&&", 101},
        RequestCase{"EveryByte", std::string(kCall) + "&a=" + Escaped(std::string("\x01\x80\xff\xfe\x7f\xc3\x28", 7)),
                    0},
        RequestCase{"Nested256", std::string(kCall) + "&a=" + Nested("[", "]", 256), 0},
        RequestCase{"Nested257", std::string(kCall) + "&a=" + Nested("[", "]", 257), 0},
        RequestCase{"DeepObjects", std::string(kCall) + "&a=" + Nested("{\"a\":", "}", 256), 0},
        RequestCase{"NumberOfThousandDigits", std::string(kCall) + "&a=" + std::string(1000, '7'), 0},
        RequestCase{"CredentialsOfAnyType", std::string(kCall) + "&_sid={}&tid=[]&_sharing_id=1&_sharing_sid=true", 0},
        RequestCase{"CredentialsNull", std::string(kCall) + "&_sid=null", 0},
        RequestCase{"ClientTimeAndRelayNames", std::string(kCall) + "&client_time={}&a[]=1&a.b=2", 0}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(BadInputTest, ABodyNestedAHundredThousandDeepIsText) {
    const std::string nested = Nested("[", "]", 100000);
    const WebAnswer answer = Serve(WebCall::Post("api=ZOVA.Test.Good&version=1&method=echo&a=" + nested));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(answer.body["data"]["a"].asString(), nested);
}

TEST_F(BadInputTest, OneMegabyteOfOneParameterIsServed) {
    const std::string large(1024 * 1024, 'x');
    const WebAnswer answer = Serve(WebCall::Post("api=ZOVA.Test.Good&version=1&method=echo&a=" + large));
    EXPECT_EQ(answer.body["data"]["a"].asString(), large);
}

TEST_F(BadInputTest, AHundredThousandParametersAreServed) {
    std::string body = "api=ZOVA.Test.Good&version=1&method=success";
    for (int i = 0; i < 100000; ++i) {
        body += "&p" + std::to_string(i) + "=1";
    }
    const WebAnswer answer = Serve(WebCall::Post(body));
    EXPECT_EQ(answer.ErrorCode(), 0);
}

TEST_F(BadInputTest, ASessionIdOfAnyFormIsHandedOverAsItIs) {
    Good()["authLevel"] = 1;
    Install();
    for (const std::string& sid : {std::string("../../etc/passwd"), std::string("/"), std::string(65536, 'a'),
                                   std::string("%00"), std::string("%0d%0aX: 1")}) {
        const WebAnswer answer =
            Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=success").With("HTTP_COOKIE", "id=" + sid));
        ASSERT_TRUE(answer.wellFormed) << sid.substr(0, 40);
        EXPECT_NE(answer.ErrorCode(), 0) << sid.substr(0, 40);
        EXPECT_EQ(answer.headers.size(), 7U) << sid.substr(0, 40);
        EXPECT_TRUE(answer.CallsOf("dlopen").empty());
    }
}

TEST_F(BadInputTest, NoSecretOfTheRequestReachesTheLog) {
    ExpectLog(LOG_ERR, "WebAPI ZOVA.None is not valid", "Descriptions.cpp");
    Good()["authLevel"] = 1;
    Install();
    for (const char* query : {"api=ZOVA.None&version=1&method=a&_sid=SECRET&tid=SECRET&passwd=SECRET",
                              "api=ZOVA.Test.Good&version=1&method=success&_sid=SECRET&tid=SECRET"}) {
        const WebAnswer answer = Serve(WebCall::Get(query).With("HTTP_COOKIE", "id=SECRET"));
        EXPECT_NE(answer.ErrorCode(), 0);
        for (const fake::LogLine& line : answer.log) {
            EXPECT_EQ(line.text.find("SECRET"), std::string::npos) << line.text;
        }
        for (const std::string& ident : answer.CallsOf("openlog")) {
            EXPECT_EQ(ident.find("SECRET"), std::string::npos) << ident;
        }
    }
}

}  // namespace
