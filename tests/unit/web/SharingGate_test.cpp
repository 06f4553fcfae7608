// The gate of sharing links: method, link, project, and the login that a link for one user brings.

#include <cstdlib>

#include "SharingTest.h"
#include "webapi/SharingChecker.h"

using unit::Serve;
using unit::SharingTest;
using unit::TestWebEntry;
using unit::WebAnswer;
using Texts = std::vector<std::string>;

namespace {

constexpr int kProtectedByUser = 2;
constexpr long long kNow = 1700000000;

class SharingGate : public SharingTest {
protected:
    bool Check(const std::string& method) {
        Prepare(entry, method);
        return entry.CheckSharingPermission(entry.Request(), entry.Response());
    }
    int Error() { return entry.Response()->GetError(); }
    int Stored() { return entry.Request()->GetAuthResult(); }

    TestWebEntry entry;
};

// ---- the method ----

TEST_F(SharingGate, RefusesANullRequestAndTouchesNothing) {
    platform.calls.clear();
    EXPECT_FALSE(entry.CheckSharingPermission(nullptr, entry.Response()));
    EXPECT_EQ(Error(), 0);
    EXPECT_TRUE(platform.calls.empty());
}

TEST_F(SharingGate, AnswersARequestWithoutALinkBy126) {
    Prepare(entry, "success");
    entry.Request()->InitEnv(unit::J(R"({"HTTP_X_FAKE_SHARING": ""})"));
    EXPECT_FALSE(entry.CheckSharingPermission(entry.Request(), entry.Response()));
    EXPECT_EQ(Error(), 126);
    EXPECT_EQ(Stored(), -4);
    EXPECT_EQ(platform.CountOf("ZovaSharingIsAuthorized"), 0);
}

TEST_F(SharingGate, AnswersAMethodWithoutAllowSharingBy126BeforeTheLibraryIsAsked) {
    EXPECT_FALSE(Check("closed"));
    EXPECT_EQ(Error(), 126);
    EXPECT_EQ(Stored(), -4);
    EXPECT_EQ(platform.CountOf("ZovaSharingIsAuthorized"), 0);
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
}

TEST_F(SharingGate, IsNotAskedAboutAnOrdinaryRequest) {
    const WebAnswer answer = Serve(unit::WebCall::Get("api=ZOVA.Test.Good&version=1&method=success"));
    EXPECT_EQ(answer.ErrorCode(), 119);
    EXPECT_TRUE(answer.CallsOf("ZovaSharingIsAuthorized").empty());
}

// ---- the link ----

struct ResultCase {
    const char* name;
    int result;
    int error;
    int stored;
};

class SharingResult : public SharingGate, public ::testing::WithParamInterface<ResultCase> {};

TEST_P(SharingResult, DecidesErrorAndStoredResult) {
    const ResultCase& row = GetParam();
    platform.sharingResult = row.result;
    EXPECT_EQ(Check("success"), row.error == 0);
    EXPECT_EQ(Error(), row.error);
    EXPECT_EQ(Stored(), row.stored);
    EXPECT_EQ(platform.CallsOf({"ZovaSharingIsAuthorized"}), (Texts{"ZovaSharingIsAuthorized(hash, s)"}));
    EXPECT_EQ(platform.CountOf("dlopen"), row.error == 0 ? 1 : 0);
    EXPECT_EQ(entry.Response()->GetServerError(), "");
}

INSTANTIATE_TEST_SUITE_P(Rows, SharingResult,
                         ::testing::Values(ResultCase{"Good", 1, 0, 1}, ResultCase{"Minus1", -1, 125, -1},
                                           ResultCase{"Minus2", -2, 126, -2}, ResultCase{"Minus3", -3, 101, -7},
                                           ResultCase{"Minus4", -4, 101, -7}, ResultCase{"Minus5", -5, 122, -5},
                                           ResultCase{"Minus6", -6, 124, -6}, ResultCase{"Minus7", -7, 123, -7},
                                           ResultCase{"Minus8", -8, 150, -8}, ResultCase{"Zero", 0, 101, -7},
                                           ResultCase{"AnotherGoodOne", 2, 101, -7}, ResultCase{"Minus9", -9, 101, -7},
                                           ResultCase{"Smallest", -2147483647 - 1, 101, -7}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(SharingGate, GivesAnEmptySessionIdOnAsNull) {
    Prepare(entry, "success", "");
    EXPECT_TRUE(entry.CheckSharingPermission(entry.Request(), entry.Response()));
    EXPECT_EQ(platform.CallsOf({"ZovaSharingIsAuthorized"}), (Texts{"ZovaSharingIsAuthorized(hash, null)"}));
}

// ---- the project ----

TEST_F(SharingGate, AnswersAProjectsNoBy127WhileTheLinkStaysInOrder) {
    EXPECT_FALSE(Check("refused"));
    EXPECT_EQ(Error(), 127);
    EXPECT_EQ(Stored(), 1);
    EXPECT_FALSE(entry.Request()->IsAuthorized());
}

TEST_F(SharingGate, ReplacesTheErrorOfTheProjectBy127) {
    EXPECT_FALSE(Check("refused_with_error"));
    EXPECT_EQ(Error(), 127);
}

TEST_F(SharingGate, DoesNotAskTheProjectAboutAMethodThatSkipsIt) {
    EXPECT_TRUE(Check("unchecked"));
    EXPECT_EQ(Error(), 0);
    EXPECT_EQ(Stored(), 1);
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
}

TEST_F(SharingGate, AnswersAProjectThatDoesNotExistBy127) {
    Link().projectName = "there_is_none";
    EXPECT_FALSE(Check("success"));
    EXPECT_EQ(Error(), 127);
    const std::string missing = std::string(UNIT_LIBRARY_DIR) + "/there_is_none.so";
    ExpectLog(LOG_ERR, "cannot open library: /usr/lib/sharing/permission_lib/there_is_none.so. error = " + missing +
                           ": cannot open shared object file: No such file or directory");
}

TEST_F(SharingGate, AnswersAProjectNameThatLeavesTheFolderBy127) {
    Link().projectName = "../../evil";
    EXPECT_FALSE(Check("success"));
    EXPECT_EQ(Error(), 127);
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
    ExpectLog(LOG_ERR, "Bad parameters");
}

TEST_F(SharingGate, AnswersALinkWithoutAProjectBy127) {
    Link().projectName = "";
    EXPECT_FALSE(Check("success"));
    EXPECT_EQ(Error(), 127);
    ExpectLog(LOG_ERR, "Bad parameters");
}

TEST_F(SharingGate, LetsAWholeCallThrough) {
    EXPECT_TRUE(Check("success"));
    entry.CloseLib();
    const WebAnswer answer = Serve(Visit("success"));
    EXPECT_EQ(answer.ErrorCode(), 0) << answer.bodyText;
    EXPECT_EQ(answer.CallsOf("mark").front(), "mark(yes as 0/0 in [])");
    platform.process.log.clear();
}

TEST_F(SharingGate, IsForgivenAtAuthLevel2) {
    Good()["authLevel"] = 2;
    Good()["methods"]["1"] = unit::J(R"([{"success": {"grantable": true}}])");
    Install();
    EXPECT_EQ(Serve(Visit("success")).ErrorCode(), 0);
    platform.process.log.clear();
}

// ---- the visitor's login ----

struct ProtectCase {
    int type;
    bool login;
};

class ProtectType : public SharingGate, public ::testing::WithParamInterface<ProtectCase> {};

TEST_P(ProtectType, DecidesWhetherAVisitorIsLoggedIn) {
    Link().protectType = GetParam().type;
    platform.sharingSession.id = 1;
    platform.sharingSession.uid = 1000;
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(entry.Request()->GetLoginUserName(), GetParam().login ? "alice" : "");
    EXPECT_EQ(entry.Request()->IsAuthorized(), GetParam().login);
    EXPECT_EQ(Stored(), 1);
    EXPECT_EQ(platform.CountOf("ZOVAUserGetByUID"), GetParam().login ? 1 : 0);
}

INSTANTIATE_TEST_SUITE_P(Rows, ProtectType,
                         ::testing::Values(ProtectCase{0, false}, ProtectCase{1, false}, ProtectCase{2, true},
                                           ProtectCase{3, false}, ProtectCase{-2, false}),
                         [](const auto& row) { return "Type" + std::to_string(row.index); });

class SharingSession : public SharingGate {
protected:
    SharingSession() {
        Link().protectType = kProtectedByUser;
        platform.clock = kNow;
        platform.language = "fre";
        platform.tokenEnable = 1;
        platform.sharingSession.id = 1;
        platform.sharingSession.uid = 1024;
        platform.sharingSession.timeout = kNow + 600;
    }

    Json::Value Made() {
        Prepare(entry, "success");
        entry.InitSharingSession(entry.Request());
        EXPECT_EQ(platform.userRecords, 0);
        return entry.Request()->Serialize()["session"];
    }
};

TEST_F(SharingSession, HoldsWhatALoginOfTheUserWould) {
    Link().matchIp = true;
    EXPECT_JSON(Made(), R"({"appPriv": "", "username": "admin", "isAdmin": true, "sessFile": "", "isTimeout": false,
        "timeout": 10, "isSkipCheckIP": true, "uiLang": "fre", "app": "", "webapi": "", "isAuthorized": true,
        "tokenEnable": 1})");
    EXPECT_STREQ(getenv("ZOVA_WEBAPI_USERNAME"), "admin");
}

TEST_F(SharingSession, OfAnOrdinaryUserIsNoAdministrators) {
    platform.sharingSession.uid = 1000;
    const Json::Value made = Made();
    EXPECT_FALSE(made["isAdmin"].asBool());
    EXPECT_FALSE(made["isSkipCheckIP"].asBool());
}

TEST_F(SharingSession, OfAnUnknownUserLeavesTheRequestAsItIs) {
    platform.sharingSession.uid = 4711;
    const Json::Value made = Made();
    EXPECT_FALSE(Json::hasMember(made, "username"));
    EXPECT_EQ(getenv("ZOVA_WEBAPI_USERNAME"), nullptr);
    EXPECT_TRUE(entry.CheckSharingPermission(entry.Request(), entry.Response()));
    EXPECT_FALSE(entry.Request()->IsAuthorized());
}

struct TimeoutCase {
    const char* name;
    std::int64_t end;
    int minutes;
};

class SharingTimeout : public SharingSession, public ::testing::WithParamInterface<TimeoutCase> {};

TEST_P(SharingTimeout, IsWhatIsLeftInWholeMinutes) {
    platform.sharingSession.timeout = GetParam().end;
    EXPECT_EQ(Made()["timeout"].asInt(), GetParam().minutes);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, SharingTimeout,
    ::testing::Values(TimeoutCase{"Ended90SecondsAgo", kNow - 90, 15}, TimeoutCase{"Ended60SecondsAgo", kNow - 60, 15},
                      TimeoutCase{"Ended59SecondsAgo", kNow - 59, 0}, TimeoutCase{"EndsNow", kNow, 0},
                      TimeoutCase{"Ends59SecondsLater", kNow + 59, 0}, TimeoutCase{"EndsAnHourLater", kNow + 3600, 60},
                      TimeoutCase{"NeverEnds", INT64_MAX, 2147483647}, TimeoutCase{"Smallest", INT64_MIN, 15}),
    [](const auto& row) { return std::string(row.param.name); });

// ---- the verdict alone ----

class Checker : public ZOVA::SharingChecker {
public:
    int Error() { return response->GetError(); }
};

class SharingCheckerTest : public SharingTest {
protected:
    SharingCheckerTest() { setenv("HTTP_X_FAKE_SHARING", "hash", 1); }

    bool Ask(const std::string& query) {
        setenv("QUERY_STRING", query.c_str(), 1);
        setenv("REQUEST_METHOD", "GET", 1);
        Checker checker;
        EXPECT_FALSE(checker.IsSharingAllowed());
        checker.Run(Json::Value("not looked at"));
        return checker.IsSharingAllowed();
    }
};

TEST_F(SharingCheckerTest, TellsTheProjectsYesWithoutRunningTheMethodOrAskingAboutTheLink) {
    platform.sharingResult = -2;
    EXPECT_TRUE(Ask("api=ZOVA.Test.Good&version=1&method=success"));
    EXPECT_EQ(platform.CallsOf({"mark"}), (Texts{"mark(yes as 0/0 in [])"}));
    EXPECT_EQ(platform.CountOf("ZovaSharingIsAuthorized"), 0);
}

TEST_F(SharingCheckerTest, TellsTheProjectsNo) {
    EXPECT_FALSE(Ask("api=ZOVA.Test.Good&version=1&method=refused"));
    EXPECT_EQ(platform.CallsOf({"mark"}), (Texts{"mark(no as 0/0 in [])"}));
}

TEST_F(SharingCheckerTest, DoesNotAskTheProjectAboutARequestThatCannotBeTakenIn) {
    EXPECT_FALSE(Ask("api=%ff%fe"));
}

}  // namespace
