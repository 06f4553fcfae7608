#include <gtest/gtest.h>

#include "../../packages/ZOVA.Core.Token/CreateToken.h"
#include "../../packages/ZOVA.Core.Token/ListTokens.h"
#include "../../packages/ZOVA.Core.Token/PlatformTokens.h"
#include "../../packages/ZOVA.Core.Token/RevokeToken.h"
#include "Call.h"
#include "FakeLogin.h"
#include "FakeTokens.h"

namespace {

constexpr char kAddress[] = "192.0.2.7";
constexpr char kGoodWish[] = R"({"apis":[{"api":"A.B","methods":"*"}],"expires_in":3600})";

Json::Value InitOf(const std::string& user, const std::string& cookie, const std::string& parameters) {
    Json::Value init(Json::objectValue);
    init["session"]["username"] = user;
    init["session"]["isAdmin"] = user == "admin";
    init["environ"]["HTTP_COOKIE"] = cookie;
    init["environ"]["ZOVA_REMOTE_IP"] = kAddress;
    init["postParam"] = Parse(parameters);
    return init;
}

class Token : public testing::Test {
protected:
    Token() : fake(FakeTokens::Renew()) {
        FakeLogin& login = FakeLogin::Renew();
        login.sessions["a"] = {"alice", kAddress, "", false};
        login.sessions["b"] = {"admin", kAddress, "", false};
        login.sessions["secured"] = {"alice", kAddress, "t0ken", false};
        login.sessions["old"] = {"alice", kAddress, "", true};
        login.sessions["elsewhere"] = {"alice", "192.0.2.8", "", false};
    }

    static Call AsAlice(Call::Method method, const std::string& parameters) {
        return Call(method, InitOf("alice", "id=a", parameters));
    }
    static Call AsAdmin(Call::Method method, const std::string& parameters) {
        return Call(method, InitOf("admin", "id=b", parameters));
    }

    FakeTokens& fake;
};

TEST_F(Token, IsMadeForTheCallerAndShownOnce) {
    const Call call = AsAlice(package::CreateToken, R"({"apis":[{"api":"A.B","methods":["get"]}],"expires_in":3600,)"
                                                    R"("label":"my phone"})");
    EXPECT_EQ(call.Body(), R"({"data":{"expires":1000,"id":"id1","token":"token1"},"success":true})");
    EXPECT_EQ(fake.calls,
              std::vector<std::string>{R"(create alice [my phone] 3600 [{"api":"A.B","methods":["get"]}])"});
}

TEST_F(Token, IsNeverMadeForSomebodyElse) {
    AsAdmin(package::CreateToken, R"({"apis":[],"expires_in":60,"user":"alice"})");
    EXPECT_EQ(fake.calls, std::vector<std::string>{"create admin [] 60 []"});
}

TEST_F(Token, ListAndRevokeAreForTheCallersOwn) {
    EXPECT_EQ(AsAlice(package::ListTokens, "{}").Body(), R"({"data":{"tokens":["described"]},"success":true})");
    EXPECT_EQ(AsAlice(package::ListTokens, R"({"user":"alice"})").Error(), 0);
    EXPECT_EQ(AsAlice(package::RevokeToken, R"({"id":"id1"})").Body(), R"({"success":true})");
    EXPECT_EQ(AsAlice(package::ListTokens, R"({"user":"admin"})").Error(), 105);
    EXPECT_EQ(AsAlice(package::RevokeToken, R"({"id":"id1","user":"admin"})").Error(), 105);
    EXPECT_EQ(fake.calls, (std::vector<std::string>{"list alice", "list alice", "revoke alice id1"}));
}

TEST_F(Token, ListAndRevokeAreForAnybodysToAdministrators) {
    EXPECT_EQ(AsAdmin(package::ListTokens, R"({"user":"alice"})").Error(), 0);
    EXPECT_EQ(AsAdmin(package::RevokeToken, R"({"id":"id1","user":"alice"})").Error(), 0);
    EXPECT_EQ(AsAdmin(package::ListTokens, "{}").Error(), 0);
    EXPECT_EQ(fake.calls, (std::vector<std::string>{"list alice", "revoke alice id1", "list admin"}));
}

TEST_F(Token, IsNotManagedWithoutTheLoginSessionOfTheCaller) {
    // Where a token authorised the call, the cookie holds no good session of the user whom the framework found.
    const std::pair<const char*, const char*> rows[] = {{"alice", ""},
                                                        {"alice", "id="},
                                                        {"alice", "id=unknown"},
                                                        {"alice", "id=old"},
                                                        {"alice", "id=secured"},
                                                        {"alice", "id=b"},
                                                        {"alice", "id=elsewhere"},
                                                        {"admin", "id=a"},
                                                        {"", "id=a"},
                                                        {"", ""}};
    for (const auto& [user, cookie] : rows) {
        EXPECT_EQ(Call(package::CreateToken, InitOf(user, cookie, kGoodWish)).Error(), 400) << user << cookie;
        EXPECT_EQ(Call(package::ListTokens, InitOf(user, cookie, "{}")).Error(), 400) << user << cookie;
        EXPECT_EQ(Call(package::RevokeToken, InitOf(user, cookie, R"({"id":"x"})")).Error(), 400) << user << cookie;
    }
    EXPECT_TRUE(fake.calls.empty());
}

TEST_F(Token, IsManagedInASessionThatBringsItsToken) {
    Json::Value init = InitOf("alice", "id=secured", kGoodWish);
    init["environ"]["HTTP_X_ZOVA_TOKEN"] = "t0ken";
    EXPECT_EQ(Call(package::CreateToken, init).Error(), 0);
}

TEST_F(Token, AnswersWhatThePlatformSays) {
    const std::pair<int, std::string> rows[] = {
        {ZOVA_ACCESS_TOKEN_BAD_APIS, RefusalOf("apis")},
        {ZOVA_ACCESS_TOKEN_BAD_LABEL, RefusalOf("label")},
        {ZOVA_ACCESS_TOKEN_BAD_TIME, RefusalOf("expires_in")},
        {ZOVA_ACCESS_TOKEN_NO_USER, R"({"error":{"code":401},"success":false})"},
        {ZOVA_ACCESS_TOKEN_UNKNOWN, R"({"error":{"code":402},"success":false})"},
        {ZOVA_ACCESS_TOKEN_TOO_MANY, R"({"error":{"code":403},"success":false})"},
        {ZOVA_ACCESS_TOKEN_FAILED, R"({"error":{"code":117},"success":false})"},
        {-1, R"({"error":{"code":117},"success":false})"}};
    for (const auto& [result, body] : rows) {
        fake.result = result;
        EXPECT_EQ(AsAlice(package::CreateToken, kGoodWish).Body(), body);
        EXPECT_EQ(AsAlice(package::ListTokens, "{}").Body(), body);
        EXPECT_EQ(AsAlice(package::RevokeToken, R"({"id":"x"})").Body(), body);
    }
}

TEST_F(Token, WithoutATimeIsAskedForWithTheTimeZeroWhichThePlatformRefuses) {
    AsAlice(package::CreateToken, R"({"apis":[]})");
    EXPECT_EQ(fake.calls, std::vector<std::string>{"create alice [] 0 []"});
}

struct BadTokenCall {
    const char* name;
    Call::Method method;
    std::string parameters;
    const char* refused;
};

class TokenRefusesParameters : public testing::TestWithParam<BadTokenCall> {};

TEST_P(TokenRefusesParameters, WithTheParametersName) {
    FakeTokens& fake = FakeTokens::Renew();
    FakeLogin::Renew().sessions["b"] = {"admin", kAddress, "", false};
    EXPECT_EQ(Call(GetParam().method, InitOf("admin", "id=b", GetParam().parameters)).Body(),
              RefusalOf(GetParam().refused));
    EXPECT_TRUE(fake.calls.empty());
}

std::string Wish(const std::string& members) {
    return R"({"apis":[{"api":"A.B","methods":"*"}],)" + members + "}";
}

INSTANTIATE_TEST_SUITE_P(
    Rows, TokenRefusesParameters,
    testing::Values(
        BadTokenCall{"ApisMissing", package::CreateToken, R"({"expires_in":60})", "apis"},
        BadTokenCall{"ApisNull", package::CreateToken, R"({"apis":null,"expires_in":60})", "apis"},
        BadTokenCall{"ApisIsAText", package::CreateToken, R"({"apis":"*","expires_in":60})", "apis"},
        BadTokenCall{"ApisIsAnObject", package::CreateToken, R"({"apis":{"api":"A.B"},"expires_in":60})", "apis"},
        BadTokenCall{"TimeIsAText", package::CreateToken, Wish(R"("expires_in":"60")"), "expires_in"},
        BadTokenCall{"TimeIsAFraction", package::CreateToken, Wish(R"("expires_in":60.5)"), "expires_in"},
        BadTokenCall{"TimeNegative", package::CreateToken, Wish(R"("expires_in":-1)"), "expires_in"},
        BadTokenCall{"TimePast32Bits", package::CreateToken, Wish(R"("expires_in":4294967356)"), "expires_in"},
        BadTokenCall{"TimeNull", package::CreateToken, Wish(R"("expires_in":null)"), "expires_in"},
        BadTokenCall{"LabelIsANumber", package::CreateToken, Wish(R"("expires_in":60,"label":7)"), "label"},
        BadTokenCall{"LabelNull", package::CreateToken, Wish(R"("expires_in":60,"label":null)"), "label"},
        BadTokenCall{"LabelWithNul", package::CreateToken, Wish(R"("expires_in":60,"label":"a\u0000b")"), "label"},
        BadTokenCall{"LabelNotUtf8", package::CreateToken, Wish("\"expires_in\":60,\"label\":\"\xff\""), "label"},
        BadTokenCall{"IdMissing", package::RevokeToken, "{}", "id"},
        BadTokenCall{"IdNull", package::RevokeToken, R"({"id":null})", "id"},
        BadTokenCall{"IdIsANumber", package::RevokeToken, R"({"id":7})", "id"},
        BadTokenCall{"IdWithNul", package::RevokeToken, R"({"id":"a\u0000"})", "id"},
        BadTokenCall{"UserEmpty", package::ListTokens, R"({"user":""})", "user"},
        BadTokenCall{"UserNull", package::ListTokens, R"({"user":null})", "user"},
        BadTokenCall{"UserIsAnArray", package::ListTokens, R"({"user":["alice"]})", "user"},
        BadTokenCall{"UserWithNul", package::ListTokens, R"({"user":"alice\u0000"})", "user"},
        BadTokenCall{"UserTooLong", package::RevokeToken, R"({"id":"x","user":")" + std::string(256, 'a') + R"("})",
                     "user"}),
    [](const testing::TestParamInfo<BadTokenCall>& row) { return std::string(row.param.name); });

}  // namespace
