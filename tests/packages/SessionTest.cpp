#include <gtest/gtest.h>

#include "../../packages/ZOVA.Core.Session/Cipher.h"
#include "../../packages/ZOVA.Core.Session/Get.h"
#include "../../packages/ZOVA.Core.Session/Logout.h"
#include "Call.h"
#include "FakeLogin.h"

namespace {

constexpr char kAddress[] = "192.0.2.7";
constexpr char kForgottenCookie[] =
    R"(["id=; path=/; SameSite=Strict; expires=Thu, 01-Jan-1970 00:00:01 GMT; httponly"])";

class Session : public testing::Test {
protected:
    Session() : fake(FakeLogin::Renew()) {
        fake.sessions["abc"] = {"alice", kAddress, "", false};
        fake.sessions["withtoken"] = {"admin", kAddress, "t0ken", false};
        fake.sessions["old"] = {"alice", kAddress, "", true};
        fake.administrators = {"admin"};
    }

    static Json::Value Init(const std::string& cookie, const std::string& address = kAddress) {
        Json::Value init(Json::objectValue);
        init["environ"]["HTTP_COOKIE"] = cookie;
        init["environ"]["ZOVA_REMOTE_IP"] = address;
        return init;
    }

    FakeLogin& fake;
};

TEST_F(Session, GetSaysWhoIsLoggedInAndNothingSecret) {
    const Call call(package::Get, Init("id=abc"));
    EXPECT_EQ(call.Body(), R"({"data":{"is_admin":false,"user":"alice"},"success":true})");
    EXPECT_EQ(call.ServerError(), "");
}

TEST_F(Session, GetTakesTheTokenFromItsHeader) {
    Json::Value init = Init("id=withtoken");
    init["environ"]["HTTP_X_ZOVA_TOKEN"] = "t0ken";
    const Call call(package::Get, init);
    EXPECT_EQ(call.Body(), R"({"data":{"is_admin":true,"user":"admin"},"success":true})");
}

TEST_F(Session, LogoutEndsTheSessionAndDeletesTheCookie) {
    const Call call(package::Logout, Init("id=abc"));
    EXPECT_EQ(call.Body(), R"({"success":true})");
    EXPECT_EQ(call.Cookies(), kForgottenCookie);
    EXPECT_EQ(fake.sessions.count("abc"), 0U);
    EXPECT_EQ(fake.sessions.size(), 2U);
}

TEST_F(Session, LogoutSucceedsWithoutASession) {
    for (const char* cookie : {"", "id=unknown", "id=", "id=..%2f..%2fetc%2fpasswd"}) {
        const Call call(package::Logout, Init(cookie));
        EXPECT_EQ(call.Body(), R"({"success":true})") << cookie;
        EXPECT_EQ(call.Cookies(), kForgottenCookie) << cookie;
    }
    EXPECT_EQ(fake.sessions.size(), 3U);
}

TEST_F(Session, LogoutDoesNotPretendThatASessionEndedThatStillLives) {
    fake.removeFails = true;
    const Call call(package::Logout, Init("id=abc"));
    EXPECT_EQ(call.Error(), 117);
    EXPECT_EQ(call.Cookies(), "[]");
}

struct BadSession {
    const char* name;
    const char* cookie;
    const char* address;
    int error;
    const char* word;
};

class SessionGetRefuses : public testing::TestWithParam<BadSession> {};

TEST_P(SessionGetRefuses, AsTheFrameworksGateWould) {
    FakeLogin& fake = FakeLogin::Renew();
    fake.sessions["abc"] = {"alice", kAddress, "", false};
    fake.sessions["withtoken"] = {"admin", kAddress, "t0ken", false};
    fake.sessions["old"] = {"alice", kAddress, "", true};
    Json::Value init(Json::objectValue);
    init["environ"]["HTTP_COOKIE"] = GetParam().cookie;
    init["environ"]["ZOVA_REMOTE_IP"] = GetParam().address;
    const Call call(package::Get, init);
    EXPECT_EQ(call.Body(), R"({"error":{"code":)" + std::to_string(GetParam().error) + R"(},"success":false})");
    EXPECT_EQ(call.ServerError(), GetParam().word);
}

INSTANTIATE_TEST_SUITE_P(Rows, SessionGetRefuses,
                         testing::Values(BadSession{"NoCookie", "", kAddress, 119, "unauth"},
                                         BadSession{"EmptyCookie", "id=", kAddress, 119, "unauth"},
                                         BadSession{"UnknownSession", "id=x", kAddress, 119, "unauth"},
                                         BadSession{"TimedOut", "id=old", kAddress, 106, "timeout"},
                                         BadSession{"OtherAddress", "id=abc", "192.0.2.8", 150, "errorip"},
                                         BadSession{"MissingToken", "id=withtoken", kAddress, 105, "noprivilege"}),
                         [](const testing::TestParamInfo<BadSession>& row) { return std::string(row.param.name); });

TEST_F(Session, CipherGivesSchemeAndKey) {
    const Call call(package::Cipher, Json::Value());
    EXPECT_EQ(call.Body(),
              R"({"data":{"envelope":{"public_key":"TUZrd0V3","scheme":"zova-envelope-1"}},"success":true})");
}

TEST_F(Session, CipherAnswersAnInternalErrorWithoutAKey) {
    fake.publicKey.clear();
    EXPECT_EQ(Call(package::Cipher, Json::Value()).Error(), 117);
}

}  // namespace
