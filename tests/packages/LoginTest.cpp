#include "../../packages/ZOVA.Core.Session/Login.h"

#include <gtest/gtest.h>

#include "Call.h"
#include "FakeLogin.h"

namespace {

constexpr char kAddress[] = "192.0.2.7";

class Login : public testing::Test {
protected:
    Login() : fake(FakeLogin::Renew()) {
        fake.passwords = {{"alice", "wonderland"}, {"admin", "sesame"}, {"42", "1234"}};
        fake.administrators = {"admin"};
    }

    static Json::Value Init(const std::string& parameters) {
        Json::Value init(Json::objectValue);
        init["environ"]["REQUEST_METHOD"] = "POST";
        init["environ"]["ZOVA_REMOTE_IP"] = kAddress;
        init["postParam"] = Parse(parameters);
        return init;
    }
    static Call LogIn(const std::string& parameters) { return Call(package::Login, Init(parameters)); }

    FakeLogin& fake;
};

TEST_F(Login, OpensASessionBoundToTheClientsAddress) {
    const Call call = LogIn(R"({"account":"alice","passwd":"wonderland"})");
    EXPECT_EQ(call.Body(), R"({"data":{"is_admin":false,"sid":"sid1","user":"alice"},"success":true})");
    ASSERT_EQ(fake.sessions.count("sid1"), 1U);
    EXPECT_EQ(fake.sessions["sid1"].user, "alice");
    EXPECT_EQ(fake.sessions["sid1"].address, kAddress);
    EXPECT_EQ(fake.sessions["sid1"].token, "");
    EXPECT_EQ(fake.checks, std::vector<std::string>{"alice@192.0.2.7"});
}

TEST_F(Login, SaysWhoIsAnAdministrator) {
    EXPECT_EQ(LogIn(R"({"account":"admin","passwd":"sesame"})").Data()["is_admin"], true);
}

TEST_F(Login, SetsAnHttpOnlyStrictSameSiteSessionCookie) {
    const Call call = LogIn(R"({"account":"alice","passwd":"wonderland"})");
    EXPECT_EQ(call.Cookies(), R"(["id=sid1; path=/; SameSite=Strict; httponly"])");
}

TEST_F(Login, SetsASecureCookieWhenTheRequestCameByHttps) {
    Json::Value init = Init(R"({"account":"alice","passwd":"wonderland"})");
    init["environ"]["HTTPS"] = "on";
    const Call call(package::Login, init);
    EXPECT_EQ(call.Cookies(), R"(["id=sid1; path=/; SameSite=Strict; secure; httponly"])");
}

TEST_F(Login, GivesATokenWhenAskedWithCsrf) {
    const Call call = LogIn(R"({"account":"alice","passwd":"wonderland","csrf":true})");
    EXPECT_EQ(call.Data()["token"], "token1");
    EXPECT_EQ(fake.sessions["sid1"].token, "token1");
}

TEST_F(Login, GivesNoTokenForCsrfFalse) {
    const Call call = LogIn(R"({"account":"alice","passwd":"wonderland","csrf":false})");
    EXPECT_FALSE(call.Data().isMember("token"));
}

TEST_F(Login, ReadsThePairsOfADecipheredEnvelope) {
    const Call call = LogIn(R"({"webapi":{"account":"alice","passwd":"wonderland","csrf":true}})");
    EXPECT_EQ(call.Data()["user"], "alice");
    EXPECT_EQ(call.Data()["token"], "token1");
}

TEST_F(Login, PrefersAClearParameterToOneOfTheEnvelope) {
    const Call call = LogIn(R"({"account":"admin","webapi":{"account":"alice","passwd":"sesame"}})");
    EXPECT_EQ(call.Data()["user"], "admin");
}

TEST_F(Login, TakesWholeNumbersAsTheTextOfTheirDigits) {
    EXPECT_EQ(LogIn(R"({"account":42,"passwd":1234})").Data()["user"], "42");
}

TEST_F(Login, OffersNoWayToSkipTheAddressCheck) {
    LogIn(R"({"account":"alice","passwd":"wonderland","skip_check_ip":true})");
    EXPECT_EQ(fake.sessions["sid1"].address, kAddress);
}

TEST_F(Login, AnswersUnknownAccountAndWrongPasswordAlike) {
    const std::string refused = R"({"error":{"code":400},"success":false})";
    EXPECT_EQ(LogIn(R"({"account":"alice","passwd":"x"})").Body(), refused);
    EXPECT_EQ(LogIn(R"({"account":"nobody-here","passwd":"x"})").Body(), refused);
    EXPECT_TRUE(fake.sessions.empty());
}

TEST_F(Login, SetsNoCookieOnRefusal) {
    EXPECT_EQ(LogIn(R"({"account":"alice","passwd":"x"})").Cookies(), "[]");
}

TEST_F(Login, AnswersABlockedAddressWithItsOwnNumber) {
    fake.blockedAddresses = {kAddress};
    EXPECT_EQ(LogIn(R"({"account":"alice","passwd":"wonderland"})").Error(), 407);
}

TEST_F(Login, AnswersAnInternalErrorWhenThePasswordCannotBeChecked) {
    fake.passwordCheckFails = true;
    EXPECT_EQ(LogIn(R"({"account":"alice","passwd":"wonderland"})").Error(), 117);
}

TEST_F(Login, AnswersAnInternalErrorAndSetsNoCookieWhenNoSessionCanBeMade) {
    fake.createFails = true;
    const Call call = LogIn(R"({"account":"alice","passwd":"wonderland"})");
    EXPECT_EQ(call.Error(), 117);
    EXPECT_EQ(call.Cookies(), "[]");
}

class LoginWithEarlierSession : public Login {
protected:
    LoginWithEarlierSession() { fake.sessions["old"] = {"alice", kAddress, "", false}; }

    static Call LogInWithCookie(const std::string& password) {
        Json::Value init = Init(R"({"account":"alice"})");
        init["postParam"]["passwd"] = password;
        init["environ"]["HTTP_COOKIE"] = "id=old";
        return Call(package::Login, init);
    }
};

TEST_F(LoginWithEarlierSession, EndsTheEarlierSession) {
    EXPECT_EQ(LogInWithCookie("wonderland").Error(), 0);
    EXPECT_EQ(fake.sessions.count("old"), 0U);
    EXPECT_EQ(fake.sessions.count("sid1"), 1U);
}

TEST_F(LoginWithEarlierSession, KeepsTheEarlierSessionOnAWrongPassword) {
    EXPECT_EQ(LogInWithCookie("x").Error(), 400);
    EXPECT_EQ(fake.sessions.count("old"), 1U);
}

struct BadLogin {
    const char* name;
    std::string parameters;
    const char* refused;
};

class LoginRefusesParameters : public testing::TestWithParam<BadLogin> {};

TEST_P(LoginRefusesParameters, WithTheParametersName) {
    FakeLogin& fake = FakeLogin::Renew();
    Json::Value init(Json::objectValue);
    init["postParam"] = Parse(GetParam().parameters);
    const Call call(package::Login, init);
    EXPECT_EQ(call.Body(), RefusalOf(GetParam().refused));
    EXPECT_TRUE(fake.checks.empty());
    EXPECT_EQ(call.Cookies(), "[]");
}

std::string Members(const std::string& account, const std::string& password, const std::string& more = "") {
    return R"({"account":)" + account + R"(,"passwd":)" + password + more + "}";
}

std::string Quoted(std::size_t length) {
    return '"' + std::string(length, 'a') + '"';
}

INSTANTIATE_TEST_SUITE_P(
    Rows, LoginRefusesParameters,
    testing::Values(BadLogin{"NothingSent", R"({"x":1})", "account"},
                    BadLogin{"AccountOnly", R"({"account":"alice"})", "passwd"},
                    BadLogin{"PasswordOnly", R"({"passwd":"x"})", "account"},
                    BadLogin{"EmptyAccount", Members(R"("")", R"("x")"), "account"},
                    BadLogin{"EmptyPassword", Members(R"("alice")", R"("")"), "passwd"},
                    BadLogin{"NullAccount", Members("null", R"("x")"), "account"},
                    BadLogin{"NullPassword", Members(R"("alice")", "null"), "passwd"},
                    BadLogin{"AccountIsAnObject", Members("{}", R"("x")"), "account"},
                    BadLogin{"AccountIsAnArray", Members(R"(["alice"])", R"("x")"), "account"},
                    BadLogin{"AccountIsABool", Members("true", R"("x")"), "account"},
                    BadLogin{"PasswordIsAFraction", Members(R"("alice")", "1.5"), "passwd"},
                    BadLogin{"PasswordIsANumberPast64Bits", Members(R"("alice")", "99999999999999999999"), "passwd"},
                    BadLogin{"AccountWithNul", Members(R"("alice\u0000")", R"("x")"), "account"},
                    BadLogin{"AccountWithNewline", Members(R"("alice\n")", R"("x")"), "account"},
                    BadLogin{"PasswordWithNul", Members(R"("alice")", R"("wonderland\u0000x")"), "passwd"},
                    BadLogin{"PasswordWithDelete", Members(R"("alice")", R"("\u007f")"), "passwd"},
                    BadLogin{"AccountTooLong", Members(Quoted(256), R"("x")"), "account"},
                    BadLogin{"PasswordTooLong", Members(R"("alice")", Quoted(512)), "passwd"},
                    BadLogin{"CsrfIsAText", Members(R"("alice")", R"("x")", R"(,"csrf":"true")"), "csrf"},
                    BadLogin{"CsrfIsANumber", Members(R"("alice")", R"("x")", R"(,"csrf":1)"), "csrf"},
                    BadLogin{"EnvelopeIsAText", R"({"webapi":"account=alice"})", "account"},
                    BadLogin{"EnvelopeIsAnArray", R"({"webapi":[{"account":"alice"}]})", "account"},
                    BadLogin{"EnvelopeIsNull", R"({"webapi":null})", "account"},
                    BadLogin{"BadClearAccountBesideAGoodOne",
                             R"({"account":[],"webapi":{"account":"alice","passwd":"x"}})", "account"}),
    [](const testing::TestParamInfo<BadLogin>& row) { return std::string(row.param.name); });

TEST_F(Login, TakesTheLongestAccountAndPassword) {
    fake.passwords[std::string(255, 'a')] = std::string(511, 'a');
    EXPECT_EQ(LogIn(Members(Quoted(255), Quoted(511))).Error(), 0);
}

}  // namespace
