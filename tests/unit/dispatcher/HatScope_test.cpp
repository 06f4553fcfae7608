#include "dispatcher/HatScope.h"

#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "FrameworkTest.h"

using namespace ZOVA;
using unit::FrameworkTest;

namespace {

class HatScopeTest : public FrameworkTest {
protected:
    HatScopeTest() {
        unsetenv("APPARMOR_HAT_ARRAY");
        platform.confined = true;
        platform.process.hats = {"ZOVA.A.get", "ZOVA.A", "ZOVA.B", "DefaultHat"};
    }

    static std::string Stack() {
        const char* stack = getenv("APPARMOR_HAT_ARRAY");
        return stack == nullptr ? "unset" : stack;
    }

    const std::string& Hat() const { return platform.process.hat; }
};

TEST_F(HatScopeTest, DoesNothingInAnUnconfinedProcess) {
    platform.confined = false;
    { const HatScope scope("ZOVA.A", "get"); }
    EXPECT_EQ(platform.CountOf("aa_change_hat"), 0);
    EXPECT_EQ(platform.CountOf("setenv"), 0);
    EXPECT_EQ(Stack(), "unset");
}

TEST_F(HatScopeTest, EntersTheHatOfTheMethodAndLeavesIt) {
    {
        const HatScope scope("ZOVA.A", "get");
        EXPECT_EQ(Hat(), "ZOVA.A.get");
        EXPECT_EQ(Stack(), R"(["ZOVA.A.get"])");
    }
    EXPECT_EQ(Hat(), "");
    EXPECT_EQ(Stack(), "[]");
    EXPECT_EQ(platform.CallsOf({"aa_change_hat"}),
              (std::vector<std::string>{"aa_change_hat(ZOVA.A.get)", "aa_change_hat(null)"}));
}

TEST_F(HatScopeTest, PutsTheNameOfTheApiOnTheStackWhereTheMethodHasNoHat) {
    const HatScope scope("ZOVA.A", "set");
    EXPECT_EQ(Hat(), "ZOVA.A");
    EXPECT_EQ(Stack(), R"(["ZOVA.A"])");
}

TEST_F(HatScopeTest, FallsBackToTheDefaultHat) {
    const HatScope scope("ZOVA.C", "get");
    EXPECT_EQ(Hat(), "DefaultHat");
    EXPECT_EQ(Stack(), R"(["DefaultHat"])");
    EXPECT_EQ(
        platform.CallsOf({"aa_change_hat"}),
        (std::vector<std::string>{"aa_change_hat(ZOVA.C.get)", "aa_change_hat(ZOVA.C)", "aa_change_hat(DefaultHat)"}));
}

TEST_F(HatScopeTest, GoesOnWithEmptyHatOnTheStackWhereNoHatCanBeEntered) {
    platform.process.hats.clear();
    ExpectLog(LOG_ERR, "AppArmor: chagehat failed [No such file or directory]");
    {
        const HatScope scope("ZOVA.A", "get");
        EXPECT_EQ(Hat(), "");
        EXPECT_EQ(Stack(), R"(["EmptyHat"])");
    }
    ExpectLog(LOG_ERR, "AppArmor: chagehat Original Hat failed [Operation not permitted]");
    EXPECT_EQ(Stack(), "[]");
}

TEST_F(HatScopeTest, ANestedLevelTriesTheHatNamedEmptyHatOnTheWayOutAndLogsTheFailure) {
    platform.process.hats.clear();
    ExpectLog(LOG_ERR, "AppArmor: chagehat failed [No such file or directory]");
    const HatScope outer("ZOVA.A", "get");
    ExpectLog(LOG_ERR, "AppArmor: chagehat failed [No such file or directory]");
    { const HatScope inner("ZOVA.B", "get"); }
    ExpectLog(LOG_ERR, "AppArmor: chagehat [EmptyHat] failed [No such file or directory]");
    EXPECT_EQ(Stack(), R"(["EmptyHat"])");
    EXPECT_EQ(platform.CallsOf({"aa_change_hat"}).back(), "aa_change_hat(EmptyHat)");
    ExpectLog(LOG_ERR, "AppArmor: chagehat Original Hat failed [Operation not permitted]");
    const_cast<HatScope&>(outer).Restore();
}

TEST_F(HatScopeTest, AfterAnInnerCallStackAndHatAreThoseOfTheOuterOne) {
    const HatScope outer("ZOVA.A", "get");
    {
        const HatScope inner("ZOVA.B", "get");
        EXPECT_EQ(Hat(), "ZOVA.B");
        EXPECT_EQ(Stack(), R"(["ZOVA.A.get","ZOVA.B"])");
    }
    EXPECT_EQ(Hat(), "ZOVA.A.get");
    EXPECT_EQ(Stack(), R"(["ZOVA.A.get"])");
}

TEST_F(HatScopeTest, RestoresOnceWhenAskedEarly) {
    HatScope scope("ZOVA.A", "get");
    scope.Restore();
    EXPECT_EQ(Hat(), "");
    scope.Restore();
    EXPECT_EQ(platform.CountOf("aa_change_hat"), 2);
}

TEST_F(HatScopeTest, ReadsTheStackThatAParentLeft) {
    setenv("APPARMOR_HAT_ARRAY", R"(["DefaultHat"])", 1);
    {
        const HatScope scope("ZOVA.A", "get");
        EXPECT_EQ(Stack(), R"(["DefaultHat","ZOVA.A.get"])");
    }
    EXPECT_EQ(Hat(), "DefaultHat");
    EXPECT_EQ(Stack(), R"(["DefaultHat"])");
}

TEST_F(HatScopeTest, AStackThatIsNoJsonArrayCountsAsEmpty) {
    for (const char* stack : {"", "{", "{\"a\":1}", "null", "7", "\"DefaultHat\"", "[\"x\""}) {
        setenv("APPARMOR_HAT_ARRAY", stack, 1);
        {
            const HatScope scope("ZOVA.A", "get");
            EXPECT_EQ(Stack(), R"(["ZOVA.A.get"])") << stack;
        }
        EXPECT_EQ(Hat(), "") << stack;
        EXPECT_EQ(Stack(), "[]") << stack;
    }
}

TEST_F(HatScopeTest, AStackWhoseInnermostNameIsNoTextIsSurvived) {
    setenv("APPARMOR_HAT_ARRAY", R"([{"a":1}])", 1);
    { const HatScope scope("ZOVA.A", "get"); }
    ExpectLog(LOG_ERR, "AppArmor: chagehat [] failed [No such file or directory]");
    EXPECT_EQ(Stack(), R"([{"a":1}])");
}

TEST_F(HatScopeTest, SurvivesAStackThatCannotBeStored) {
    platform.Fail("setenv", ENOMEM);
    { const HatScope scope("ZOVA.A", "get"); }
    EXPECT_EQ(Hat(), "");
}

TEST_F(HatScopeTest, LeavesErrnoAlone) {
    {
        const HatScope scope("ZOVA.A", "get");
        errno = EDOM;
    }
    EXPECT_EQ(errno, EDOM);
}

// ---- ChangeHat ----

TEST_F(HatScopeTest, ChangeHatGivesUpAfterThreeAttemptsAndTwoSecondsOfSleep) {
    platform.process.hatBusy = 10;
    EXPECT_EQ(ChangeHat("ZOVA.A", hatToken), -1);
    EXPECT_EQ(errno, ECHILD);
    EXPECT_EQ(platform.CountOf("aa_change_hat"), 3);
    EXPECT_EQ(platform.process.secondsSlept, 2);
}

TEST_F(HatScopeTest, ChangeHatTriesAgainUntilTheKernelLetsIt) {
    platform.process.hatBusy = 2;
    EXPECT_EQ(ChangeHat("ZOVA.A", hatToken), 0);
    EXPECT_EQ(Hat(), "ZOVA.A");
    EXPECT_EQ(platform.process.secondsSlept, 2);
}

TEST_F(HatScopeTest, ChangeHatDoesNotRepeatAnotherFailure) {
    EXPECT_EQ(ChangeHat("ZOVA.None", hatToken), -1);
    EXPECT_EQ(platform.CountOf("aa_change_hat"), 1);
    EXPECT_EQ(platform.process.secondsSlept, 0);
}

TEST_F(HatScopeTest, ChangeHatTakesASuccessWhateverErrnoHeldBefore) {
    errno = ECHILD;
    EXPECT_EQ(ChangeHat("ZOVA.A", hatToken), 0);
    EXPECT_EQ(platform.CountOf("aa_change_hat"), 1);
}

TEST_F(HatScopeTest, TheTokenIsNotTheSameForEveryProcess) {
    EXPECT_NE(hatToken, 0UL);
    EXPECT_EQ(hatToken - static_cast<unsigned long>(getpid()), 0x5a4f5641UL);
}

}  // namespace
