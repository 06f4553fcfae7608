#include "webapi/APIAuth.h"

#include <unistd.h>

#include <cstdlib>

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"

using unit::J;
using ZOVA::APIAuth;
using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

class APIAuthTest : public unit::FrameworkTest {
protected:
    APIAuthTest() {
        platform.sessions["sid"] = {"somebody", 1, 1000, {}};
        request.InitSession(J(R"({"username": "alice"})"));
        request.InitEnv(J(R"({"ZOVA_REMOTE_IP": "192.0.2.9"})"));
        Describe(R"({"allowUser": ["normal.local"]})");
    }

    void Describe(const std::string& info) { request.InitAPIInfo(J(info)); }
    bool Check(const char* sid, bool flag = false) { return APIAuth::CheckPermission(&request, &response, sid, flag); }

    APIRequest request{Json::Value()};
    APIResponse response{&request};
};

// ---- CheckAllowUser ----

struct AllowCase {
    const char* name;
    const char* info;
    bool admin;
    const char* user;
    bool allowed;
};

class CheckAllowUser : public APIAuthTest, public ::testing::WithParamInterface<AllowCase> {};

TEST_P(CheckAllowUser, MatchesTheWholeTag) {
    const AllowCase& row = GetParam();
    Describe(row.info);
    request.InitSession(J(row.admin ? R"({"isAdmin": true})" : R"({"isAdmin": false})"));
    EXPECT_EQ(APIAuth::CheckAllowUser(&request, row.user), row.allowed);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, CheckAllowUser,
    ::testing::Values(AllowCase{"NormalLocal", R"({"allowUser": ["normal.local"]})", false, "bob", true},
                      AllowCase{"EmptyNameIsLocal", R"({"allowUser": ["normal.local"]})", false, "", true},
                      AllowCase{"AdminLocal", R"({"allowUser": ["x", "admin.local"]})", true, "bob", true},
                      AllowCase{"AdminIsNotNormal", R"({"allowUser": ["normal.local"]})", true, "bob", false},
                      AllowCase{"Domain", R"({"allowUser": ["normal.domain"]})", false, "D\\bob", true},
                      AllowCase{"Ldap", R"({"allowUser": ["admin.ldap"]})", true, "bob@x", true},
                      AllowCase{"BackslashComesFirst", R"({"allowUser": ["normal.domain"]})", false, "D\\bob@x", true},
                      AllowCase{"BackslashIsNotLdap", R"({"allowUser": ["normal.ldap"]})", false, "D\\bob@x", false},
                      AllowCase{"NullName", R"({"allowUser": ["normal.local"]})", false, nullptr, false},
                      AllowCase{"Absent", R"({"lib": "x"})", false, "bob", false},
                      AllowCase{"AbsentForAnAdministrator", R"({"lib": "x"})", true, "bob", false},
                      AllowCase{"Empty", R"({"allowUser": []})", false, "bob", false},
                      AllowCase{"EmptyForAnAdministrator", R"({"allowUser": []})", true, "bob", false},
                      AllowCase{"Text", R"({"allowUser": "normal.local"})", false, "bob", false},
                      AllowCase{"Null", R"({"allowUser": null})", false, "bob", false},
                      AllowCase{"OtherTypes", R"({"allowUser": [1, null, {}, ["normal.local"]]})", false, "bob", false},
                      AllowCase{"NoWildCard", R"({"allowUser": ["normal.", "normal.*"]})", false, "bob", false}),
    [](const auto& row) { return std::string(row.param.name); });

// ---- CheckPermission ----

struct ResultCase {
    int result;
    int error;
};

class CheckPermissionResult : public APIAuthTest, public ::testing::WithParamInterface<ResultCase> {};

TEST_P(CheckPermissionResult, BecomesItsError) {
    platform.sessions["sid"].result = GetParam().result;
    EXPECT_EQ(Check("sid"), GetParam().error == 0);
    EXPECT_EQ(response.GetError(), GetParam().error);
    EXPECT_FALSE(response.HasServerError());
}

INSTANTIATE_TEST_SUITE_P(Rows, CheckPermissionResult,
                         ::testing::Values(ResultCase{-9, 105}, ResultCase{-8, 150}, ResultCase{-7, 105},
                                           ResultCase{-6, 105}, ResultCase{-5, 105}, ResultCase{-4, 105},
                                           ResultCase{-3, 107}, ResultCase{-2, 105}, ResultCase{-1, 106},
                                           ResultCase{0, 105}, ResultCase{1, 0}, ResultCase{2, 0}, ResultCase{3, 105}),
                         [](const auto& row) {
                             const std::string number = std::to_string(row.param.result);
                             return number[0] == '-' ? "Minus" + number.substr(1) : number;
                         });

TEST_F(APIAuthTest, ASessionIsCheckedOnARecordOfItsOwn) {
    platform.systemTimeout = 33;
    EXPECT_TRUE(Check("sid", true));
    EXPECT_EQ(
        platform.CallsOf({"ZovaCgiInitEx", "ZovaCgiIsAuthorizedEx", "ZovaCgiFree"}),
        (std::vector<std::string>{"ZovaCgiInitEx(33, 1, current.users, )",
                                  "ZovaCgiIsAuthorizedEx(sid, 493, flags 15, allowTimeout 0, 0)", "ZovaCgiFree()"}));
}

TEST_F(APIAuthTest, TheIdentityIsTheRequestsAndItsSessionIsNotTouched) {
    const Json::Value before = request.Serialize();
    Describe(R"({"allowUser": ["normal.local"], "appPriv": "P"})");
    platform.appPrivileges.insert({"alice", "P", "192.0.2.9"});
    EXPECT_TRUE(Check("sid"));
    EXPECT_EQ(platform.CallsOf({"QLIBAppPrivUserHas"}),
              (std::vector<std::string>{"QLIBAppPrivUserHas(alice, P, 192.0.2.9)"}));
    EXPECT_EQ(request.Serialize()["session"], before["session"]);
}

TEST_F(APIAuthTest, ANullSessionIdIs105AndAsksNobody) {
    EXPECT_FALSE(Check(nullptr));
    EXPECT_EQ(response.GetError(), 105);
    EXPECT_EQ(platform.CountOf("ZovaCgiIsAuthorizedEx"), 0);
}

TEST_F(APIAuthTest, AnErrorThatStoodThereBeforeEndsACheckThatWouldPass) {
    response.SetError(777, Json::Value());
    EXPECT_FALSE(Check("sid"));
    EXPECT_EQ(response.GetError(), 777);
}

TEST_F(APIAuthTest, AKindOfUserThatIsNotAllowedIs105) {
    Describe(R"({"allowUser": ["admin.local"]})");
    EXPECT_FALSE(Check("sid"));
    EXPECT_EQ(response.GetError(), 105);
}

TEST_F(APIAuthTest, AMissingApplicationPrivilegeIs160AndAnEmptyOneIsNotTested) {
    Describe(R"({"allowUser": ["normal.local"], "appPriv": "P"})");
    EXPECT_FALSE(Check("sid"));
    EXPECT_EQ(response.GetError(), 160);
    response.SetSuccess(Json::Value());
    platform.calls.clear();
    Describe(R"({"allowUser": ["normal.local"], "appPriv": ""})");
    EXPECT_TRUE(Check("sid"));
    EXPECT_EQ(platform.CountOf("QLIBAppPrivUserHas"), 0);
}

TEST_F(APIAuthTest, ARecordThatCannotBePreparedRefuses) {
    platform.Fail("ZovaCgiInitEx", ENOMEM);
    EXPECT_FALSE(Check("sid"));
    EXPECT_EQ(response.GetError(), 105);
}

// ---- UpdateTimeout ----

class UpdateTimeoutTest : public APIAuthTest {
protected:
    UpdateTimeoutTest() {
        char* resolved = realpath(directory.Path().c_str(), nullptr);
        platform.sessionDirectory = resolved;
        free(resolved);
        directory.Write("sid", "{}");
    }

    bool Update(const std::string& sid) {
        request.SetCookie("id", sid);
        return APIAuth::UpdateTimeout(&request);
    }

    unit::TemporaryDirectory directory;
};

TEST_F(UpdateTimeoutTest, RenewsAPlainFileOfTheSessionDirectory) {
    EXPECT_TRUE(Update("sid"));
    EXPECT_EQ(platform.CallsOf({"QLIBCFileUTime"}),
              (std::vector<std::string>{"QLIBCFileUTime(" + platform.sessionDirectory + "/sid, 1, 0)"}));
    EXPECT_EQ(platform.CountOf("ZovaCgiFree"), 1);
}

TEST_F(UpdateTimeoutTest, ANullRequestIsFalse) {
    EXPECT_FALSE(APIAuth::UpdateTimeout(nullptr));
}

TEST_F(UpdateTimeoutTest, PathPartsLinksAndMissingFilesGetNoUpdate) {
    unit::TemporaryDirectory outside;
    outside.Write("target", "{}");
    const std::string name = platform.sessionDirectory.substr(platform.sessionDirectory.rfind('/') + 1);
    ASSERT_EQ(symlink((outside.Path() + "/target").c_str(), (directory.Path() + "/link").c_str()), 0);
    ASSERT_EQ(symlink("sid", (directory.Path() + "/inner").c_str()), 0);
    for (const std::string& sid : {std::string("../") + name + "/sid", std::string("./sid"), std::string("sid/"),
                                   std::string("/sid"), std::string("link"), std::string("inner"), std::string("none"),
                                   std::string(""), std::string("."), std::string(".."), std::string(70000, 'a')}) {
        EXPECT_FALSE(Update(sid)) << sid.substr(0, 60);
    }
    EXPECT_EQ(platform.CountOf("QLIBCFileUTime"), 0);
    EXPECT_EQ(platform.CountOf("ZovaCgiFree"), 11);
}

TEST_F(UpdateTimeoutTest, AnIdWithANulByteGetsNoUpdate) {
    EXPECT_FALSE(Update(std::string("sid\0x", 5)));
    EXPECT_EQ(platform.CountOf("QLIBCFileUTime"), 0);
}

TEST_F(UpdateTimeoutTest, ARefusedUpdateOrRecordIsFalse) {
    platform.Fail("QLIBCFileUTime", EACCES);
    EXPECT_FALSE(Update("sid"));
    platform.StopFailing();
    platform.Fail("realpath", EACCES);
    EXPECT_FALSE(Update("sid"));
    platform.StopFailing();
    platform.Fail("ZovaCgiInit", ENOMEM);
    EXPECT_FALSE(Update("sid"));
    EXPECT_EQ(platform.CountOf("ZovaCgiFree"), 3);
}

}  // namespace
