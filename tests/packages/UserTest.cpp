#include <errno.h>
#include <gtest/gtest.h>

#include "../../packages/ZOVA.Core.User/GetUser.h"
#include "../../packages/ZOVA.Core.User/ListUsers.h"
#include "Call.h"
#include "FakeLogin.h"
#include "FakeUserDatabase.h"

namespace {

class User : public testing::Test {
protected:
    User() : database(FakeUserDatabase::Renew()) {
        FakeLogin::Renew().administrators = {"admin"};
        database.users = {
            {"alice", 1001, 1001, "Alice Liddell,Room 7,,", "/home/alice", "/bin/bash"},
            {"root", 0, 0, "", "/root", "/bin/sh"},
            {"admin", 1000, 100, "Administrator", "/home/admin", "/bin/bash"},
        };
        database.groups = {{0, "root"}, {100, "users"}, {1001, "alice"}, {50, "staff"}, {27, "administrators"}};
        database.memberships = {{"alice", {50, 4711}}, {"admin", {27}}};
    }

    static Json::Value Init(const std::string& login, bool isAdmin, const std::string& parameters) {
        Json::Value init(Json::objectValue);
        init["session"]["username"] = login;
        init["session"]["isAdmin"] = isAdmin;
        init["postParam"] = Parse(parameters);
        return init;
    }
    static Call GetAsAlice(const std::string& parameters) {
        return Call(package::GetUser, Init("alice", false, parameters));
    }
    static Call GetAsAdmin(const std::string& parameters) {
        return Call(package::GetUser, Init("admin", true, parameters));
    }
    static Call List(const std::string& parameters) {
        return Call(package::ListUsers, Init("admin", true, parameters));
    }

    FakeUserDatabase& database;
};

TEST_F(User, GetDescribesTheCaller) {
    EXPECT_EQ(GetAsAlice("{}").Body(),
              R"({"data":{"description":"Alice Liddell","gid":1001,"group":"alice",)"
              R"("groups":["alice","staff","4711"],"home":"/home/alice","is_admin":false,"name":"alice",)"
              R"("shell":"/bin/bash","uid":1001},"success":true})");
}

TEST_F(User, GetDescribesTheCallerByName) {
    EXPECT_EQ(GetAsAlice(R"({"name":"alice"})").Data()["uid"], 1001U);
}

TEST_F(User, GetDescribesAnybodyToAnAdministrator) {
    const Call call = GetAsAdmin(R"({"name":"alice"})");
    EXPECT_EQ(call.Data()["name"], "alice");
    EXPECT_EQ(call.Data()["is_admin"], false);
    EXPECT_EQ(GetAsAdmin("{}").Data()["is_admin"], true);
}

TEST_F(User, GetTellsOthersNothingOfSomebodyElse) {
    EXPECT_EQ(GetAsAlice(R"({"name":"admin"})").Error(), 105);
    EXPECT_EQ(GetAsAlice(R"({"name":"no-such-user"})").Error(), 105);
}

TEST_F(User, GetRefusesACallWithoutALogin) {
    EXPECT_EQ(Call(package::GetUser, Init("", false, "{}")).Error(), 105);
    EXPECT_EQ(Call(package::GetUser, Init("", true, "{}")).Error(), 105);
}

TEST_F(User, GetAnswersAnUnknownNameToAnAdministrator) {
    EXPECT_EQ(GetAsAdmin(R"({"name":"no-such-user"})").Error(), 401);
}

TEST_F(User, GetAnswersACallerWhoWasRemovedMeanwhile) {
    EXPECT_EQ(Call(package::GetUser, Init("gone", false, "{}")).Error(), 401);
}

TEST_F(User, GetAnswersADatabaseThatCannotBeRead) {
    database.lookupError = EIO;
    EXPECT_EQ(GetAsAlice("{}").Error(), 402);
}

TEST_F(User, GetTakesTheErrorsThatMeanUnknown) {
    for (const int error : {ENOENT, ESRCH}) {
        database.lookupError = error;
        EXPECT_EQ(GetAsAlice("{}").Error(), 401) << error;
    }
}

TEST_F(User, GetGivesLongEntriesTheRoomTheyNeed) {
    database.smallestBuffer = 1 << 20;
    const Call call = GetAsAlice("{}");
    EXPECT_EQ(call.Data()["uid"], 1001U);
    EXPECT_EQ(call.Data()["group"], "alice");
}

TEST_F(User, GetGivesUpOnAnEntryOfAnyLength) {
    database.smallestBuffer = std::size_t(1) << 40;
    EXPECT_EQ(GetAsAlice("{}").Error(), 402);
}

TEST_F(User, GetNamesAllOfManyGroups) {
    for (gid_t gid = 10000; gid < 10300; ++gid) {
        database.memberships["alice"].push_back(gid);
    }
    EXPECT_EQ(GetAsAlice("{}").Data()["groups"].size(), 303U);
}

TEST_F(User, GetAnswersAnAccountOfMoreGroupsThanAProcessCanHave) {
    database.memberships["alice"].assign(70000, 50);
    EXPECT_EQ(GetAsAlice("{}").Error(), 402);
}

TEST_F(User, GetMakesValidTextOfACommentThatIsNone) {
    database.users[0].comment =
        "Al\xFF"
        "ice";
    EXPECT_EQ(GetAsAlice("{}").Data()["description"], "Al\xEF\xBF\xBDice");
}

TEST_F(User, ListIsOrderedByUserId) {
    const Call call = List("{}");
    EXPECT_EQ(call.Data()["total"], 3U);
    EXPECT_EQ(call.Data()["offset"], 0);
    ASSERT_EQ(call.Data()["users"].size(), 3U);
    EXPECT_EQ(Json::toString(call.Data()["users"][0]),
              R"({"description":"","gid":0,"home":"/root","is_admin":false,"name":"root","uid":0})");
    EXPECT_EQ(call.Data()["users"][1]["name"], "admin");
    EXPECT_EQ(call.Data()["users"][1]["is_admin"], true);
    EXPECT_EQ(call.Data()["users"][2]["name"], "alice");
}

TEST_F(User, ListGivesThePageThatWasAskedFor) {
    const Call call = List(R"({"offset":1,"limit":1})");
    EXPECT_EQ(call.Data()["total"], 3U);
    EXPECT_EQ(call.Data()["offset"], 1);
    ASSERT_EQ(call.Data()["users"].size(), 1U);
    EXPECT_EQ(call.Data()["users"][0]["name"], "admin");
}

TEST_F(User, ListHasNoUsersBehindTheEnd) {
    const Call call = List(R"({"offset":2147483647,"limit":1000})");
    EXPECT_EQ(Json::toString(call.Data()["users"]), "[]");
    EXPECT_EQ(call.Data()["total"], 3U);
}

TEST_F(User, ListGivesAHundredUnlessAskedForMore) {
    for (uid_t uid = 2000; uid < 2200; ++uid) {
        database.users.push_back({"user" + std::to_string(uid), uid, 100, "", "/", "/bin/sh"});
    }
    EXPECT_EQ(List("{}").Data()["users"].size(), 100U);
    EXPECT_EQ(List(R"({"limit":1000})").Data()["users"].size(), 203U);
}

TEST_F(User, ListAnswersADatabaseThatFailsHalfWay) {
    database.listError = EIO;
    EXPECT_EQ(List("{}").Error(), 402);
}

struct BadUserCall {
    const char* name;
    Call::Method method;
    std::string parameters;
    const char* refused;
};

class UserRefusesParameters : public testing::TestWithParam<BadUserCall> {};

TEST_P(UserRefusesParameters, WithTheParametersName) {
    FakeUserDatabase::Renew();
    Json::Value init(Json::objectValue);
    init["session"]["username"] = "admin";
    init["session"]["isAdmin"] = true;
    init["postParam"] = Parse(GetParam().parameters);
    EXPECT_EQ(Call(GetParam().method, init).Body(), RefusalOf(GetParam().refused));
}

INSTANTIATE_TEST_SUITE_P(
    Rows, UserRefusesParameters,
    testing::Values(BadUserCall{"NameEmpty", package::GetUser, R"({"name":""})", "name"},
                    BadUserCall{"NameNull", package::GetUser, R"({"name":null})", "name"},
                    BadUserCall{"NameIsANumber", package::GetUser, R"({"name":7})", "name"},
                    BadUserCall{"NameIsAnObject", package::GetUser, R"({"name":{"a":1}})", "name"},
                    BadUserCall{"NameWithNul", package::GetUser, R"({"name":"root\u0000"})", "name"},
                    BadUserCall{"NameWithNewline", package::GetUser, R"({"name":"a\nb"})", "name"},
                    BadUserCall{"NameWithColon", package::GetUser, R"({"name":"a:0"})", "name"},
                    BadUserCall{"NameWithSlash", package::GetUser, R"({"name":"../root"})", "name"},
                    BadUserCall{"NameLikeAnOption", package::GetUser, R"({"name":"-x"})", "name"},
                    BadUserCall{"NameTooLong", package::GetUser, R"({"name":")" + std::string(256, 'a') + R"("})",
                                "name"},
                    BadUserCall{"OffsetNegative", package::ListUsers, R"({"offset":-1})", "offset"},
                    BadUserCall{"OffsetIsAText", package::ListUsers, R"({"offset":"0"})", "offset"},
                    BadUserCall{"OffsetPast32Bits", package::ListUsers, R"({"offset":2147483648})", "offset"},
                    BadUserCall{"OffsetIsAFraction", package::ListUsers, R"({"offset":0.5})", "offset"},
                    BadUserCall{"OffsetNull", package::ListUsers, R"({"offset":null})", "offset"},
                    BadUserCall{"LimitZero", package::ListUsers, R"({"limit":0})", "limit"},
                    BadUserCall{"LimitNegative", package::ListUsers, R"({"limit":-5})", "limit"},
                    BadUserCall{"LimitTooHigh", package::ListUsers, R"({"limit":1001})", "limit"},
                    BadUserCall{"LimitIsAnArray", package::ListUsers, R"({"limit":[1]})", "limit"}),
    [](const testing::TestParamInfo<BadUserCall>& row) { return std::string(row.param.name); });

}  // namespace
