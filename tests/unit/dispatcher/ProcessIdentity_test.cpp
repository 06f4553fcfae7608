// Title, thread name and syslog ident of a call.

#include <cstring>
#include <memory>

#include "DeviceTest.h"
#include "dispatcher/APIRunnerPrivate.h"
#include "webapi/Json.h"

using unit::TestRunner;
using ZOVA::APIRunnerPrivate;

namespace {

class ProcessIdentityTest : public unit::DeviceTest {
protected:
    /** The process has started under this command line. */
    void StartAs(const std::string& commandLine) {
        directory.Write("cmdline", commandLine);
        platform.redirects["/proc/self/cmdline"] = directory.Path() + "/cmdline";
    }

    /** A place for the title, with bytes behind it that belong to others. */
    char* Argv0(const std::string& text) {
        std::memset(place, '#', sizeof(place));
        std::memcpy(place, text.c_str(), text.size() + 1);
        return place;
    }

    unit::TemporaryDirectory directory;
    char place[256] = "";
};

struct StartCase {
    const char* name;
    const char* commandLine;
    const char* original;
    const char* process;
};

class StartName : public ProcessIdentityTest, public ::testing::WithParamInterface<StartCase> {};

TEST_P(StartName, IsTakenFromTheCommandLine) {
    StartAs(GetParam().commandLine);
    APIRunnerPrivate identity(nullptr);
    EXPECT_EQ(identity.GetOrigProcName(), GetParam().original);
    EXPECT_EQ(identity.GetProcName(), GetParam().original);
    char* argv[] = {Argv0(GetParam().original), nullptr};
    identity.SetArgs(1, argv);
    EXPECT_EQ(identity.GetOrigProcName(), GetParam().original);
    EXPECT_EQ(identity.GetProcName(), GetParam().process);
}

INSTANTIATE_TEST_SUITE_P(Rows, StartName,
                         ::testing::Values(StartCase{"Path", "/usr/bin/front.cgi", "front.cgi", "front.cgi"},
                                           StartCase{"Bare", "front.cgi", "front.cgi", "front.cgi"},
                                           StartCase{"Arguments", "/usr/bin/front.cgi --x", "front.cgi", "front.cgi"},
                                           StartCase{"DoubleUnderscore", "/x/name__x", "name__x", "name"},
                                           StartCase{"FirstUnderscoreCounts", "/x/a_b__c", "a_b__c", "a"},
                                           StartCase{"SingleUnderscore", "/x/a_b", "a_b", "a_b"}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(ProcessIdentityTest, WithoutACommandLineTheProgramsNameServes) {
    platform.Fail("open", EACCES);
    const APIRunnerPrivate identity(nullptr);
    EXPECT_EQ(identity.GetOrigProcName(), "unit_tests");
}

TEST_F(ProcessIdentityTest, ADoubleUnderscoreNameShowsItsFirstPartAtOnce) {
    StartAs("/x/name__x");
    APIRunnerPrivate identity(nullptr);
    char* argv[] = {Argv0("/x/name__x"), nullptr};
    identity.SetArgs(1, argv);
    EXPECT_STREQ(place, "name");
}

TEST_F(ProcessIdentityTest, NoArgumentsChangeNothing) {
    StartAs("/x/name__x");
    APIRunnerPrivate identity(nullptr);
    char* argv[] = {Argv0("/x/name__x"), nullptr};
    identity.SetArgs(0, argv);
    identity.SetArgv0("other");
    EXPECT_STREQ(place, "/x/name__x");
    EXPECT_EQ(identity.GetProcName(), "name__x");
}

TEST_F(ProcessIdentityTest, ATitleIsCutToTheRoomOfTheFirstArgument) {
    StartAs("/x/p");
    APIRunnerPrivate identity(nullptr);
    char* argv[] = {Argv0("12345678"), nullptr};
    identity.SetArgs(1, argv);
    identity.SetArgv0("a title that is too long");
    EXPECT_STREQ(place, "a title");
    EXPECT_EQ(place[8], '\0') << "the old end";
    EXPECT_EQ(place[9], '#') << "nothing behind it is touched";
    identity.SetArgv0("b");
    EXPECT_EQ(std::string(place, 8), std::string("b\0\0\0\0\0\0\0", 8));
}

TEST_F(ProcessIdentityTest, AnEmptyFirstArgumentTakesNoTitle) {
    StartAs("/x/p");
    APIRunnerPrivate identity(nullptr);
    char* argv[] = {Argv0(""), nullptr};
    identity.SetArgs(1, argv);
    identity.SetArgv0("title");
    EXPECT_EQ(place[0], '\0');
    EXPECT_EQ(place[1], '#');
}

TEST_F(ProcessIdentityTest, TheCallShowsInIdentTitleAndThreadName) {
    StartAs("/x/front.cgi");
    TestRunner runner;
    char* argv[] = {Argv0(std::string(60, 'x')), nullptr};
    runner.SetArgs(1, argv);
    Name(runner, "ZOVA.Core.User", 1, "list");
    platform.calls.clear();
    EXPECT_TRUE(runner.SetProcessName(runner.Request(), runner.Response()));
    EXPECT_STREQ(place, "front.cgi_ZOVA.Core.User_1_list");
    EXPECT_EQ(platform.process.threadName, "ZOVA.Core.User_");
    const std::string options = std::to_string(LOG_PID | LOG_CONS);
    EXPECT_EQ(platform.CallsOf({"closelog", "openlog", "prctl"}),
              (std::vector<std::string>{"closelog()", "openlog(front.cgi_ZOVA.Core.User_1_list, " + options + ", 0)",
                                        "prctl(ZOVA.Core.User_1)"}));
}

TEST_F(ProcessIdentityTest, WithoutArgumentsIdentAndThreadNameFollowTheCallAllTheSame) {
    StartAs("/x/front.cgi");
    TestRunner runner;
    Name(runner, "A", 2, "m");
    EXPECT_TRUE(runner.SetProcessName(runner.Request(), runner.Response()));
    EXPECT_EQ(platform.process.ident, "front.cgi_A_2_m");
    EXPECT_EQ(platform.process.threadName, "A_2_m");
}

TEST_F(ProcessIdentityTest, AnEmptyAPINameAnswers101BeforeAnyTitleChanges) {
    TestRunner runner;
    platform.calls.clear();
    EXPECT_FALSE(runner.SetProcessName(runner.Request(), runner.Response()));
    EXPECT_EQ(runner.Response()->GetError(), 101);
    EXPECT_TRUE(platform.calls.empty());
}

TEST_F(ProcessIdentityTest, ARefusedThreadNameAnswers118AndItsLine) {
    TestRunner runner;
    Name(runner, "A", 1, "m");
    platform.Fail("prctl", EFAULT, 0, 1);
    EXPECT_FALSE(runner.SetProcessName(runner.Request(), runner.Response()));
    ExpectLog(LOG_ERR, "Set process name fail[Bad address]", "ProcessIdentity.cpp");
    EXPECT_EQ(runner.Response()->GetError(), 118);
}

TEST_F(ProcessIdentityTest, TheNamingThatClosesACallNeverCostsItItsAnswer) {
    TestRunner runner;
    platform.Fail("prctl", EFAULT, 1, 1);
    EXPECT_TRUE(CallGood(runner, "success"));
    ExpectLog(LOG_ERR, "Set process name fail[Bad address]", "ProcessIdentity.cpp");
    EXPECT_EQ(runner.Response()->GetError(), 0);
}

TEST_F(ProcessIdentityTest, AnOverlongNameIsCutToTheTitlesBuffer) {
    StartAs("/x/p");
    TestRunner runner;
    Name(runner, std::string(400, 'a'), 1, std::string(2000, 'm'));
    EXPECT_TRUE(runner.SetProcessName(runner.Request(), runner.Response()));
    EXPECT_LT(platform.process.ident.size(), ZOVA::kTitleSize);
    EXPECT_EQ(platform.process.ident.substr(0, 5), "p_aaa");
}

TEST_F(ProcessIdentityTest, TitleIdentAndThreadNameAreBackAfterTheRunner) {
    StartAs("/x/a-rather-long-front.cgi");
    char* argv[] = {Argv0(std::string(60, 'x')), nullptr};
    {
        TestRunner runner;
        runner.SetArgs(1, argv);
        EXPECT_TRUE(CallGood(runner, "success"));
    }
    EXPECT_STREQ(place, "a-rather-long-front.cgi");
    EXPECT_EQ(platform.process.ident, "a-rather-long-front.cgi");
    EXPECT_EQ(platform.CallsOf({"prctl"}).back(), "prctl(a-rather-long-fr)") << "the first 16 characters";
    EXPECT_EQ(platform.process.threadName, "a-rather-long-f");
}

}  // namespace
