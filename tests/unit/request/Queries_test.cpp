// Who is calling, and what may they do.

#include <cstdlib>

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"

using unit::J;
using ZOVA::APIRequest;

namespace {

class QueriesTest : public unit::FrameworkTest {
protected:
    QueriesTest() {
        unsetenv("zovaAccessToken");
        platform.sessions["sid"] = {"alice", 1, 1000, {}};
    }

    void LogIn() {
        request.InitEnv(J(R"({"HTTP_COOKIE": "id=sid"})"));
        request.InitSession(J(R"({"username": "alice"})"));
    }

    APIRequest request{Json::Value()};
};

TEST_F(QueriesTest, ARequestWithoutASessionAnswersItsDefaults) {
    EXPECT_TRUE(request.IsTimeout());
    EXPECT_TRUE(request.IsSkipCheckIP());
    EXPECT_FALSE(request.IsAuthorized());
    EXPECT_FALSE(request.IsAdmin());
    EXPECT_EQ(request.GetTimeoutDuration(), 0);
    EXPECT_EQ(request.GetLoginUID(), 4294967295U);
    EXPECT_EQ(request.GetLoginUserName(), "");
    EXPECT_EQ(request.GetApplication(), "");
    EXPECT_EQ(request.GetWebAPIPriv(), "");
    EXPECT_EQ(request.GetSessionFilePath(), "");
    EXPECT_EQ(request.GetSessionID(), "");
    EXPECT_EQ(platform.CountOf("ZovaCgiUIDGet"), 0);
}

TEST_F(QueriesTest, ASessionIsReadAsItStands) {
    request.InitSession(J(R"({"username": "alice", "isAdmin": true, "isTimeout": false, "timeout": 30,
        "isSkipCheckIP": false, "isAuthorized": true, "app": "photo", "webapi": "read", "sessFile": "/run/x"})"));
    request.InitEnv(J(R"({"HTTP_COOKIE": "id=secret", "ZOVA_REMOTE_IP": "192.0.2.1"})"));
    EXPECT_EQ(request.GetLoginUserName(), "alice");
    EXPECT_TRUE(request.IsAdmin());
    EXPECT_FALSE(request.IsTimeout());
    EXPECT_EQ(request.GetTimeoutDuration(), 30);
    EXPECT_FALSE(request.IsSkipCheckIP());
    EXPECT_TRUE(request.IsAuthorized());
    EXPECT_EQ(request.GetApplication(), "photo");
    EXPECT_EQ(request.GetWebAPIPriv(), "read");
    EXPECT_EQ(request.GetSessionFilePath(), "/run/x");
    EXPECT_EQ(request.GetSessionID(), "secret");
    EXPECT_EQ(request.GetRemoteIP(), "192.0.2.1");
}

TEST_F(QueriesTest, ATimeoutOfNullInTheSessionReadsAsFalse) {
    request.InitSession(J(R"({"isTimeout": null, "isAdmin": null})"));
    EXPECT_FALSE(request.IsTimeout());
    EXPECT_FALSE(request.IsAdmin());
}

TEST_F(QueriesTest, ASessionOfOddTypesIsSurvived) {
    for (const char* value : {"5", "\"x\"", "[]", "{}", "1e300", "-1"}) {
        Json::Value session(Json::objectValue);
        for (const char* key : {"username", "isAdmin", "isTimeout", "timeout", "uid", "allowUser", "authResult",
                                "appPriv", "uiLang", "tokenEnable", "isAuthorized"}) {
            session[key] = J(value);
        }
        request.InitSession(session);
        EXPECT_NO_THROW({
            request.GetLoginUserName();
            request.IsAdmin();
            request.IsTimeout();
            request.GetTimeoutDuration();
            request.GetLoginUID();
            request.GetAllowUser();
            request.GetAuthResult();
            request.HasAppPriv("x");
            request.GetUILanguage();
            request.IsTokenEnable();
            request.IsAuthorized();
        }) << value;
    }
}

TEST_F(QueriesTest, TheLoginNameCanBeSet) {
    request.SetLoginUserName("bob");
    EXPECT_EQ(request.GetLoginUserName(), "bob");
}

// ---- user id ----

TEST_F(QueriesTest, TheUserIdIsAskedOfThePlatformOnceWithTheSessionId) {
    LogIn();
    EXPECT_EQ(request.GetLoginUID(), 1000U);
    EXPECT_EQ(request.GetLoginUID(), 1000U);
    APIRequest copy(request);
    EXPECT_EQ(copy.GetLoginUID(), 1000U);
    EXPECT_EQ(platform.CallsOf({"ZovaCgiUIDGet"}), (std::vector<std::string>{"ZovaCgiUIDGet(sid)"}));
}

TEST_F(QueriesTest, AUserIdOfZeroInTheSessionAsksNobody) {
    LogIn();
    request.InitSession(J(R"({"username": "alice", "uid": 0})"));
    EXPECT_EQ(request.GetLoginUID(), 0U);
    EXPECT_EQ(platform.CountOf("ZovaCgiUIDGet"), 0);
}

TEST_F(QueriesTest, AFailureIsKeptLikeAUserId) {
    LogIn();
    platform.sessions.clear();
    EXPECT_EQ(request.GetLoginUID(), 4294967295U);
    EXPECT_EQ(request.GetLoginUID(), 4294967295U);
    EXPECT_EQ(platform.CountOf("ZovaCgiUIDGet"), 1);
}

TEST_F(QueriesTest, WithoutAUserNameNothingIsAskedAndNothingIsStored) {
    request.InitEnv(J(R"({"HTTP_COOKIE": "id=sid"})"));
    EXPECT_EQ(request.GetLoginUID(), 4294967295U);
    EXPECT_FALSE(request.Serialize()["session"].isMember("uid"));
}

// ---- allowed users ----

struct MaskCase {
    const char* name;
    const char* allowUser;
    int mask;
    bool stored;
};

class AllowUserMask : public QueriesTest, public ::testing::WithParamInterface<MaskCase> {};

TEST_P(AllowUserMask, IsWorkedOutOfTheDescription) {
    Json::Value info(Json::objectValue);
    info["allowUser"] = J(GetParam().allowUser);
    request.InitAPIInfo(info);
    EXPECT_EQ(request.GetAllowUser(), GetParam().mask);
    EXPECT_EQ(request.Serialize()["session"].isMember("allowUser"), GetParam().stored);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, AllowUserMask,
    ::testing::Values(MaskCase{"Mixed", R"(["admin.local", 7, "normal.ldap", "nobody"])", 33, true},
                      MaskCase{"All", R"(["admin.local", "admin.domain", "admin.ldap", "normal.local", "normal.domain",
                                         "normal.ldap"])",
                               63, true},
                      MaskCase{"Twice", R"(["admin.domain", "admin.domain"])", 2, true},
                      MaskCase{"OnlyUnknown", R"(["nobody"])", 0, true}, MaskCase{"Empty", "[]", 0, false},
                      MaskCase{"Text", "\"admin.local\"", 0, false}, MaskCase{"Null", "null", 0, false},
                      MaskCase{"Object", R"({"admin.local": 1})", 0, false}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(QueriesTest, AMaskInTheSessionIsTakenWithoutALookAtTheDescription) {
    request.InitSession(J(R"({"allowUser": 5})"));
    request.InitAPIInfo(J(R"({"allowUser": ["normal.ldap"]})"));
    EXPECT_EQ(request.GetAllowUser(), 5);
}

TEST_F(QueriesTest, AStoredMaskOfZeroIsWorkedOutAgain) {
    request.InitAPIInfo(J(R"({"allowUser": ["nobody"]})"));
    EXPECT_EQ(request.GetAllowUser(), 0);
    request.InitAPIInfo(J(R"({"allowUser": ["normal.local"]})"));
    EXPECT_EQ(request.GetAllowUser(), 8);
    request.InitAPIInfo(J(R"({"allowUser": ["admin.local"]})"));
    EXPECT_EQ(request.GetAllowUser(), 8) << "kept by then";
}

TEST_F(QueriesTest, TheApplicationPrivilegeIsAPlainEquality) {
    EXPECT_TRUE(request.HasAppPriv(""));
    EXPECT_FALSE(request.HasAppPriv("a"));
    request.InitSession(J(R"({"appPriv": "a"})"));
    EXPECT_TRUE(request.HasAppPriv("a"));
    EXPECT_FALSE(request.HasAppPriv("A"));
    EXPECT_FALSE(request.HasAppPriv(""));
}

// ---- access token ----

TEST_F(QueriesTest, AnEmptyAccessTokenIsNullAndTouchesNoEnvironment) {
    EXPECT_EQ(request.GetZovaAccessTokenID(), nullptr);
    request.InitEnv(J(R"({"zovaAccessToken": ""})"));
    EXPECT_EQ(request.GetZovaAccessTokenID(), nullptr);
    EXPECT_EQ(platform.CountOf("setenv"), 0);
    EXPECT_EQ(getenv("zovaAccessToken"), nullptr);
}

TEST_F(QueriesTest, AnAccessTokenOutlivesItsRequestInTheEnvironment) {
    const char* token = nullptr;
    {
        APIRequest other(J(R"({"environ": {"zovaAccessToken": "T"}})"));
        token = other.GetZovaAccessTokenID();
    }
    EXPECT_STREQ(token, "T");
    EXPECT_EQ(token, getenv("zovaAccessToken"));
}

TEST_F(QueriesTest, AnAccessTokenThatCannotBeStoredIsNotMistakenForAnother) {
    request.InitEnv(J(R"({"zovaAccessToken": "T"})"));
    platform.Fail("setenv", ENOMEM);
    EXPECT_EQ(request.GetZovaAccessTokenID(), nullptr);
}

// ---- preference directories ----

TEST_F(QueriesTest, PreferenceDirectoriesAreThePlatformsOrTmp) {
    request.SetLoginUserName("alice");
    EXPECT_EQ(request.GetPreferenceDir(), "/tmp");
    EXPECT_EQ(request.GetGroupPreferenceDir("users"), "/tmp");
    platform.userPreferenceDirs["alice"] = "/var/preference/alice";
    platform.groupPreferenceDirs["users"] = "/var/preference/users";
    EXPECT_EQ(request.GetPreferenceDir(), "/var/preference/alice");
    EXPECT_EQ(request.GetGroupPreferenceDir("users"), "/var/preference/users");
    EXPECT_EQ(platform.CallsOf({"ZOVAUserPreferenceDirGet"}).back(), "ZOVAUserPreferenceDirGet(alice, 1024)");
    platform.userPreferenceDirs["alice"] = std::string(1024, 'x');
    EXPECT_EQ(request.GetPreferenceDir(), "/tmp");
}

}  // namespace
