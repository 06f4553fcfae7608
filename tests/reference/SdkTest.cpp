#include <sys/stat.h>
#include <unistd.h>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/JsonText.h"
#include "zovasdk/AppPrivileges.h"

namespace {

using Directories = DeviceTest;
using PreferenceDirectories = DeviceTest;
using AppPrivileges = DeviceTest;

struct stat StatusOf(const std::string& path) {
    struct stat status = {};
    EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
    return status;
}

}  // namespace

TEST_F(Directories, AreMadeWithParentsAndExactlyTheModeWhateverTheUmask) {
    const mode_t old = umask(0077);
    EXPECT_EQ(ZOVAFSMkdirP(InRoot("/scratch/a/b/c").c_str(), 0, 0, -1, -1, 0771), 0);
    umask(old);
    EXPECT_EQ(ModeOf(InRoot("/scratch/a")), 0755u);
    EXPECT_EQ(ModeOf(InRoot("/scratch/a/b/c")), 0771u);
    EXPECT_EQ(StatusOf(InRoot("/scratch/a/b/c")).st_uid, 0u);
}

TEST_F(Directories, GetTheOwnerAskedFor) {
    EXPECT_EQ(ZOVAFSMkdirP(InRoot("/scratch/d/").c_str(), 0, 1, kAliceUid, kAliceGid, 0600), 0);
    EXPECT_EQ(StatusOf(InRoot("/scratch/d")).st_uid, kAliceUid);
    EXPECT_EQ(StatusOf(InRoot("/scratch/d")).st_gid, kAliceGid);
    EXPECT_EQ(ModeOf(InRoot("/scratch/d")), 0600u);
}

TEST_F(Directories, ThatExistKeepTheirModeOnlyWhenAsked) {
    ASSERT_EQ(ZOVAFSMkdirP(InRoot("/scratch/d").c_str(), 0, 0, -1, -1, 0700), 0);
    EXPECT_EQ(ZOVAFSMkdirP(InRoot("/scratch/d").c_str(), 0, 1, -1, -1, 0777), 0);
    EXPECT_EQ(ModeOf(InRoot("/scratch/d")), 0700u);
    EXPECT_EQ(ZOVAFSMkdirP(InRoot("/scratch/d").c_str(), 0, 0, -1, -1, 0750), 0);
    EXPECT_EQ(ModeOf(InRoot("/scratch/d")), 0750u);
}

TEST_F(Directories, AreRefusedForLinksFilesAndOddPaths) {
    WriteFile(InRoot("/scratch/file"), "");
    ASSERT_EQ(symlink(InRoot("/home").c_str(), InRoot("/scratch/link").c_str()), 0);
    for (const std::string& path :
         {InRoot("/scratch/file"), InRoot("/scratch/file/x"), InRoot("/scratch/link"), InRoot("/scratch/../other/x"),
          InRoot("/scratch/.."), std::string("work/x"), std::string("/"), std::string(), std::string("//")}) {
        EXPECT_LT(ZOVAFSMkdirP(path.c_str(), 0, 0, -1, -1, 0755), 0) << path;
    }
    EXPECT_LT(ZOVAFSMkdirP(nullptr, 0, 0, -1, -1, 0755), 0);
    EXPECT_LT(ZOVAFSMkdirP(InRoot("/scratch/x").c_str(), 0, 0, -1, -1, 0200000), 0);
    EXPECT_FALSE(Exists(InRoot("/scratch/x")));
}

TEST(Users, TellsIdsAndKnowsSystemAsRoot) {
    uid_t uid = 7;
    gid_t gid = 7;
    EXPECT_EQ(ZOVAUserGetUGID("alice", &uid, &gid), 0);
    EXPECT_EQ(uid, kAliceUid);
    EXPECT_EQ(gid, kAliceGid);
    EXPECT_EQ(ZOVAUserGetUGID("system", &uid, &gid), 0);
    EXPECT_EQ(uid, 0u);
    EXPECT_EQ(gid, 0u);
}

TEST(Users, LeavesTheIdsAloneForAnUnknownUser) {
    uid_t uid = 7;
    gid_t gid = 7;
    const std::string longName(100000, 'a');
    for (const char* user : {"nobodyknows", "", "alice\n", "0", longName.c_str()}) {
        EXPECT_NE(ZOVAUserGetUGID(user, &uid, &gid), 0);
    }
    EXPECT_NE(ZOVAUserGetUGID(nullptr, &uid, &gid), 0);
    EXPECT_NE(ZOVAUserGetUGID("alice", nullptr, &gid), 0);
    EXPECT_NE(ZOVAUserGetUGID("alice", &uid, nullptr), 0);
    EXPECT_EQ(uid, 7u);
    EXPECT_EQ(gid, 7u);
}

TEST(Users, AdministratorsAreTheMembersOfTheirGroup) {
    EXPECT_EQ(QLIBGroupIsAdminGroupMem("boss", 0), 1);
    EXPECT_EQ(QLIBGroupIsAdminGroupMem("primaryboss", 0), 1);
    EXPECT_EQ(QLIBGroupIsAdminGroupMem("alice", 0), 0);
    EXPECT_EQ(QLIBGroupIsAdminGroupMem("ghost", 0), 0);
    EXPECT_EQ(QLIBGroupIsAdminGroupMem("", 0), 0);
    EXPECT_LT(QLIBGroupIsAdminGroupMem(nullptr, 0), 0);
}

TEST_F(PreferenceDirectories, OfAUserLiesInTheHomeAndIsTheUsers) {
    char buffer[1024] = "";
    ASSERT_GE(ZOVAUserPreferenceDirGet("alice", buffer, sizeof(buffer)), 0);
    EXPECT_EQ(buffer, InRoot("/home/alice/.zova"));
    EXPECT_EQ(StatusOf(buffer).st_uid, kAliceUid);
    EXPECT_EQ(ModeOf(buffer), 0700u);
    EXPECT_GE(ZOVAUserPreferenceDirGet("alice", buffer, sizeof(buffer)), 0);
    EXPECT_EQ(geteuid(), 0u);
    WriteFile(InRoot("/scratch/roots"), "");
    EXPECT_EQ(StatusOf(InRoot("/scratch/roots")).st_uid, 0u);
}

TEST_F(PreferenceDirectories, OfAUserIsRefusedWhereItCannotBeTheUsers) {
    char buffer[1024] = "before";
    for (const char* user : {"nobodyknows", "", "homeless"}) {
        EXPECT_LT(ZOVAUserPreferenceDirGet(user, buffer, sizeof(buffer)), 0) << user;
    }
    EXPECT_LT(ZOVAUserPreferenceDirGet(nullptr, buffer, sizeof(buffer)), 0);
    EXPECT_LT(ZOVAUserPreferenceDirGet("alice", buffer, 5), 0);
    EXPECT_LT(ZOVAUserPreferenceDirGet("alice", nullptr, 5), 0);
    ASSERT_EQ(symlink(InRoot("/scratch").c_str(), InRoot("/home/boss/.zova").c_str()), 0);
    EXPECT_LT(ZOVAUserPreferenceDirGet("boss", buffer, sizeof(buffer)), 0);
    ASSERT_EQ(mkdir(InRoot("/home/primaryboss/.zova").c_str(), 0700), 0);
    EXPECT_LT(ZOVAUserPreferenceDirGet("primaryboss", buffer, sizeof(buffer)), 0);
    EXPECT_STREQ(buffer, "before");
}

TEST_F(PreferenceDirectories, OfAGroupBelongsToTheGroup) {
    char buffer[1024] = "";
    ASSERT_GE(ZOVAGroupPreferenceDirGet("friends", buffer, sizeof(buffer)), 0);
    EXPECT_EQ(buffer, InRoot("/var/lib/zova/groups/friends"));
    EXPECT_EQ(StatusOf(buffer).st_gid, kFriendsGid);
    EXPECT_EQ(ModeOf(buffer), 0770u);
    for (const char* group : {"nosuchgroup", "", "..", "bad/name"}) {
        EXPECT_LT(ZOVAGroupPreferenceDirGet(group, buffer, sizeof(buffer)), 0) << group;
    }
    EXPECT_LT(ZOVAGroupPreferenceDirGet(nullptr, buffer, sizeof(buffer)), 0);
    EXPECT_LT(ZOVAGroupPreferenceDirGet("friends", buffer, 10), 0);
}

TEST_F(AppPrivileges, WithoutAFileOrAnEntryAreTheAdministrators) {
    EXPECT_EQ(QLIBAppPrivUserHas("alice", "ZOVA.App", "192.0.2.1"), 0);
    EXPECT_NE(QLIBAppPrivUserHas("boss", "ZOVA.App", "192.0.2.1"), 0);
    WriteFile(InRoot("/etc/zova/app-privileges.json"), R"({"Other":{"users":["alice"]}})");
    EXPECT_EQ(QLIBAppPrivUserHas("alice", "ZOVA.App", "192.0.2.1"), 0);
    EXPECT_NE(QLIBAppPrivUserHas("boss", "ZOVA.App", nullptr), 0);
}

TEST_F(AppPrivileges, AreWhatTheEntrySays) {
    WriteFile(InRoot("/etc/zova/app-privileges.json"), R"({
        "ByUser": {"users": ["alice"]},
        "ByGroup": {"groups": ["friends"]},
        "ByAddress": {"users": ["alice"], "addresses": ["10.0.0.0/8", "2001:db8::/32"]},
        "Nobody": {}
    })");
    EXPECT_NE(QLIBAppPrivUserHas("alice", "ByUser", nullptr), 0);
    EXPECT_EQ(QLIBAppPrivUserHas("boss", "ByUser", nullptr), 0);
    EXPECT_NE(QLIBAppPrivUserHas("alice", "ByGroup", "192.0.2.1"), 0);
    EXPECT_EQ(QLIBAppPrivUserHas("primaryboss", "ByGroup", "192.0.2.1"), 0);
    EXPECT_NE(QLIBAppPrivUserHas("alice", "ByAddress", "10.255.0.1"), 0);
    EXPECT_NE(QLIBAppPrivUserHas("alice", "ByAddress", "::ffff:10.0.0.1"), 0);
    EXPECT_NE(QLIBAppPrivUserHas("alice", "ByAddress", "2001:db8:ffff::1"), 0);
    for (const char* address : {static_cast<const char*>(nullptr), "", "11.0.0.1", "2001:db9::1", "x"}) {
        EXPECT_EQ(QLIBAppPrivUserHas("alice", "ByAddress", address), 0);
    }
    EXPECT_EQ(QLIBAppPrivUserHas("boss", "Nobody", nullptr), 0);
    EXPECT_EQ(QLIBAppPrivUserHas("nobodyknows", "ByUser", nullptr), 0);
    EXPECT_EQ(QLIBAppPrivUserHas(nullptr, "ByUser", nullptr), 0);
    EXPECT_EQ(QLIBAppPrivUserHas("alice", nullptr, nullptr), 0);
    EXPECT_EQ(QLIBAppPrivUserHas("alice", "", nullptr), 0);
}

TEST_F(AppPrivileges, OfAFileThatCannotBeTrustedCountForNothing) {
    const std::string path = InRoot("/etc/zova/app-privileges.json");
    for (const char* text : {"", "[]", "{", "null", "{\"P\":[]}", "{\"P\":{\"users\":\"alice\"}}",
                             "{\"P\":{\"users\":[1,null,{}]}}", "{\"P\":{\"users\":[\"alice\"],\"addresses\":1}}"}) {
        WriteFile(path, text);
        EXPECT_EQ(QLIBAppPrivUserHas("alice", "P", "10.0.0.1"), 0) << text;
    }
    WriteFile(path, R"({"P":{"users":["alice"]}})");
    EXPECT_NE(QLIBAppPrivUserHas("alice", "P", "10.0.0.1"), 0);
    ASSERT_EQ(chmod(path.c_str(), 0666), 0);
    EXPECT_EQ(QLIBAppPrivUserHas("alice", "P", "10.0.0.1"), 0);
}

TEST_F(AppPrivileges, RefuseMalformedNetworks) {
    const reference::Account alice = {kAliceUid, kAliceGid, "alice", ""};
    for (const char* network :
         {"", "10.0.0.0/", "10.0.0.0/33", "10.0.0.0/-1", "10.0.0.0/8x", "/8", "10.0.0/8", "::/0", "10.0.0.0/008 "}) {
        Json::Value entry;
        entry["users"].append("alice");
        entry["addresses"].append(network);
        EXPECT_FALSE(reference::PrivilegeAdmits(entry, alice, "10.0.0.1")) << network;
    }
}

TEST(Confinement, IsToldWithoutAnError) {
    // The test runs unconfined, on kernels with AppArmor and without it.
    EXPECT_EQ(ZOVA_aa_has_profile_restricted(), 0);
}

TEST(Users, FindsAUserByIdButNeverRoot) {
    ZovaUserRecord* user = nullptr;
    ASSERT_EQ(ZOVAUserGetByUID(kAliceUid, &user), 0);
    EXPECT_STREQ(user->name, "alice");
    EXPECT_EQ(user->uid, kAliceUid);
    EXPECT_EQ(user->gid, kAliceGid);
    ZOVAUserFree(user);
    ZOVAUserFree(nullptr);
    user = nullptr;
    for (const uid_t none : {static_cast<uid_t>(0), static_cast<uid_t>(4711), static_cast<uid_t>(-1)}) {
        EXPECT_NE(ZOVAUserGetByUID(none, &user), 0) << none;
    }
    EXPECT_NE(ZOVAUserGetByUID(kAliceUid, nullptr), 0);
    EXPECT_EQ(user, nullptr);
}
