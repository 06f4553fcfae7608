#include "dispatcher/IdentityScope.h"

#include <cerrno>

#include "FrameworkTest.h"

using namespace ZOVA;
using fake::Ids;
using unit::FrameworkTest;

namespace {

constexpr const char* kGainUser = "WARNING: setresuid(-1, 0, -1)";
constexpr const char* kGainGroup = "WARNING: setresgid(-1, 0, -1)";
constexpr const char* kLostUser = "ERROR: setresuid(-1, 0, -1) [Operation not permitted]";
constexpr const char* kLostGroup = "ERROR: setresgid(-1, 0, -1) [Operation not permitted]";

class IdentityTest : public FrameworkTest {
protected:
    IdentityTest() {
        platform.users["alice"] = {1000, 100, {100, 200}, false};
        platform.users["bob"] = {1001, 101, {101}, false};
    }

    void Become(const Ids& user, const Ids& group, const std::vector<gid_t>& groups) {
        platform.process.user = user;
        platform.process.group = group;
        platform.process.groups = groups;
    }

    fake::FakeProcess& Process() { return platform.process; }
};

class IdentityScopeTest : public IdentityTest {};
class ResetIdentityTest : public IdentityTest {};

// ---- ResetIdentity ----

TEST_F(ResetIdentityTest, TakesGroupsGroupAndUserAndKeepsTheWayBack) {
    ExpectAuthLog(LOG_INFO, kGainUser);
    EXPECT_TRUE(ResetIdentity("alice", true));
    EXPECT_EQ(Process().user, (Ids{0, 1000, 0}));
    EXPECT_EQ(Process().group, (Ids{0, 100, 0}));
    EXPECT_EQ(Process().groups, (std::vector<gid_t>{100, 200}));
}

TEST_F(ResetIdentityTest, ClosesTheWayBackForGoodWithoutKeep) {
    ExpectAuthLog(LOG_INFO, kGainUser);
    EXPECT_TRUE(ResetIdentity("alice", false));
    EXPECT_EQ(Process().user, (Ids{1000, 1000, 1000}));
    EXPECT_EQ(Process().group, (Ids{100, 100, 100}));
    EXPECT_EQ(Process().groups, (std::vector<gid_t>{100, 200}));
    EXPECT_EQ(Process().SetUser(0, 0, 0), -1);
}

TEST_F(ResetIdentityTest, ProvesThatTheWayBackIsClosed) {
    ExpectAuthLog(LOG_INFO, kGainUser);
    ASSERT_TRUE(ResetIdentity("alice", false));
    const std::vector<std::string> asked = platform.CallsOf({"ResetCredentialsByName", "getresuid", "getresgid"});
    EXPECT_EQ(asked,
              (std::vector<std::string>{"ResetCredentialsByName(alice, for good)", "getresuid()", "getresgid()"}));
}

TEST_F(ResetIdentityTest, FailsWhereTheClosedWayBackCannotBeProved) {
    for (const char* call : {"getresuid", "getresgid"}) {
        Become({}, {}, {0});
        platform.StopFailing();
        platform.Fail(call, EFAULT);
        ExpectAuthLog(LOG_INFO, kGainUser);
        EXPECT_FALSE(ResetIdentity("alice", false)) << call;
    }
}

TEST_F(ResetIdentityTest, FailsForAnUnknownUser) {
    ExpectAuthLog(LOG_INFO, kGainUser);
    EXPECT_FALSE(ResetIdentity("nobody-here", true));
    ExpectAuthLog(LOG_INFO, kGainUser);
    EXPECT_FALSE(ResetIdentity("", false));
}

TEST_F(ResetIdentityTest, AnIdentityTakenInPartIsNone) {
    for (const auto part : {fake::BreakCredentials::kAfterGroups, fake::BreakCredentials::kAfterGroup}) {
        Become({}, {}, {0});
        platform.breakCredentials = part;
        ExpectAuthLog(LOG_INFO, kGainUser);
        EXPECT_FALSE(ResetIdentity("alice", true));
    }
}

TEST_F(ResetIdentityTest, AProcessThatIsThatUserAlreadyNeedsNoRoot) {
    Become({1000, 1000, 1000}, {100, 100, 100}, {100, 200});
    ExpectAuthLog(LOG_ERR, kLostUser);
    EXPECT_TRUE(ResetIdentity("alice", false));
    EXPECT_EQ(platform.CountOf("ResetCredentialsByName"), 0);
}

TEST_F(ResetIdentityTest, AnotherUserCannotBeTakenWithoutRoot) {
    Become({1001, 1001, 1001}, {101, 101, 101}, {101});
    ExpectAuthLog(LOG_ERR, kLostUser);
    EXPECT_FALSE(ResetIdentity("alice", true));
    EXPECT_EQ(platform.CountOf("ResetCredentialsByName"), 1);
    EXPECT_EQ(Process().user, (Ids{1001, 1001, 1001}));
}

TEST_F(ResetIdentityTest, TheRightUserInTheWrongGroupIsNotThatUser) {
    Become({1000, 1000, 1000}, {101, 101, 101}, {100, 200});
    ExpectAuthLog(LOG_ERR, kLostUser);
    EXPECT_FALSE(ResetIdentity("alice", true));
}

TEST_F(ResetIdentityTest, AWayBackThatIsStillOpenIsNoLastingIdentity) {
    Become({0, 1000, 0}, {0, 100, 0}, {100, 200});
    platform.Fail("setresuid", EPERM);
    ExpectAuthLog(LOG_ERR, kLostUser);
    EXPECT_FALSE(ResetIdentity("alice", false));
}

TEST_F(ResetIdentityTest, GainsRootFirstFromAnotherUser) {
    Become({0, 1001, 0}, {0, 101, 0}, {101});
    ExpectAuthLog(LOG_INFO, kGainUser);
    EXPECT_TRUE(ResetIdentity("alice", true));
    EXPECT_EQ(Process().user, (Ids{0, 1000, 0}));
}

// ---- IdentityScope ----

TEST_F(IdentityScopeTest, RestoresUserGroupAndSupplementaryGroups) {
    Become({}, {}, {0, 4});
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    ExpectAuthLog(LOG_INFO, kGainUser);
    ASSERT_TRUE(ResetIdentity("alice", true));
    scope.Restore();
    ExpectAuthLog(LOG_INFO, kGainGroup);
    ExpectAuthLog(LOG_INFO, kGainUser);
    ExpectAuthLog(LOG_INFO, "WARNING: setresgid(0, 0, 0)");
    ExpectAuthLog(LOG_INFO, "WARNING: setresuid(0, 0, 0)");
    EXPECT_EQ(Process().user, Ids{});
    EXPECT_EQ(Process().group, Ids{});
    EXPECT_EQ(Process().groups, (std::vector<gid_t>{0, 4}));
}

TEST_F(IdentityScopeTest, AnIdentityThatWasNotEffectiveRootIsRestoredWithoutATraceOfRoot) {
    Become({0, 33, 0}, {0, 33, 0}, {33});
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    ExpectAuthLog(LOG_INFO, kGainUser);
    ASSERT_TRUE(ResetIdentity("alice", true));
    scope.Restore();
    ExpectAuthLog(LOG_INFO, kGainGroup);
    ExpectAuthLog(LOG_INFO, kGainUser);
    EXPECT_EQ(Process().user, (Ids{0, 33, 0}));
    EXPECT_EQ(Process().group, (Ids{0, 33, 0}));
    EXPECT_EQ(Process().groups, (std::vector<gid_t>{33}));
    EXPECT_EQ(platform.process.log.size(), 3U);
}

TEST_F(IdentityScopeTest, DoesNotRestoreByItself) {
    {
        IdentityScope scope;
        ASSERT_TRUE(scope.Save());
        ExpectAuthLog(LOG_INFO, kGainUser);
        ASSERT_TRUE(ResetIdentity("alice", false));
    }
    EXPECT_EQ(Process().user, (Ids{1000, 1000, 1000}));
}

TEST_F(IdentityScopeTest, CannotBeSavedWhereTheIdentityCannotBeRead) {
    for (const char* call : {"getresuid", "getresgid", "getgroups"}) {
        platform.StopFailing();
        platform.Fail(call, EFAULT);
        IdentityScope scope;
        EXPECT_FALSE(scope.Save()) << call;
    }
}

TEST_F(IdentityScopeTest, Nests) {
    Become({0, 33, 0}, {0, 33, 0}, {33});
    IdentityScope outer;
    ASSERT_TRUE(outer.Save());
    ASSERT_TRUE(ResetIdentity("bob", true));
    IdentityScope inner;
    ASSERT_TRUE(inner.Save());
    ASSERT_TRUE(ResetIdentity("alice", true));
    inner.Restore();
    EXPECT_EQ(Process().user, (Ids{0, 1001, 0}));
    EXPECT_EQ(Process().groups, (std::vector<gid_t>{101}));
    outer.Restore();
    EXPECT_EQ(Process().user, (Ids{0, 33, 0}));
    EXPECT_EQ(Process().groups, (std::vector<gid_t>{33}));
}

TEST_F(IdentityScopeTest, ARefusedGroupIsLoggedTwiceAndUserIsLeftToTheLastStep) {
    Become({0, 1000, 0}, {0, 100, 0}, {100});
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    platform.Fail("setresgid", EPERM, 0, 1);
    scope.Restore();
    ExpectAuthLog(LOG_ERR, kLostGroup);
    ExpectLog(LOG_ERR, "set eid to root failed [Operation not permitted]");
    EXPECT_EQ(platform.CallsOf({"setresuid", "setresgid"}),
              (std::vector<std::string>{"setresgid(-1, 0, -1)", "setresgid(0, 100, 0)", "setresuid(0, 1000, 0)"}));
}

TEST_F(IdentityScopeTest, ARefusedUserIsLoggedTwiceAndTheRestIsTriedAllTheSame) {
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    ExpectAuthLog(LOG_INFO, kGainUser);
    ASSERT_TRUE(ResetIdentity("alice", true));
    platform.Fail("setresuid", EPERM);
    scope.Restore();
    ExpectAuthLog(LOG_INFO, kGainGroup);
    ExpectAuthLog(LOG_ERR, kLostUser);
    ExpectLog(LOG_ERR, "set eid to root failed [Operation not permitted]");
    ExpectAuthLog(LOG_INFO, "WARNING: setresgid(0, 0, 0)");
    ExpectAuthLog(LOG_ERR, "ERROR: setresuid(0, 0, 0) [Operation not permitted]");
    EXPECT_EQ(Process().user, (Ids{0, 1000, 0}));
}

TEST_F(IdentityScopeTest, RefusedSupplementaryGroupsAreLogged) {
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    platform.Fail("setgroups", EPERM);
    scope.Restore();
    ExpectAuthLog(LOG_ERR, "ERROR: setgroups(1) [Operation not permitted]");
    ExpectAuthLog(LOG_INFO, "WARNING: setresgid(0, 0, 0)");
    ExpectAuthLog(LOG_INFO, "WARNING: setresuid(0, 0, 0)");
}

TEST_F(IdentityScopeTest, RefusedSavedIdsAreLogged) {
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    platform.Fail("setresgid", EPERM);
    platform.Fail("setresuid", EPERM);
    scope.Restore();
    ExpectAuthLog(LOG_ERR, "ERROR: setresgid(0, 0, 0) [Operation not permitted]");
    ExpectAuthLog(LOG_ERR, "ERROR: setresuid(0, 0, 0) [Operation not permitted]");
}

// ---- effective root ----

TEST_F(IdentityScopeTest, EffectiveRootLeavesRealAndSavedIdsUntouchedAndATrace) {
    Become({0, 1000, 0}, {0, 100, 0}, {100});
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    EXPECT_TRUE(scope.BecomeEffectiveRoot());
    ExpectAuthLog(LOG_INFO, kGainGroup);
    ExpectAuthLog(LOG_INFO, kGainUser);
    EXPECT_EQ(Process().user, Ids{});
    EXPECT_EQ(Process().group, Ids{});
    EXPECT_EQ(platform.CallsOf({"setresuid", "setresgid"}),
              (std::vector<std::string>{"setresgid(-1, 0, -1)", "setresuid(-1, 0, -1)"}));
}

TEST_F(IdentityScopeTest, EffectiveRootNeedsNothingWhereItIsThereAlready) {
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    EXPECT_TRUE(scope.BecomeEffectiveRoot());
    EXPECT_TRUE(platform.CallsOf({"setresuid", "setresgid"}).empty());
}

TEST_F(IdentityScopeTest, EffectiveRootIsRefusedWithALineForGroupAndForUser) {
    Become({1000, 1000, 1000}, {0, 100, 0}, {100});
    IdentityScope scope;
    ASSERT_TRUE(scope.Save());
    EXPECT_FALSE(scope.BecomeEffectiveRoot());
    ExpectAuthLog(LOG_INFO, kGainGroup);
    ExpectAuthLog(LOG_ERR, kLostUser);

    Become({1000, 1000, 1000}, {100, 100, 100}, {100});
    ASSERT_TRUE(scope.Save());
    EXPECT_FALSE(scope.BecomeEffectiveRoot());
    ExpectAuthLog(LOG_ERR, kLostGroup);
    EXPECT_EQ(platform.CallsOf({"setresuid"}).size(), 1U);
}

}  // namespace
