// Which kinds of user, and which privileges, may call.

#include "GateTest.h"

using unit::GateTest;
using unit::Serve;
using unit::WebAnswer;

namespace {

struct AllowCase {
    const char* name;
    const char* user;
    bool admin;
    /** JSON text at API level; null: absent, also in `lib.def`. */
    const char* api;
    /** At method level. */
    const char* method;
    bool allowed;
};

class AllowUser : public GateTest, public ::testing::WithParamInterface<AllowCase> {};

void PrintTo(const AllowCase& row, std::ostream* out) {
    *out << row.name;
}

TEST_P(AllowUser, IsTakenFromTheMethodElseFromTheAPI) {
    const AllowCase& row = GetParam();
    platform.users[row.user].admin = row.admin;
    platform.sessions["s"] = {row.user, 1, 1000, {}};
    platform.files["/usr/zova/zovaman/webapi/lib.def"] = R"({"methods": {"grantable": true}})";
    if (row.api != nullptr) {
        Good()["allowUser"] = unit::J(row.api);
    }
    Good()["methods"]["1"][10] = unit::J(R"({"session": {"grantable": true}})");
    if (row.method != nullptr) {
        Good()["methods"]["1"][10]["session"]["allowUser"] = unit::J(row.method);
    }
    Install();
    const WebAnswer answer = Serve(Session("s"));
    EXPECT_EQ(answer.ErrorCode(), row.allowed ? 0 : 105);
    EXPECT_EQ(answer.Header("x-request-error"), "") << "no word for a kind of user";
}

INSTANTIATE_TEST_SUITE_P(
    Rows, AllowUser,
    ::testing::Values(AllowCase{"NormalLocal", "bob", false, R"(["normal.local"])", nullptr, true},
                      AllowCase{"NormalIsNoAdmin", "bob", false, R"(["admin.local"])", nullptr, false},
                      AllowCase{"AdminIsNotNormal", "root2", true, R"(["normal.local"])", nullptr, false},
                      AllowCase{"AdminLocal", "root2", true, R"(["normal.local", "admin.local"])", nullptr, true},
                      AllowCase{"Domain", "DOM\\bob", false, R"(["normal.domain"])", nullptr, true},
                      AllowCase{"DomainIsNotLocal", "DOM\\bob", false, R"(["normal.local"])", nullptr, false},
                      AllowCase{"Ldap", "bob@ldap", false, R"(["normal.ldap"])", nullptr, true},
                      AllowCase{"BackslashComesFirst", "DOM\\bob@ldap", false, R"(["normal.domain"])", nullptr, true},
                      AllowCase{"Absent", "bob", false, nullptr, nullptr, false},
                      AllowCase{"Empty", "bob", false, "[]", nullptr, false},
                      AllowCase{"Text", "bob", false, R"("normal.local")", nullptr, false},
                      AllowCase{"Object", "bob", false, R"({"normal.local": true})", nullptr, false},
                      AllowCase{"Null", "bob", false, "null", nullptr, false},
                      AllowCase{"NoWildCard", "bob", false, R"(["*", "normal.*", "normal"])", nullptr, false},
                      AllowCase{"OtherTypesMatchNobody", "bob", false, R"([1, null, ["normal.local"]])", nullptr,
                                false},
                      AllowCase{"MethodOpensUp", "bob", false, R"(["admin.local"])", R"(["normal.local"])", true},
                      AllowCase{"MethodCloses", "bob", false, R"(["normal.local"])", R"(["admin.local"])", false},
                      AllowCase{"EmptyMethodListCloses", "bob", false, R"(["normal.local"])", "[]", false},
                      AllowCase{"MethodTextCloses", "bob", false, R"(["normal.local"])", R"("normal.local")", false}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(GateTest, AMissingApplicationPrivilegeIs160WithoutAWord) {
    Good()["appPriv"] = "ZOVA.App";
    Install();
    platform.appPrivileges.insert({"alice", "ZOVA.App", "198.51.100.1"});
    const WebAnswer answer = Serve(Session("alice-sid"));
    EXPECT_EQ(answer.ErrorCode(), 160);
    EXPECT_EQ(answer.Header("x-request-error"), "");
    EXPECT_EQ(answer.CallsOf("QLIBAppPrivUserHas"),
              (std::vector<std::string>{"QLIBAppPrivUserHas(alice, ZOVA.App, 192.0.2.7)"}));
}

TEST_F(GateTest, AnEmptyApplicationPrivilegeAsksNobody) {
    Good()["appPriv"] = "";
    Install();
    const WebAnswer answer = Serve(Session("alice-sid"));
    EXPECT_EQ(answer.ErrorCode(), 0);
    EXPECT_TRUE(answer.CallsOf("QLIBAppPrivUserHas").empty());
}

TEST_F(GateTest, AUserNameOfAnyLengthFitsTheBuffer) {
    const std::string name(492, 'n');
    platform.users[name] = {};
    platform.sessions["s"] = {name, 1, 1000, {}};
    const WebAnswer answer = Serve(Session("s"));
    EXPECT_EQ(answer.body["data"]["user"].asString(), name);
}

}  // namespace
