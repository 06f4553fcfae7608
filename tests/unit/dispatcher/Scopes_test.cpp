// The guards that put process state back, each alone.

#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <iostream>

#include "ChildRun.h"
#include "FrameworkTest.h"
#include "dispatcher/DirectoryScope.h"
#include "dispatcher/NiceScope.h"
#include "dispatcher/StreamScope.h"

using namespace ZOVA;
using unit::FrameworkTest;

namespace {

// ---- nice value ----

class NiceScopeTest : public FrameworkTest {};

TEST_F(NiceScopeTest, GivesTheOldValueBackAtTheEndOfItsScope) {
    platform.process.nice = 2;
    {
        const NiceScope scope(5);
        EXPECT_EQ(platform.process.nice, 5);
    }
    EXPECT_EQ(platform.process.nice, 2);
    EXPECT_EQ(platform.CallsOf({"getpriority", "setpriority"}),
              (std::vector<std::string>{"getpriority()", "setpriority(5)", "setpriority(2)"}));
}

TEST_F(NiceScopeTest, ChangesNothingWhereTheValueIsRightAlready) {
    platform.process.nice = 5;
    { const NiceScope scope(5); }
    EXPECT_EQ(platform.CountOf("setpriority"), 0);
}

TEST_F(NiceScopeTest, RestoresOnceWhenAskedEarly) {
    NiceScope scope(5);
    scope.Restore();
    EXPECT_EQ(platform.process.nice, 0);
    scope.Restore();
    EXPECT_EQ(platform.CountOf("setpriority"), 2);
}

TEST_F(NiceScopeTest, Nests) {
    const NiceScope outer(3);
    {
        const NiceScope inner(-2);
        EXPECT_EQ(platform.process.nice, -2);
    }
    EXPECT_EQ(platform.process.nice, 3);
}

TEST_F(NiceScopeTest, IgnoresARefusedChangeAndLeavesErrnoAlone) {
    platform.Fail("setpriority", EACCES);
    {
        NiceScope scope(5);
        errno = EDOM;
    }
    EXPECT_EQ(errno, EDOM);
    EXPECT_EQ(platform.process.nice, 0);
}

TEST_F(NiceScopeTest, LeavesTheValueAloneWhereItCannotBeRead) {
    platform.process.nice = 4;
    platform.Fail("getpriority", ESRCH);
    { const NiceScope scope(5); }
    EXPECT_EQ(platform.process.nice, 4);
}

// ---- working directory ----

class DirectoryScopeTest : public FrameworkTest {
protected:
    DirectoryScopeTest() { home = Current(); }
    ~DirectoryScopeTest() override {
        const fake::Suspended suspended;
        EXPECT_EQ(chdir(home.c_str()), 0);
    }

    static std::string Current() {
        const fake::Suspended suspended;
        char* path = getcwd(nullptr, 0);
        const std::string text = path == nullptr ? "" : path;
        free(path);
        return text;
    }

    std::string home;
};

TEST_F(DirectoryScopeTest, GoesBackAtTheEndOfItsScope) {
    {
        DirectoryScope scope;
        scope.Save();
        ASSERT_EQ(chdir("/"), 0);
    }
    EXPECT_EQ(Current(), home);
}

TEST_F(DirectoryScopeTest, GoesNowhereWhereNothingWasSaved) {
    { DirectoryScope scope; }
    EXPECT_EQ(platform.CountOf("chdir"), 0);
}

TEST_F(DirectoryScopeTest, RestoresOnceWhenAskedEarly) {
    DirectoryScope scope;
    scope.Save();
    ASSERT_EQ(chdir("/"), 0);
    scope.Restore();
    EXPECT_EQ(Current(), home);
    ASSERT_EQ(chdir("/"), 0);
    scope.Restore();
    EXPECT_EQ(Current(), "/");
}

TEST_F(DirectoryScopeTest, Nests) {
    const unit::TemporaryDirectory middle;
    DirectoryScope outer;
    outer.Save();
    ASSERT_EQ(chdir(middle.Path().c_str()), 0);
    {
        DirectoryScope inner;
        inner.Save();
        ASSERT_EQ(chdir("/"), 0);
    }
    EXPECT_EQ(Current(), middle.Path());
    outer.Restore();
    EXPECT_EQ(Current(), home);
}

TEST_F(DirectoryScopeTest, StaysWhereItIsWhenTheDirectoryCannotBeNamed) {
    platform.Fail("getcwd", ENOENT);
    {
        DirectoryScope scope;
        scope.Save();
        ASSERT_EQ(chdir("/"), 0);
    }
    EXPECT_EQ(Current(), "/");
}

TEST_F(DirectoryScopeTest, LeavesErrnoAloneWhenTheWayBackIsRefused) {
    platform.Fail("chdir", EACCES);
    {
        DirectoryScope scope;
        scope.Save();
        errno = EDOM;
    }
    EXPECT_EQ(errno, EDOM);
}

// ---- stream objects ----

class StreamScopeTest : public FrameworkTest {
protected:
    ~StreamScopeTest() override {
        EXPECT_EQ(std::cin.rdbuf(), input);
        EXPECT_EQ(std::cout.rdbuf(), output);
        std::cin.clear();
        std::cout.clear();
    }

    std::streambuf* input = std::cin.rdbuf();
    std::streambuf* output = std::cout.rdbuf();
};

TEST_F(StreamScopeTest, GivesEndOfFileAndNothingBehindTheOutput) {
    const StreamScope scope(false, false);
    EXPECT_EQ(std::cin.get(), std::char_traits<char>::eof());
    std::cout << "into nothing" << std::flush;
    EXPECT_TRUE(std::cout.good());
    EXPECT_NE(std::cin.rdbuf(), input);
    EXPECT_NE(std::cout.rdbuf(), output);
}

TEST_F(StreamScopeTest, KeepsTheStreamsThatAMethodIsGranted) {
    {
        const StreamScope scope(true, false);
        EXPECT_EQ(std::cin.rdbuf(), input);
        EXPECT_NE(std::cout.rdbuf(), output);
    }
    const StreamScope scope(false, true);
    EXPECT_NE(std::cin.rdbuf(), input);
    EXPECT_EQ(std::cout.rdbuf(), output);
}

TEST_F(StreamScopeTest, OpensNothingForStreamsThatStay) {
    const StreamScope scope(true, true);
    EXPECT_EQ(platform.CountOf("open"), 0);
}

TEST_F(StreamScopeTest, OpensTheNullDeviceClosedOverExec) {
    const StreamScope scope(false, false);
    EXPECT_EQ(platform.CallsOf({"open"}), (std::vector<std::string>{"open(/dev/null)", "open(/dev/null)"}));
}

TEST_F(StreamScopeTest, RestoresWhenAskedEarly) {
    StreamScope scope(false, false);
    scope.CloseFiles();
    scope.Restore();
    EXPECT_EQ(std::cin.rdbuf(), input);
    EXPECT_EQ(std::cout.rdbuf(), output);
}

TEST_F(StreamScopeTest, Nests) {
    const StreamScope outer(false, false);
    std::streambuf* const middle = std::cin.rdbuf();
    {
        const StreamScope inner(false, false);
        EXPECT_NE(std::cin.rdbuf(), middle);
    }
    EXPECT_EQ(std::cin.rdbuf(), middle);
}

TEST_F(StreamScopeTest, SwitchesTheStreamsAlsoWhenTheNullDeviceCannotBeOpened) {
    platform.Fail("open", EMFILE);
    {
        const StreamScope scope(false, false);
        EXPECT_NE(std::cin.rdbuf(), input);
        EXPECT_EQ(std::cin.get(), std::char_traits<char>::eof());
        std::cout << "into nothing" << std::flush;
    }
    EXPECT_TRUE(std::cin.good());
    EXPECT_TRUE(std::cout.good());
}

TEST_F(StreamScopeTest, LeavesNoStreamStateOfTheMethodBehind) {
    {
        const StreamScope scope(false, false);
        std::cin.setstate(std::ios::failbit | std::ios::eofbit);
        std::cout.setstate(std::ios::badbit);
    }
    EXPECT_TRUE(std::cin.good());
    EXPECT_TRUE(std::cout.good());
}

TEST_F(StreamScopeTest, GivesTheStreamsTheirOldStatesBack) {
    std::cin.setstate(std::ios::eofbit);
    std::cout.setstate(std::ios::failbit);
    { const StreamScope scope(false, false); }
    EXPECT_EQ(std::cin.rdstate(), std::ios::eofbit);
    EXPECT_EQ(std::cout.rdstate(), std::ios::failbit);
}

TEST_F(StreamScopeTest, ClosesTheDescriptorsItOpened) {
    const Json::Value before = unit::Snapshot()["descriptors"];
    {
        StreamScope scope(false, false);
        scope.CloseFiles();
        EXPECT_EQ(unit::Snapshot()["descriptors"], before);
    }
    EXPECT_EQ(unit::Snapshot()["descriptors"], before);
}

TEST_F(StreamScopeTest, LeavesErrnoAlone) {
    {
        const StreamScope scope(false, false);
        errno = EDOM;
    }
    EXPECT_EQ(errno, EDOM);
}

}  // namespace
