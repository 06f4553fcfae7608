#include <gtest/gtest.h>

#include <string>

#include "../../packages/ZOVA.Core.OAuth.Scope/ScopeMethods.h"
#include "Call.h"
#include "OwnDeviceFolder.h"

namespace {

constexpr char kFile[] = "oauth-scopes.json";
const std::string kUsers = R"({"apis":[{"params":["api=ZOVA.Core.User&method=get&version=1"]}],"id":"users"})";

Call Get() {
    return Call(package::GetScopes, Json::Value(Json::objectValue));
}

Call SetValue(const Json::Value& scopes) {
    Json::Value init(Json::objectValue);
    init["session"]["username"] = "admin";
    init["postParam"]["scope"] = scopes;
    return Call(package::SetScopes, init);
}

Call Set(const std::string& scopes) {
    return SetValue(Parse(scopes));
}

std::string Refusal(int record, const std::string& member, const std::string& reason) {
    return R"({"error":{"code":401,"errors":{)" + (member.empty() ? "" : R"("member":")" + member + R"(",)") +
           R"("reason":")" + reason + R"(","record":)" + std::to_string(record) + R"(}},"success":false})";
}

class OAuthScopes : public testing::Test {
protected:
    OwnDeviceFolder folder;
};

TEST_F(OAuthScopes, AreNoneBeforeTheyAreSet) {
    EXPECT_EQ(Get().Body(), R"({"data":{"scope":[]},"success":true})");
}

TEST_F(OAuthScopes, AreAnsweredAsTheyWereSet) {
    EXPECT_EQ(Set("[" + kUsers + R"(,{"id":"openid","apis":[]}])").Body(), R"({"success":true})");
    EXPECT_EQ(Get().Body(), R"({"data":{"scope":[)" + kUsers + R"(,{"apis":[],"id":"openid"}]},"success":true})");
}

TEST_F(OAuthScopes, StayAsTheyWereWhenOneOfTheNewOnesIsRefused) {
    ASSERT_EQ(Set("[" + kUsers + "]").Error(), 0);
    const std::string before = folder.Content(kFile);
    EXPECT_EQ(Set("[" + kUsers + R"(,{"id":"broken"}])").Body(), Refusal(1, "apis", "missing"));
    EXPECT_EQ(folder.Content(kFile), before);
}

TEST_F(OAuthScopes, AreAnErrorAndNoEmptyListWhenTheFileCannotBeUsed) {
    folder.Put(kFile, R"({"scope":[]})");
    EXPECT_EQ(Get().Body(), R"({"error":{"code":402},"success":false})");
}

TEST_F(OAuthScopes, HaveAnIdOnceOnly) {
    EXPECT_EQ(Set("[" + kUsers + R"(,{"id":"other","apis":[]},)" + kUsers + "]").Body(), Refusal(2, "id", "twice"));
    EXPECT_EQ(Set("[" + kUsers + R"(,{"id":"Users","apis":[]}])").Error(), 0);
}

TEST_F(OAuthScopes, Are256AtMost) {
    Json::Value scopes(Json::arrayValue);
    for (int number = 0; number < 256; ++number) {
        scopes.append(Parse(R"({"apis":[],"id":"scope)" + std::to_string(number) + R"("})"));
    }
    EXPECT_EQ(SetValue(scopes).Error(), 0);
    scopes.append(Parse(R"({"apis":[],"id":"one-more"})"));
    EXPECT_EQ(SetValue(scopes).Body(), RefusalOf("scope"));
}

TEST_F(OAuthScopes, AreSetByAnArrayOnly) {
    for (const std::string value : {"null", "{}", "\"[]\"", "7"}) {
        EXPECT_EQ(Set(value).Body(), RefusalOf("scope")) << value;
    }
    EXPECT_EQ(Call(package::SetScopes, Json::Value(Json::objectValue)).Body(), RefusalOf("scope"));
}

TEST_F(OAuthScopes, AreRefusedAsAWholeWhereARecordIsNoObject) {
    for (const std::string record : {"null", "[]", "\"users\"", "7"}) {
        EXPECT_EQ(Set("[" + record + "]").Body(), Refusal(0, "", "type")) << record;
    }
}

struct FilterRow {
    const char* name;
    std::string line;
    const char* reason;
};

std::string NameOf(const testing::TestParamInfo<FilterRow>& row) {
    return row.param.name;
}

Json::Value ScopeWith(const Json::Value& filter) {
    Json::Value scopes = Parse("[" + kUsers + "]");
    scopes[0]["apis"][0]["params"].append(filter);
    return scopes;
}

class GoodFilter : public testing::TestWithParam<FilterRow> {};

TEST_P(GoodFilter, IsTaken) {
    const OwnDeviceFolder folder;
    const Json::Value scopes = ScopeWith(GetParam().line);
    EXPECT_EQ(SetValue(scopes).Body(), R"({"success":true})");
    EXPECT_EQ(Get().Data()["scope"], scopes);
}

INSTANTIATE_TEST_SUITE_P(Rows, GoodFilter,
                         testing::Values(FilterRow{"PrefixOnly", "api=ZOVA.Core.", nullptr},
                                         FilterRow{"MethodOnly", "method=get", nullptr},
                                         FilterRow{"AnyParameter", "name=&limit=[1,2]&x", nullptr},
                                         FilterRow{"ApiQuoted", R"(api="7")", nullptr},
                                         FilterRow{"ManyVersionsLater", "version=2147483647", nullptr},
                                         FilterRow{"PercentSignsAreKept", "api=A%20B", nullptr},
                                         FilterRow{"LaterPairWins", "version=x&version=1", nullptr},
                                         FilterRow{"AsLongAsItMayBe", "a=" + std::string(4094, 'b'), nullptr}),
                         NameOf);

class BadFilter : public testing::TestWithParam<FilterRow> {};

TEST_P(BadFilter, IsRefusedByItsPlaceAndNothingIsWritten) {
    const OwnDeviceFolder folder;
    EXPECT_EQ(SetValue(ScopeWith(GetParam().line)).Body(), Refusal(0, "apis[0].params[1]", GetParam().reason));
    EXPECT_EQ(Get().Body(), R"({"data":{"scope":[]},"success":true})");
}

INSTANTIATE_TEST_SUITE_P(
    Rows, BadFilter,
    testing::Values(
        FilterRow{"Empty", "", "pairs"}, FilterRow{"OnlySeparators", "&&", "pairs"},
        FilterRow{"VersionIsText", R"(version="1")", "value"},
        FilterRow{"VersionPercentEncoded", "version=%31", "value"},
        FilterRow{"VersionHasABlank", "version= 1", "value"}, FilterRow{"VersionEmpty", "version=", "value"},
        FilterRow{"VersionZero", "version=0", "value"}, FilterRow{"VersionNegative", "version=-1", "value"},
        FilterRow{"VersionIsAFraction", "version=1.5", "value"},
        FilterRow{"VersionPast32Bits", "version=4294967297", "value"},
        FilterRow{"VersionIsTrue", "version=true", "value"}, FilterRow{"MethodIsANumber", "method=7", "value"},
        FilterRow{"MethodEmpty", "api=A&method=", "value"}, FilterRow{"ApiIsTrue", "api=true", "value"},
        FilterRow{"ApiIsAnArray", R"(api=["A"])", "value"}, FilterRow{"ApiEmptyWouldOpenAll", "api=", "value"},
        FilterRow{"ApiWithoutAnEqualsSign", "api", "value"}, FilterRow{"WithALineEnd", "api=A\nmethod=b", "characters"},
        FilterRow{"WithNul", std::string("api=A\0B", 7), "characters"},
        FilterRow{"TooLong", "a=" + std::string(4095, 'b'), "length"}),
    NameOf);

struct ScopeRow {
    const char* name;
    std::string record;
    const char* member;
    const char* reason;
};

class BadOAuthScope : public testing::TestWithParam<ScopeRow> {};

TEST_P(BadOAuthScope, IsRefusedByMemberAndReasonAndNothingIsWritten) {
    const OwnDeviceFolder folder;
    const ScopeRow& row = GetParam();
    EXPECT_EQ(Set("[" + row.record + "]").Body(), Refusal(0, row.member, row.reason));
    EXPECT_EQ(Get().Body(), R"({"data":{"scope":[]},"success":true})");
}

INSTANTIATE_TEST_SUITE_P(
    Rows, BadOAuthScope,
    testing::Values(
        ScopeRow{"IdMissing", R"({"apis":[]})", "id", "missing"},
        ScopeRow{"IdIsANumber", R"({"id":7,"apis":[]})", "id", "type"},
        ScopeRow{"IdNull", R"({"id":null,"apis":[]})", "id", "type"},
        ScopeRow{"IdEmpty", R"({"id":"","apis":[]})", "id", "length"},
        ScopeRow{"IdTooLong", R"({"id":")" + std::string(256, 'a') + R"(","apis":[]})", "id", "length"},
        ScopeRow{"IdOfTwoWords", R"({"id":"a b","apis":[]})", "id", "characters"},
        ScopeRow{"IdWithBlankBehind", R"({"id":"a ","apis":[]})", "id", "characters"},
        ScopeRow{"IdWithTab", R"({"id":"a\tb","apis":[]})", "id", "characters"},
        ScopeRow{"IdWithNul", R"({"id":"a\u0000","apis":[]})", "id", "characters"},
        ScopeRow{"IdWithBrokenText", "{\"id\":\"\xFF\",\"apis\":[]}", "id", "characters"},
        ScopeRow{"ApisMissing", R"({"id":"a"})", "apis", "missing"},
        ScopeRow{"ApisIsAnObject", R"({"id":"a","apis":{}})", "apis", "type"},
        ScopeRow{"ApisNull", R"({"id":"a","apis":null})", "apis", "type"},
        ScopeRow{"ApiIsAText", R"({"id":"a","apis":["api=A"]})", "apis[0]", "type"},
        ScopeRow{"ApiWithoutParams", R"({"id":"a","apis":[{"endpoint":""}]})", "apis[0].params", "missing"},
        ScopeRow{"ParamsIsAText", R"({"id":"a","apis":[{"params":"api=A"}]})", "apis[0].params", "type"},
        ScopeRow{"ParamsEmpty", R"({"id":"a","apis":[{"params":[]}]})", "apis[0].params", "length"},
        ScopeRow{"FilterIsAnObject", R"({"id":"a","apis":[{"params":[{"api":"A"}]}]})", "apis[0].params[0]", "type"},
        ScopeRow{"FilterNull", R"({"id":"a","apis":[{"params":["api=A",null]}]})", "apis[0].params[1]", "type"},
        ScopeRow{"FilterOfTheSecondApi", R"({"id":"a","apis":[{"params":["api=A"]},{"params":[""]}]})",
                 "apis[1].params[0]", "pairs"},
        ScopeRow{"EndpointIsANumber", R"({"id":"a","apis":[{"params":["api=A"],"endpoint":7}]})", "apis[0].endpoint",
                 "type"},
        ScopeRow{"EndpointWithALineEnd", R"({"id":"a","apis":[{"params":["api=A"],"endpoint":"a\nb"}]})",
                 "apis[0].endpoint", "characters"},
        ScopeRow{"UnknownMemberOfAnApi", R"({"id":"a","apis":[{"param":["api=A"]}]})", "apis[0].param", "unknown"},
        ScopeRow{"UnknownMember", R"({"id":"a","apis":[],"name":"A"})", "name", "unknown"}),
    [](const testing::TestParamInfo<ScopeRow>& row) { return std::string(row.param.name); });

TEST_F(OAuthScopes, MayNameAnotherEndpoint) {
    EXPECT_EQ(Set(R"([{"id":"a","apis":[{"endpoint":"photos/","params":["album=7"]}]}])").Error(), 0);
}

}  // namespace
