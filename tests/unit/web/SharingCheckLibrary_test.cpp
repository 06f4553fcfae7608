// The project's check: its library, its table, and the hat and identity under which it runs.

#include <algorithm>
#include <cstdlib>

#include "SharingTest.h"

using unit::SharingTest;
using unit::TestWebEntry;
using Row = ZOVA::_tag_API_SHARING_CHECK_TABLE;
using Texts = std::vector<std::string>;

namespace {

constexpr const char* kPath = "/usr/lib/sharing/permission_lib/sharing_check.so";

bool First(ZOVA::APIRequest*, ZOVA::APIResponse*) {
    return true;
}

bool Second(ZOVA::APIRequest*, ZOVA::APIResponse*) {
    return true;
}

class SharingAppCheck : public SharingTest {
protected:
    bool Check(const std::string& method) {
        Prepare(entry, method);
        return entry.CheckSharingAppPermission(entry.Request(), entry.Response());
    }
    Texts Marks() const { return platform.CallsOf({"mark"}); }

    /** The traces of going back to root. */
    void ExpectWayBack() {
        ExpectAuthLog(LOG_INFO, "WARNING: setresgid(0, 0, 0)");
        ExpectAuthLog(LOG_INFO, "WARNING: setresuid(0, 0, 0)");
    }

    TestWebEntry entry;
};

// ---- identity ----

TEST_F(SharingAppCheck, RunsUnderTheIdentityOfItsLibraryAndComesBackGroupFirst) {
    platform.executableIdentities[kPath] = "service";
    platform.process.groups = {0, 4};
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(Marks(), (Texts{"mark(yes as 500/50 in [])"}));
    EXPECT_EQ(platform.CallsOf({"InitCredentialsByExecutable", "mark", "setresgid", "setresuid", "setgroups"}),
              (Texts{std::string("InitCredentialsByExecutable(") + kPath + ", 1)", "mark(yes as 500/50 in [])",
                     "setresgid(0, 0, 0)", "setresuid(0, 0, 0)", "setgroups(0, 4)"}));
    EXPECT_EQ(platform.process.user.Text(), "0/0/0");
    EXPECT_EQ(platform.process.group.Text(), "0/0/0");
    EXPECT_EQ(platform.process.groups, (std::vector<gid_t>{0, 4}));
    ExpectWayBack();
}

TEST_F(SharingAppCheck, RunsAllTheSameWhereNoIdentityBelongsToTheLibrary) {
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(Marks(), (Texts{"mark(yes as 0/0 in [])"}));
    EXPECT_EQ(platform.CountOf("setgroups"), 0) << "the groups have not changed";
    ExpectWayBack();
}

TEST_F(SharingAppCheck, ComesBackToAnIdentityThatIsNotRootsWithoutATrace) {
    platform.process.user = {0, 1000, 0};
    platform.process.group = {0, 100, 0};
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(platform.process.user.Text(), "0/1000/0");
}

TEST_F(SharingAppCheck, LogsAWayBackThatFails) {
    platform.executableIdentities[kPath] = "service";
    platform.Fail("setresgid", EPERM);
    platform.Fail("setresuid", EPERM);
    platform.Fail("setgroups", EPERM, 1);
    EXPECT_TRUE(Check("success")) << "the verdict stands";
    ExpectAuthLog(LOG_ERR, "ERROR: setresgid(0, 0, 0) [Operation not permitted]");
    ExpectAuthLog(LOG_ERR, "ERROR: setresuid(0, 0, 0) [Operation not permitted]");
    ExpectAuthLog(LOG_ERR, "ERROR: setgroups(1) [Operation not permitted]");
}

TEST_F(SharingAppCheck, IsANoWhereTheIdentityCannotBeRead) {
    for (const char* call : {"getresgid", "getresuid"}) {
        platform.StopFailing();
        platform.Fail(call, EFAULT);
        EXPECT_FALSE(Check("success")) << call;
        EXPECT_TRUE(Marks().empty());
        EXPECT_EQ(platform.CountOf("InitCredentialsByExecutable"), 0);
    }
}

// ---- verdicts ----

TEST_F(SharingAppCheck, GivesTheVerdictOfTheFunction) {
    EXPECT_FALSE(Check("refused"));
    EXPECT_EQ(Marks(), (Texts{"mark(no as 0/0 in [])"}));
    ExpectWayBack();
}

TEST_F(SharingAppCheck, TakesAnExceptionForANoAndComesBack) {
    platform.executableIdentities[kPath] = "service";
    EXPECT_FALSE(Check("throws"));
    EXPECT_EQ(platform.process.user.Text(), "0/0/0");
    ExpectLog(LOG_ERR, "the sharing check of sharing_check threw: a check?that fails");
    ExpectWayBack();
    EXPECT_FALSE(Check("throws_int"));
    ExpectLog(LOG_ERR, "the sharing check of sharing_check threw: not a std::exception");
    ExpectWayBack();
}

TEST_F(SharingAppCheck, TakesARowWithoutAFunctionForANo) {
    EXPECT_FALSE(Check("no_function"));
}

TEST_F(SharingAppCheck, IsANoForACallThatNoRowNames) {
    EXPECT_FALSE(Check("no_row"));
    EXPECT_EQ(platform.CountOf("InitCredentialsByExecutable"), 0);
}

// ---- hat ----

class SharingHat : public SharingAppCheck {
protected:
    SharingHat() {
        platform.confined = true;
        setenv("APPARMOR_HAT_ARRAY", R"(["Outer"])", 1);
        platform.process.hats = {"Outer", "SHARING.sharing_check", "DefaultSharingHat"};
        platform.process.hat = "Outer";
        platform.process.hatToken = hatToken;
    }

    /** What the framework takes for its hat token, learnt from an ordinary change. */
    const unsigned long hatToken = static_cast<unsigned long>(getpid()) + 0x5a4f5641;
};

TEST_F(SharingHat, IsThatOfTheProjectAndTheLibraryIsOpenedInIt) {
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(Marks(), (Texts{"mark(yes as 0/0 in [SHARING.sharing_check])"}));
    EXPECT_EQ(platform.CallsOf({"aa_change_hat", "dlopen", "setenv"}),
              (Texts{"aa_change_hat(SHARING.sharing_check)",
                     "setenv(APPARMOR_HAT_ARRAY, [\"Outer\",\"SHARING.sharing_check\"])",
                     std::string("dlopen(") + kPath + ", lazy)", "aa_change_hat(Outer)",
                     "setenv(APPARMOR_HAT_ARRAY, [\"Outer\"])"}));
    EXPECT_EQ(platform.process.hat, "Outer");
    ExpectWayBack();
}

TEST_F(SharingHat, IsTheDefaultOneWhereTheProjectHasNone) {
    platform.process.hats.erase("SHARING.sharing_check");
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(Marks(), (Texts{"mark(yes as 0/0 in [DefaultSharingHat])"}));
    EXPECT_STREQ(getenv("APPARMOR_HAT_ARRAY"), R"(["Outer"])");
    ExpectWayBack();
}

TEST_F(SharingHat, ThatCannotBeEnteredIsANoAndNothingIsOpened) {
    platform.process.hats = {"Outer"};
    EXPECT_FALSE(Check("success"));
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
    EXPECT_EQ(platform.process.hat, "Outer");
    EXPECT_STREQ(getenv("APPARMOR_HAT_ARRAY"), R"(["Outer"])");
    ExpectLog(LOG_ERR, "AppArmor: chagehat failed [No such file or directory]");
}

TEST_F(SharingHat, IsTriedOnceEach) {
    platform.process.hatBusy = 1;
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(Marks(), (Texts{"mark(yes as 0/0 in [DefaultSharingHat])"}));
    EXPECT_EQ(platform.CountOf("sleep"), 0);
    ExpectWayBack();
}

TEST_F(SharingHat, ThatCannotBeLeftIsLogged) {
    platform.Fail("aa_change_hat", EACCES, 1);
    EXPECT_TRUE(Check("success"));
    ExpectWayBack();
    ExpectLog(LOG_ERR, "AppArmor: chagehat [Outer] failed [Permission denied]");
}

TEST_F(SharingHat, OfAnEmptyStackIsLeftForTheOriginalOne) {
    unsetenv("APPARMOR_HAT_ARRAY");
    platform.process.hat = "";
    platform.Fail("aa_change_hat", EACCES, 1);
    EXPECT_TRUE(Check("success"));
    EXPECT_STREQ(getenv("APPARMOR_HAT_ARRAY"), "[]");
    ExpectWayBack();
    ExpectLog(LOG_ERR, "AppArmor: chagehat Original Hat failed [Permission denied]");
}

TEST_F(SharingHat, IsNotEnteredOnASystemWithoutTheRestrictedProfile) {
    platform.confined = false;
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(platform.CountOf("aa_change_hat"), 0);
    EXPECT_EQ(platform.CountOf("setenv"), 0);
    EXPECT_STREQ(getenv("APPARMOR_HAT_ARRAY"), R"(["Outer"])");
    ExpectWayBack();
}

// ---- the library ----

TEST_F(SharingAppCheck, OpensTheLibraryOnceAndClosesItWithTheOthers) {
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(platform.CountOf("dlopen"), 1);
    EXPECT_TRUE(Check("success"));
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
    entry.CloseLib();
    EXPECT_EQ(platform.CountOf("dlclose"), 1);
    ExpectWayBack();
    ExpectWayBack();
}

TEST_F(SharingAppCheck, IsANoWithoutATableFunction) {
    Link().projectName = "good";
    EXPECT_FALSE(Check("success"));
    ExpectLog(LOG_ERR, "Get Sharing Check Table Fail");
    EXPECT_TRUE(std::any_of(platform.process.log.begin(), platform.process.log.end(), [](const fake::LogLine& line) {
        return line.priority == LOG_DEBUG && line.text.find("cannot load sharing check table: ") == 0;
    }));
}

TEST_F(SharingAppCheck, IsANoWithANullTable) {
    Link().projectName = "sharing_null_table";
    EXPECT_FALSE(Check("success"));
    ExpectLog(LOG_ERR, "cannot get sharing check table");
    ExpectLog(LOG_ERR, "Get Sharing Check Table Fail");
}

TEST_F(SharingAppCheck, RefusesArgumentsThatAreMissing) {
    Prepare(entry, "success");
    EXPECT_FALSE(entry.OpenSharingCheckLib(entry.Request(), nullptr));
    ExpectLog(LOG_ERR, "Bad parameters");
    Row* table = nullptr;
    EXPECT_FALSE(entry.GetSharingCheckTableFunc(nullptr, &table));
    EXPECT_FALSE(entry.GetSharingCheckTableFunc(this, nullptr));
}

struct PathCase {
    const char* name;
    const char* project;
    const char* path;
};

class SharingPath : public SharingAppCheck, public ::testing::WithParamInterface<PathCase> {};

TEST_P(SharingPath, FollowsFromTheProjectsName) {
    Link().projectName = GetParam().project;
    Prepare(entry, "success");
    EXPECT_EQ(entry.GetSharingCheckLibPath(entry.Request()), GetParam().path);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, SharingPath,
    ::testing::Values(PathCase{"Plain", "files", "/usr/lib/sharing/permission_lib/files.so"},
                      PathCase{"Dotted", "ZOVA.Files", "/usr/lib/sharing/permission_lib/ZOVA.Files.so"},
                      PathCase{"TwoDots", "..", "/usr/lib/sharing/permission_lib/...so"}, PathCase{"Empty", "", ""},
                      PathCase{"Parent", "../x", ""}, PathCase{"ParentInside", "a/../x", ""},
                      PathCase{"ParentAtTheEnd", "a/../", ""}),
    [](const auto& row) { return std::string(row.param.name); });

// ---- the table ----

using Function = bool (*)(ZOVA::APIRequest*, ZOVA::APIResponse*);

class SharingTable : public SharingAppCheck {
protected:
    SharingTable() { Prepare(entry, "success"); }

    Function Find(std::vector<Row> rows) {
        rows.push_back({nullptr, 0, nullptr, nullptr});
        Function check = nullptr;
        const bool found = entry.GetSharingCheckFunc(entry.Request(), rows.data(), &check);
        EXPECT_EQ(found, check != nullptr);
        return check;
    }
};

TEST_F(SharingTable, RefusesArgumentsThatAreMissing) {
    Row end{nullptr, 0, nullptr, nullptr};
    Function check = nullptr;
    EXPECT_FALSE(entry.GetSharingCheckFunc(nullptr, &end, &check));
    EXPECT_FALSE(entry.GetSharingCheckFunc(entry.Request(), nullptr, &check));
    EXPECT_FALSE(entry.GetSharingCheckFunc(entry.Request(), &end, nullptr));
    for (int i = 0; i < 3; ++i) {
        ExpectLog(LOG_ERR, "bad parameters");
    }
}

TEST_F(SharingTable, IsWalkedInOrderAndTheFirstRowThatFitsWins) {
    EXPECT_EQ(Find({{"*", 0, "*", First}, {"*", 0, "*", Second}}), First);
    EXPECT_EQ(Find({{"Other", 0, "*", First}, {"*", 0, "*", Second}}), Second);
    EXPECT_EQ(Find({{"*", 0, "other", First}, {"*", 0, "*", Second}}), Second);
    EXPECT_EQ(Find({}), nullptr);
}

TEST_F(SharingTable, RowOfVersion0FitsEveryVersionAndOneOfAnotherVersionIsSkipped) {
    EXPECT_EQ(Find({{"*", 2, "*", First}, {"*", 0, "*", Second}}), Second);
    EXPECT_EQ(Find({{"*", 2, "*", First}}), nullptr);
    EXPECT_EQ(Find({{"*", 1, "*", First}}), First);
    entry.Request()->InitParam(unit::J(R"({"getParam": {"version": 2}})"), false);
    EXPECT_EQ(Find({{"*", 2, "*", First}, {"*", 0, "*", Second}}), First);
    EXPECT_EQ(Find({{"*", 0, "*", Second}}), Second);
}

TEST_F(SharingTable, RowWithAnEmptyApiExpressionIsLoggedAndTheWalkGoesOn) {
    EXPECT_EQ(Find({{"", 0, "*", First}, {"*", 0, "*", Second}}), Second);
    ExpectLog(LOG_ERR, "warning: empty api regex in sharing_check");
}

TEST_F(SharingTable, RowWithAnEmptyMethodExpressionIsLoggedAndTheWalkGoesOn) {
    EXPECT_EQ(Find({{"*", 0, "", First}, {"*", 0, nullptr, First}, {"*", 0, "*", Second}}), Second);
    ExpectLog(LOG_ERR, "warning: empty method regex in sharing_check");
    ExpectLog(LOG_ERR, "warning: empty method regex in sharing_check");
}

TEST_F(SharingTable, RowOfAnotherApiOrVersionIsPassedWithoutALineAboutItsMethod) {
    EXPECT_EQ(Find({{"Other", 0, "", First}, {"", 2, "*", First}}), nullptr);
}

struct RegexCase {
    const char* name;
    const char* regex;
    const char* text;
    bool fits;
};

class SharingRegex : public SharingAppCheck, public ::testing::WithParamInterface<RegexCase> {};

TEST_P(SharingRegex, MatchesAnywhereInTheText) {
    EXPECT_EQ(entry.RegexMatch(GetParam().regex, GetParam().text) == 0, GetParam().fits);
}

INSTANTIATE_TEST_SUITE_P(Rows, SharingRegex,
                         ::testing::Values(RegexCase{"Star", "*", "anything", true},
                                           RegexCase{"StarAndNothing", "*", "", true},
                                           RegexCase{"Inside", "Core", "ZOVA.Core.User", true},
                                           RegexCase{"Anchored", "^Core", "ZOVA.Core.User", false},
                                           RegexCase{"Extended", "^(get|list)$", "list", true},
                                           RegexCase{"ExtendedOther", "^(get|list)$", "lists", false},
                                           RegexCase{"UpperCaseDiffers", "Get", "get", false},
                                           RegexCase{"Malformed", "(", "(", false},
                                           RegexCase{"MalformedSet", "[", "[", false}),
                         [](const auto& row) { return std::string(row.param.name); });

}  // namespace
