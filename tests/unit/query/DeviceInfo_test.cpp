#include <cerrno>

#include "FrameworkTest.h"
#include "webapi/APIUtils.h"

using fake::Ids;
using ZOVA::APIUtils::SetZovaInfo;

namespace {

using Texts = std::vector<std::string>;

class SetZovaInfoTest : public unit::FrameworkTest {
protected:
    void Become(const Ids& user, const Ids& group) {
        platform.process.user = user;
        platform.process.group = group;
    }

    /** Changes of ids, and the write. */
    Texts Steps() const { return platform.CallsOf({"setresuid", "setresgid", "QLIBCINFOSetKeyValue"}); }

    std::string Stored() const {
        const auto file = platform.keyValueFiles.find("/etc/zovainfo.conf");
        return file == platform.keyValueFiles.end() || file->second.count("key") == 0 ? "(none)"
                                                                                      : file->second.at("key");
    }

    void ExpectRefusal() { ExpectLog(LOG_ERR, "ERROR: IF_RUN_AS(0, 0)", "APIUtils", LOG_AUTH); }
    void ExpectNoWayBack(const std::string& ids) {
        ExpectLog(LOG_CRIT, "ERROR: ~IF_RUN_AS(" + ids + ")", "APIUtils", LOG_AUTH);
    }

    const Ids alice{0, 1000, 0};
    const Ids aliceGroup{0, 100, 0};
};

TEST_F(SetZovaInfoTest, RootWritesWithoutAChangeOfIdentity) {
    EXPECT_TRUE(SetZovaInfo("key", "value"));
    EXPECT_EQ(Steps(), (Texts{"QLIBCINFOSetKeyValue(key, value)"}));
    EXPECT_EQ(Stored(), "value");
}

TEST_F(SetZovaInfoTest, AnotherUserBecomesRootForTheWriteUserFirstAndGoesBackGroupFirst) {
    Become(alice, aliceGroup);
    EXPECT_TRUE(SetZovaInfo("key", "value"));
    EXPECT_EQ(Steps(), (Texts{"setresuid(-1, 0, -1)", "setresgid(-1, 0, -1)", "QLIBCINFOSetKeyValue(key, value)",
                              "setresgid(-1, 100, -1)", "setresuid(-1, 1000, -1)"}));
    EXPECT_EQ(platform.process.user, alice);
    EXPECT_EQ(platform.process.group, aliceGroup);
    EXPECT_EQ(Stored(), "value");
    ExpectLog(LOG_INFO, "WARNING: setresuid(-1, 0, -1)", "APIUtils", LOG_AUTH);
}

TEST_F(SetZovaInfoTest, RootInAnotherGroupChangesTheGroupOnly) {
    Become({}, {0, 100, 0});
    EXPECT_TRUE(SetZovaInfo("key", "value"));
    EXPECT_EQ(Steps(), (Texts{"setresgid(-1, 0, -1)", "QLIBCINFOSetKeyValue(key, value)", "setresgid(-1, 100, -1)"}));
}

TEST_F(SetZovaInfoTest, AnotherUserInRootsGroupChangesTheUserOnly) {
    Become(alice, {});
    EXPECT_TRUE(SetZovaInfo("key", "value"));
    EXPECT_EQ(Steps(), (Texts{"setresuid(-1, 0, -1)", "QLIBCINFOSetKeyValue(key, value)", "setresuid(-1, 1000, -1)"}));
}

TEST_F(SetZovaInfoTest, AProcessThatCannotBecomeRootWritesNothing) {
    const Ids lasting{1000, 1000, 1000};
    Become(lasting, {100, 100, 100});
    EXPECT_FALSE(SetZovaInfo("key", "value"));
    EXPECT_EQ(Steps(), (Texts{"setresuid(-1, 0, -1)"}));
    EXPECT_EQ(platform.process.user, lasting);
    ExpectRefusal();
}

TEST_F(SetZovaInfoTest, ARefusedGroupWritesNothingAndGivesTheUserBack) {
    Become(alice, aliceGroup);
    platform.Fail("setresgid", EPERM);
    EXPECT_FALSE(SetZovaInfo("key", "value"));
    EXPECT_EQ(Steps(), (Texts{"setresuid(-1, 0, -1)", "setresgid(-1, 0, -1)", "setresuid(-1, 1000, -1)"}));
    EXPECT_EQ(platform.process.user, alice);
    ExpectRefusal();
}

TEST_F(SetZovaInfoTest, AFailedWriteIsNotLoggedAndTheIdentityIsBack) {
    Become(alice, aliceGroup);
    platform.Fail("QLIBCINFOSetKeyValue", EROFS);
    EXPECT_FALSE(SetZovaInfo("key", "value"));
    EXPECT_EQ(platform.process.user, alice);
    EXPECT_EQ(platform.process.group, aliceGroup);
}

TEST_F(SetZovaInfoTest, AWayBackOfTheGroupThatFailsIsLoggedAndDoesNotChangeTheResult) {
    Become(alice, aliceGroup);
    platform.Fail("setresgid", EPERM, 1);
    EXPECT_TRUE(SetZovaInfo("key", "value"));
    EXPECT_EQ(Stored(), "value");
    ExpectNoWayBack("1000, 100");
}

TEST_F(SetZovaInfoTest, AWayBackOfTheUserThatFailsIsLoggedAndDoesNotChangeTheResult) {
    Become(alice, aliceGroup);
    platform.Fail("setresuid", EPERM, 1);
    EXPECT_TRUE(SetZovaInfo("key", "value"));
    EXPECT_EQ(platform.process.group, aliceGroup);
    ExpectNoWayBack("1000, 100");
}

TEST_F(SetZovaInfoTest, AFailedWriteWithAFailedWayBackIsAFailure) {
    Become(alice, aliceGroup);
    platform.Fail("QLIBCINFOSetKeyValue", EROFS);
    platform.Fail("setresuid", EPERM, 1);
    EXPECT_FALSE(SetZovaInfo("key", "value"));
    ExpectNoWayBack("1000, 100");
}

}  // namespace
