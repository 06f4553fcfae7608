#include <unistd.h>

#include <cerrno>

#include "DeviceTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

using unit::Serve;
using unit::WebAnswer;
using unit::WebCall;

namespace {

constexpr const char* kEcho = "api=ZOVA.Test.Good&version=1&method=echo";

class ParameterIntakeTest : public unit::DeviceTest {
protected:
    /** Parameters beside the three that name the call. */
    static std::string Echoed(const WebAnswer& answer) {
        Json::Value data = Json::member(answer.body, "data");
        for (const char* name : {"api", "version", "method"}) {
            if (data.isObject()) {
                data.removeMember(name);
            }
        }
        return Json::toString(data);
    }

    static WebCall Upload(const std::string& query) {
        return WebCall::Post("--x\r\nContent-Disposition: form-data; name=\"a\"\r\n\r\n1\r\n--x--\r\n")
            .With("CONTENT_TYPE", "multipart/form-data; boundary=x")
            .With("QUERY_STRING", query);
    }
};

// ---- query string ----

TEST_F(ParameterIntakeTest, AGetWithoutAQueryStringHasNoParametersAndSucceeds) {
    setenv("REQUEST_METHOD", "GET", 1);
    unsetenv("QUERY_STRING");
    unit::TestWebEntry entry;
    Json::Value env = unit::J(R"({"REQUEST_METHOD": "GET"})");
    entry.Request()->InitEnv(env);
    Json::Value out(Json::objectValue);
    EXPECT_TRUE(entry.InitParam(out));
    EXPECT_JSON(out, "{}");
}

TEST_F(ParameterIntakeTest, AQueryBecomesTypedParameters) {
    const WebAnswer answer = Serve(WebCall::Get(std::string(kEcho) + "&n=5&t=a+b%21&l=[1,2]&b=true&q=%225%22&e="));
    EXPECT_EQ(Echoed(answer), R"({"b":true,"e":"","l":[1,2],"n":5,"q":"5","t":"a b!"})");
}

TEST_F(ParameterIntakeTest, TheBodyOfAGetIsNotRead) {
    WebCall call = WebCall::Get(std::string(kEcho));
    call.body = "x=1";
    call.environment["CONTENT_LENGTH"] = "3";
    const WebAnswer answer = Serve(call);
    EXPECT_EQ(Echoed(answer), "{}");
    EXPECT_TRUE(answer.CallsOf("fread").empty());
}

TEST_F(ParameterIntakeTest, AQueryThatIsNoTextIs101) {
    unit::TestWebEntry entry;
    Json::Value sections = unit::J(R"({"environ": {"QUERY_STRING": 5}, "private": {}})");
    entry.Request()->Deserialize(sections);
    Json::Value out;
    EXPECT_FALSE(entry.InitGetParam(out));
    EXPECT_EQ(entry.Response()->GetError(), 101);
}

// ---- body ----

TEST_F(ParameterIntakeTest, ABodyIsReadAndItsKeysWinOverTheQuerys) {
    const WebAnswer answer = Serve(
        WebCall::Post("a=2&method=echo").With("QUERY_STRING", "api=ZOVA.Test.Good&version=1&method=nothing&a=1&b=1"));
    EXPECT_EQ(Echoed(answer), R"({"a":2,"b":1})");
}

TEST_F(ParameterIntakeTest, APostWithoutABodyFailsAlsoWithACompleteQuery) {
    WebCall call = WebCall::Post("").With("QUERY_STRING", kEcho);
    EXPECT_EQ(Serve(call).ErrorCode(), 101);
    call.environment.erase("CONTENT_LENGTH");
    EXPECT_EQ(Serve(call).ErrorCode(), 101);
}

TEST_F(ParameterIntakeTest, ABodyIsCutAtItsFirstZeroByte) {
    const WebAnswer answer = Serve(WebCall::Post(std::string(kEcho) + std::string("&a=1\0&b=2", 10)));
    EXPECT_EQ(Echoed(answer), R"({"a":1})");
}

TEST_F(ParameterIntakeTest, AShortBodyIsNoError) {
    const WebAnswer answer = Serve(WebCall::Post(std::string(kEcho) + "&a=1").With("CONTENT_LENGTH", "4000"));
    EXPECT_EQ(Echoed(answer), R"({"a":1})");
}

TEST_F(ParameterIntakeTest, ABodyLongerThanItsLengthIsCut) {
    const std::string body = std::string(kEcho) + "&a=123";
    const WebAnswer answer = Serve(WebCall::Post(body).With("CONTENT_LENGTH", std::to_string(body.size() - 2)));
    EXPECT_EQ(Echoed(answer), R"({"a":1})");
}

TEST_F(ParameterIntakeTest, AfterAPostStandardInputIsAtItsEnd) {
    const WebAnswer answer = Serve(WebCall::Post(kEcho));
    EXPECT_EQ(answer.after["descriptors"]["0"].asString(), "/dev/null");
    EXPECT_EQ(answer.CallsOf("dup2"), (std::vector<std::string>{"dup2(onto 0)"}));
}

TEST_F(ParameterIntakeTest, AStandardInputThatCannotBeClosedIsSkippedSilently) {
    const WebAnswer answer =
        Serve(WebCall::Post(kEcho), [](fake::FakePlatform& fakes) { fakes.Fail("open", EMFILE, 1, 1); });
    EXPECT_EQ(answer.ErrorCode(), 0);
}

TEST_F(ParameterIntakeTest, ABodyThatFindsNoMemoryIs101) {
    const WebAnswer answer =
        Serve(WebCall::Post(kEcho), [](fake::FakePlatform& fakes) { fakes.Fail("calloc", ENOMEM); });
    EXPECT_EQ(answer.ErrorCode(), 101);
}

TEST_F(ParameterIntakeTest, ABodyThatCannotBeParsedIs101) {
    const WebAnswer answer =
        Serve(WebCall::Post(kEcho), [](fake::FakePlatform& fakes) { fakes.Fail("strPairToJsonObj", EINVAL); });
    EXPECT_EQ(answer.ErrorCode(), 101);
}

TEST_F(ParameterIntakeTest, ABodyThatMakesTheJsonLibraryThrowIs101AndLogged) {
    platform.pairsThatThrow = std::string(kEcho) + "&a=1";
    ExpectLog(LOG_ERR, "thrown for \"" + platform.pairsThatThrow + "\"", "ParameterIntake.cpp");
    EXPECT_EQ(Serve(WebCall::Post(platform.pairsThatThrow)).ErrorCode(), 101);
}

TEST_F(ParameterIntakeTest, PostParametersNeedAnObjectOrNothingToFill) {
    unit::TestWebEntry entry;
    entry.Request()->InitEnv(unit::J(R"({"CONTENT_LENGTH": "5"})"));
    for (const char* text : {"[]", "5", "\"x\"", "true"}) {
        Json::Value out = unit::J(text);
        EXPECT_FALSE(entry.InitPostParam(out)) << text;
    }
    entry.Request()->InitEnv(unit::J(R"({"CONTENT_TYPE": "multipart/form-data"})"));
    Json::Value out;
    EXPECT_FALSE(entry.InitPostParam(out));
    EXPECT_EQ(platform.CountOf("fread"), 0);
}

struct LengthCase {
    const char* name;
    const char* length;
    bool read;
};

class ContentLength : public ParameterIntakeTest, public ::testing::WithParamInterface<LengthCase> {};

TEST_P(ContentLength, CountsOnlyAsADecimalNumberThatFits) {
    const LengthCase& row = GetParam();
    const WebAnswer answer = Serve(WebCall::Post(kEcho).With("CONTENT_LENGTH", row.length));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(answer.ErrorCode(), row.read ? 0 : 101);
    EXPECT_EQ(answer.CallsOf("fread").size(), row.read ? 1U : 0U);
}

INSTANTIATE_TEST_SUITE_P(Rows, ContentLength,
                         ::testing::Values(LengthCase{"Exact", "40", true}, LengthCase{"Larger", "1000", true},
                                           LengthCase{"Zero", "0", false}, LengthCase{"Negative", "-40", false},
                                           LengthCase{"Empty", "", false}, LengthCase{"Letters", "forty", false},
                                           LengthCase{"LettersBehind", "40x", false},
                                           LengthCase{"BlankBefore", " 40", false},
                                           LengthCase{"Hexadecimal", "0x28", false}, LengthCase{"Real", "40.0", false},
                                           LengthCase{"JustBeyondInt", "2147483648", false},
                                           LengthCase{"WrapsToFortyIn32Bits", "4294967336", false},
                                           LengthCase{"Beyond64Bits", "99999999999999999999", false},
                                           LengthCase{"WrapsToFortyIn64Bits", "18446744073709551656", false}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(ParameterIntakeTest, TheLargestClaimCostsNoMoreThanTheBody) {
    const WebAnswer answer = Serve(WebCall::Post(kEcho).With("CONTENT_LENGTH", "2147483647"));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(answer.CallsOf("calloc").size(), 1U);
}

// ---- uploads ----

TEST_F(ParameterIntakeTest, AnUploadWithACompleteQueryReadsNothingFromStandardInput) {
    const WebAnswer answer = Serve(Upload("api=ZOVA.Test.Good&version=1&method=success"));
    EXPECT_EQ(answer.ErrorCode(), 115);
    EXPECT_TRUE(answer.CallsOf("fread").empty());
    EXPECT_TRUE(answer.CallsOf("ZovaCgiLoadUploadNumParams").empty());
    EXPECT_EQ(answer.Header("Content-type"), "text/plain; charset=\"UTF-8\"");
    EXPECT_NE(answer.after["descriptors"]["0"].asString(), "/dev/null");
}

TEST_F(ParameterIntakeTest, AnUploadWhoseFirstFieldsCannotBeReadIs101AsPlainText) {
    platform.Fail("ZovaCgiLoadUploadNumParams", EIO);
    const WebAnswer answer = Serve(Upload("api=ZOVA.Test.Good&version=1"));
    EXPECT_EQ(answer.ErrorCode(), 101);
    EXPECT_EQ(answer.Header("Content-type"), "text/plain; charset=\"UTF-8\"");
}

// ---- the two ciphers ----

class CipherTest : public ParameterIntakeTest {
protected:
    CipherTest() {
        platform.cipherAES["key of tok AAA"] = "a=1&b=two";
        platform.cipherAES["key of tok BAD"] = "";
        platform.cipherEnvelopes["EEEEEEEEEEEEEEEEEEEEEEEEEEEEEEEE"] = "c=3";
        platform.cipherEnvelopes["NNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNN"] =
            "__nEkOtReHpIc=tok&__tXeTrEhPiC=AAA";
        platform.cipherLines["LLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLL"] = std::string(kEcho) + "&a=9";
    }

    bool Decipher(const std::string& line) {
        unit::TestWebEntry entry;
        out = Json::Value();
        return entry.DetectAndDecryptParamLine(line, out);
    }

    Json::Value out;
};

TEST_F(CipherTest, AnEncipheredLineIsDecipheredInPlace) {
    const WebAnswer answer = Serve(WebCall::Get("LLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLLL"));
    EXPECT_EQ(Echoed(answer), R"({"a":9})");
}

TEST_F(CipherTest, AnAESPairBecomesThePairsOfItsClearText) {
    EXPECT_TRUE(Decipher("x=1&__nEkOtReHpIc=tok&__tXeTrEhPiC=AAA"));
    EXPECT_JSON(out, R"({"x": 1, "a": 1, "b": "two"})");
    EXPECT_EQ(platform.CallsOf({"ZOVACloudServiceZntokenGenerateToken", "GetDecryptAESString"}),
              (std::vector<std::string>{"ZOVACloudServiceZntokenGenerateToken(tok, 33)",
                                        "GetDecryptAESString(key of tok, AAA)"}));
}

TEST_F(CipherTest, ALoneTokenOrCipherTextPassesThroughAsAParameter) {
    EXPECT_TRUE(Decipher("__nEkOtReHpIc=tok"));
    EXPECT_JSON(out, R"({"__nEkOtReHpIc": "tok"})");
    EXPECT_TRUE(Decipher("__tXeTrEhPiC=AAA"));
    EXPECT_JSON(out, R"({"__tXeTrEhPiC": "AAA"})");
}

TEST_F(CipherTest, AnEmptyCipherTextBesideATokenFailsTheLineAndBothKeysAreGone) {
    EXPECT_FALSE(Decipher("x=1&__nEkOtReHpIc=tok&__tXeTrEhPiC="));
    EXPECT_JSON(out, R"({"x": 1})");
    EXPECT_FALSE(Decipher("__nEkOtReHpIc=&__tXeTrEhPiC=AAA"));
    EXPECT_JSON(out, "{}");
}

TEST_F(CipherTest, AKeyThatCannotBeDerivedOrATextThatCannotBeDecipheredFailsTheLine) {
    EXPECT_FALSE(Decipher("__nEkOtReHpIc=tok&__tXeTrEhPiC=unknown"));
    platform.Fail("ZOVACloudServiceZntokenGenerateToken", EIO);
    EXPECT_FALSE(Decipher("__nEkOtReHpIc=tok&__tXeTrEhPiC=AAA"));
}

TEST_F(CipherTest, AnEnvelopesPairsLandInTheObjectWebapi) {
    EXPECT_TRUE(
        Decipher("webapi={\"__cIpHeRtExT\":\"EEEEEEEEEEEEEEEEEEEEEEEEEEEEEEEE\",\"__cIpHeRtOkEn\":\"t\",\"k\":1}"));
    EXPECT_JSON(out, R"({"webapi": {"k": 1, "c": 3}})");
}

TEST_F(CipherTest, AnEnvelopeMayHoldAnAESPair) {
    EXPECT_TRUE(Decipher("webapi={\"__cIpHeRtExT\":\"NNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNN\"}"));
    EXPECT_JSON(out, R"({"webapi": {"a": 1, "b": "two"}})");
}

TEST_F(CipherTest, AnEnvelopeThatFailsLetsTheCallGoOnWithoutTheTwoKeys) {
    EXPECT_TRUE(Decipher("webapi={\"__cIpHeRtExT\":\"unknown\",\"__cIpHeRtOkEn\":\"t\",\"k\":1}"));
    EXPECT_JSON(out, R"({"webapi": {"k": 1}})");
}

TEST_F(CipherTest, CipherKeysOfAnyTypeAreSurvived) {
    for (const char* line : {"webapi={\"__cIpHeRtExT\":{\"a\":1}}", "webapi={\"__cIpHeRtExT\":null}", "webapi=[1]",
                             "webapi=5", "webapi={\"__cIpHeRtExT\":[[]]}", "webapi=null",
                             "__nEkOtReHpIc={}&__tXeTrEhPiC=[]", "__nEkOtReHpIc=1&__tXeTrEhPiC=2"}) {
        EXPECT_NO_THROW(Decipher(line)) << line;
        for (const char* key : {"__nEkOtReHpIc", "__tXeTrEhPiC"}) {
            EXPECT_FALSE(Json::hasMember(out, key)) << line;
        }
        EXPECT_FALSE(Json::hasMember(Json::member(out, "webapi"), "__cIpHeRtExT")) << line;
    }
}

}  // namespace
