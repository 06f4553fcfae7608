// Enciphered members of parameters that reach a request as JSON.

#include "FrameworkTest.h"
#include "envelope/APIRequestPrivate.h"
#include "webapi/APIRequest.h"

using unit::J;
using ZOVA::APIRequest;
using ZOVA::APIRequestPrivate;

namespace {

// The fake deciphers in place: no clear text is longer than its cipher text.
constexpr const char* kPairs = "PPPPPPPPPPPPPPPPPPPPPPPPPPPPPPPP";
constexpr const char* kPairsWithAES = "AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA";
constexpr const char* kNothing = "0000";
constexpr const char* kAESAlone = R"("__nEkOtReHpIc": "tok", "__tXeTrEhPiC": "AAA")";

std::string CipherText(const std::string& text) {
    return R"("__cIpHeRtExT": ")" + text + "\"";
}

class ParameterCipherTest : public unit::FrameworkTest {
protected:
    ParameterCipherTest() {
        platform.cipherEnvelopes[kPairs] = "c=3&k=over&t=%22x%22";
        platform.cipherEnvelopes[kPairsWithAES] = "__nEkOtReHpIc=tok&__tXeTrEhPiC=AAA&d=4";
        platform.cipherEnvelopes[kNothing] = "";
        platform.cipherAES["key of tok AAA"] = "a=1&b=two";
    }

    bool Decipher(const std::string& text) {
        params = J("{" + text + "}");
        return APIRequestPrivate::Of(request).DecryptParam(params);
    }

    APIRequest request{Json::Value()};
    Json::Value params;
};

// ---- one object ----

TEST_F(ParameterCipherTest, AnObjectWithoutAnyOfTheKeysIsUnchanged) {
    EXPECT_TRUE(Decipher(R"("api": "A", "version": 1, "l": [1], "webapi": {"k": 1}, "__cIpHeRtOkEn": "t")"));
    EXPECT_JSON(params, R"({"api": "A", "version": 1, "l": [1], "webapi": {"k": 1}, "__cIpHeRtOkEn": "t"})");
    EXPECT_TRUE(platform.calls.empty());
}

TEST_F(ParameterCipherTest, AnEmptyObjectSucceedsAndNothingIsDeciphered) {
    EXPECT_TRUE(Decipher(""));
    EXPECT_JSON(params, "{}");
    EXPECT_TRUE(platform.calls.empty());
}

TEST_F(ParameterCipherTest, ACipherTextGivesItsPairsToTheObjectThatHeldIt) {
    EXPECT_TRUE(Decipher(CipherText(kPairs) + R"(, "k": "under", "o": 1)"));
    EXPECT_JSON(params, R"({"c": 3, "k": "over", "t": "x", "o": 1})");
}

TEST_F(ParameterCipherTest, AnAESPairGivesItsPairsToTheObjectThatHeldIt) {
    EXPECT_TRUE(Decipher(std::string(kAESAlone) + R"(, "a": 0, "o": 1)"));
    EXPECT_JSON(params, R"({"a": 1, "b": "two", "o": 1})");
    EXPECT_EQ(platform.CallsOf({"ZOVACloudServiceZntokenGenerateToken"}),
              (std::vector<std::string>{"ZOVACloudServiceZntokenGenerateToken(tok, 33)"}));
}

TEST_F(ParameterCipherTest, ACipherTextThatHoldsAnAESPairIsDecipheredOnceMoreAtTheSameLevel) {
    EXPECT_TRUE(Decipher(CipherText(kPairsWithAES)));
    EXPECT_JSON(params, R"({"a": 1, "b": "two", "d": 4})");
}

TEST_F(ParameterCipherTest, ATextInAClearTextIsAnAESPairsPartnerOutsideOfIt) {
    platform.cipherEnvelopes["TTTTTTTTTTTTTTTTTTTT"] = "__tXeTrEhPiC=AAA";
    EXPECT_TRUE(Decipher(CipherText("TTTTTTTTTTTTTTTTTTTT") + R"(, "__nEkOtReHpIc": "tok")"));
    EXPECT_JSON(params, R"({"a": 1, "b": "two"})");
}

TEST_F(ParameterCipherTest, ACipherTextOutOfACipherTextStaysAsAParameter) {
    platform.cipherEnvelopes["NNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNN"] =
        "__cIpHeRtExT=PPPPPPPPPPPPPPPPPPPPPPPPPPPPPPPP";
    EXPECT_TRUE(Decipher(CipherText("NNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNNN")));
    EXPECT_JSON(params, "{" + CipherText(kPairs) + "}");
    EXPECT_EQ(platform.CountOf("ZovaCgiDecryptParam"), 1);
}

TEST_F(ParameterCipherTest, ACipherTextOfNothingLeavesNothingAndSucceeds) {
    EXPECT_TRUE(Decipher(CipherText(kNothing)));
    EXPECT_JSON(params, "{}");
}

TEST_F(ParameterCipherTest, TheEnvelopesTokenStaysAsAnOrdinaryParameter) {
    EXPECT_TRUE(Decipher(R"("webapi": {)" + CipherText(kPairs) + R"(, "__cIpHeRtOkEn": "t"}, "__cIpHeRtOkEn": "u")"));
    EXPECT_JSON(params, R"({"webapi": {"c": 3, "k": "over", "t": "x", "__cIpHeRtOkEn": "t"}, "__cIpHeRtOkEn": "u"})");
}

TEST_F(ParameterCipherTest, ALoneCipherTextOrTokenOfAESStaysAsAParameter) {
    EXPECT_TRUE(Decipher(R"("__tXeTrEhPiC": "AAA")"));
    EXPECT_JSON(params, R"({"__tXeTrEhPiC": "AAA"})");
    EXPECT_TRUE(Decipher(R"("__nEkOtReHpIc": "tok")"));
    EXPECT_JSON(params, R"({"__nEkOtReHpIc": "tok"})");
}

// ---- failures ----

TEST_F(ParameterCipherTest, ACipherTextThatCannotBeDecipheredIsGoneAndTheOtherMembersStay) {
    EXPECT_FALSE(
        Decipher(CipherText("unknown") + ", " + kAESAlone + R"(, "o": 1, "webapi": {)" + CipherText(kPairs) + "}"));
    EXPECT_JSON(params, R"({"o": 1, "webapi": {)" + CipherText(kPairs) + "}, " + kAESAlone + "}");
}

TEST_F(ParameterCipherTest, AClearTextThatCannotBeParsedFails) {
    platform.Fail("strPairToJsonObj", EINVAL);
    EXPECT_FALSE(Decipher(CipherText(kPairs) + R"(, "o": 1)"));
    EXPECT_JSON(params, R"({"o": 1})");
}

TEST_F(ParameterCipherTest, AnAESPairThatCannotBeDecipheredIsGoneAndFailsBeforeTheEnvelopeInside) {
    for (const char* pair :
         {R"("__nEkOtReHpIc": "tok", "__tXeTrEhPiC": "unknown")", R"("__nEkOtReHpIc": "", "__tXeTrEhPiC": "AAA")",
          R"("__nEkOtReHpIc": "tok", "__tXeTrEhPiC": "")"}) {
        EXPECT_FALSE(Decipher(std::string(pair) + R"(, "webapi": {)" + CipherText(kPairs) + "}")) << pair;
        EXPECT_JSON(params, R"({"webapi": {)" + CipherText(kPairs) + "}}");
    }
    platform.Fail("ZOVACloudServiceZntokenGenerateToken", EIO);
    EXPECT_FALSE(Decipher(kAESAlone));
    EXPECT_JSON(params, "{}");
}

TEST_F(ParameterCipherTest, TheAESStepAloneTouchesNeitherCipherTextNorEnvelope) {
    params = J("{" + CipherText(kPairs) + ", " + kAESAlone + R"(, "webapi": {)" + CipherText(kPairs) + "}}");
    EXPECT_TRUE(APIRequestPrivate::Of(request).DecryptAESParam(params));
    EXPECT_JSON(params, "{" + CipherText(kPairs) + R"(, "a": 1, "b": "two", "webapi": {)" + CipherText(kPairs) + "}}");
}

// ---- the envelope inside, and inside of that ----

TEST_F(ParameterCipherTest, EveryNestedEnvelopeIsDecipheredWhereItStands) {
    EXPECT_TRUE(Decipher(R"("webapi": {)" + CipherText(kPairsWithAES) + R"(, "webapi": {)" + CipherText(kPairs) +
                         R"(, "webapi": {)" + kAESAlone + "}}}"));
    EXPECT_JSON(params, R"({"webapi": {"a": 1, "b": "two", "d": 4,
                            "webapi": {"c": 3, "k": "over", "t": "x", "webapi": {"a": 1, "b": "two"}}}})");
}

TEST_F(ParameterCipherTest, AnEnvelopeThatAClearTextBringsIsDecipheredToo) {
    platform.cipherEnvelopes["WWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWW"] =
        R"(webapi={"__cIpHeRtExT":"PPPPPPPPPPPPPPPPPPPPPPPPPPPPPPPP"})";
    EXPECT_TRUE(Decipher(CipherText("WWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWWW")));
    EXPECT_JSON(params, R"({"webapi": {"c": 3, "k": "over", "t": "x"}})");
}

TEST_F(ParameterCipherTest, AFailureInsideTheEnvelopeFailsTheWholeButKeepsWhatWasDeciphered) {
    EXPECT_FALSE(Decipher(CipherText(kPairs) + R"(, "webapi": {)" + CipherText("unknown") + R"(, "o": 1})"));
    EXPECT_JSON(params, R"({"c": 3, "k": "over", "t": "x", "webapi": {"o": 1}})");
}

TEST_F(ParameterCipherTest, AnEnvelopeThatIsNoObjectHoldsNothingAndSucceeds) {
    for (const char* value : {"null", "5", "true", "1.5", "\"__cIpHeRtExT\"", "[]", R"([{"__cIpHeRtExT": "x"}])"}) {
        EXPECT_TRUE(Decipher(std::string(R"("webapi": )") + value)) << value;
        EXPECT_JSON(params, std::string(R"({"webapi": )") + value + "}");
    }
    EXPECT_TRUE(platform.calls.empty());
}

TEST_F(ParameterCipherTest, ParametersThatAreNoObjectHoldNothingAndSucceed) {
    for (const char* value : {"null", "5", "\"x\"", "[1]"}) {
        params = J(value);
        EXPECT_TRUE(APIRequestPrivate::Of(request).DecryptParam(params)) << value;
        EXPECT_JSON(params, value);
    }
}

TEST_F(ParameterCipherTest, CipherKeysThatAreNoTextFailAndAreGone) {
    for (const char* value : {"null", "{}", "[]", R"({"a": 1})", "5", "false", "\"\"", R"("PPPP\u0000x")"}) {
        EXPECT_FALSE(Decipher(R"("o": 1, "__cIpHeRtExT": )" + std::string(value))) << value;
        EXPECT_JSON(params, R"({"o": 1})");
        EXPECT_FALSE(Decipher(R"("o": 1, "__nEkOtReHpIc": "tok", "__tXeTrEhPiC": )" + std::string(value))) << value;
        EXPECT_JSON(params, R"({"o": 1})");
    }
}

Json::Value NestedEnvelopes(int levels, const Json::Value& innermost) {
    Json::Value object = innermost;
    for (int level = 0; level < levels; ++level) {
        Json::Value around(Json::objectValue);
        around["webapi"].swap(object);
        object.swap(around);
    }
    return object;
}

TEST_F(ParameterCipherTest, EnvelopesAreFoundAsDeepAsADocumentNests) {
    params = NestedEnvelopes(Json::kMaximumDepth, J("{" + CipherText(kPairs) + "}"));
    EXPECT_TRUE(APIRequestPrivate::Of(request).DecryptParam(params));
    const Json::Value expected = NestedEnvelopes(Json::kMaximumDepth, J(R"({"c": 3, "k": "over", "t": "x"})"));
    EXPECT_EQ(Json::toString(params), Json::toString(expected));
}

TEST_F(ParameterCipherTest, EnvelopesNestedDeeperThanADocumentFail) {
    params = NestedEnvelopes(Json::kMaximumDepth + 1, J("{" + CipherText(kPairs) + "}"));
    const Json::Value before = params;
    EXPECT_FALSE(APIRequestPrivate::Of(request).DecryptParam(params));
    EXPECT_EQ(Json::toString(params), Json::toString(before));
    EXPECT_TRUE(platform.calls.empty());
}

TEST_F(ParameterCipherTest, AClearTextCannotBringEnvelopesDeeperThanADocument) {
    const std::string cipherText(100, 'W');
    platform.cipherEnvelopes[cipherText] = R"(webapi={"__cIpHeRtExT":"PPPPPPPPPPPPPPPPPPPPPPPPPPPPPPPP"})";
    params = NestedEnvelopes(Json::kMaximumDepth, J("{" + CipherText(cipherText) + "}"));
    EXPECT_FALSE(APIRequestPrivate::Of(request).DecryptParam(params));
    EXPECT_EQ(platform.CountOf("ZovaCgiDecryptParam"), 1);
}

// ---- as a request takes them in ----

TEST_F(ParameterCipherTest, ARequestDeciphersBothSourcesAndLeavesTheCallersCopyAlone) {
    const Json::Value init =
        J(R"({"getParam": {)" + CipherText(kPairs) + R"(, "g": 1}, "postParam": {)" + kAESAlone + R"(, "k": "post"}})");
    const Json::Value before = init;
    request.InitParam(init, false);
    EXPECT_JSON(request.GetParam("", Json::Value()), R"({"c": 3, "k": "post", "t": "x", "g": 1, "a": 1, "b": "two"})");
    EXPECT_EQ(init, before);
}

TEST_F(ParameterCipherTest, ACallNamedInACipherTextIsTheCall) {
    const std::string line = "api=ZOVA.Test.Good&version=2&method=get";
    const std::string cipherText(line.size(), 'C');
    platform.cipherEnvelopes[cipherText] = line;
    request.InitParam(J(R"({"postParam": {"api": "Other", )" + CipherText(cipherText) + "}}"), false);
    EXPECT_EQ(request.GetAPIClass(), "ZOVA.Test.Good");
    EXPECT_EQ(request.GetAPIVersion(), 2);
    EXPECT_EQ(request.GetAPIMethod(), "get");
}

TEST_F(ParameterCipherTest, AFailureIsIgnoredAndWhatIsLeftBecomesParameters) {
    request.InitParam(J(R"({"getParam": {"g": 1, )" + CipherText("unknown") +
                        R"(}, "postParam": {"p": 2, "webapi": {)" + CipherText("unknown") + R"(, "w": 3}}})"),
                      false);
    EXPECT_JSON(request.GetParam("", Json::Value()), R"({"g": 1, "p": 2, "webapi": {"w": 3}})");
}

}  // namespace
