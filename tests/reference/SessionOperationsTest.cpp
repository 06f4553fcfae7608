#include <sys/stat.h>
#include <unistd.h>

#include <cstring>

#include "SessionFixture.h"

namespace {

using SessionOperations = SessionTest;

int Create(const char* user, const ZovaLoginOptions* options, int sidSize = 65, int tokenSize = 65) {
    char sid[65];
    char token[65];
    return ZovaSessionCreate(user, options, sid, sidSize, token, tokenSize);
}

}  // namespace

TEST_F(SessionOperations, MakesAPrivateFileInAPrivateFolder) {
    const Login login = LogIn();
    EXPECT_EQ(login.sid.size(), 64u);
    EXPECT_EQ(login.token, "");
    EXPECT_EQ(ModeOf(FileOf(login.sid)), 0600u);
    EXPECT_EQ(ModeOf(InRoot("/run/zova/sessions")), 0700u);
    EXPECT_NE(LogIn().sid, login.sid);
}

TEST_F(SessionOperations, RefusesAccountsThatMayHaveNoSession) {
    const ZovaLoginOptions options = {kClient, nullptr, nullptr, 0, 0};
    for (const char* user : {static_cast<const char*>(nullptr), "", "nobodyknows", "root", "otherroot", "system"}) {
        EXPECT_LT(Create(user, &options), 0);
    }
    EXPECT_EQ(Create("alice", &options), 0);
}

TEST_F(SessionOperations, RefusesSmallBuffersAndBadOptions) {
    const std::string longText(256, 'x');
    const ZovaLoginOptions good = {kClient, nullptr, nullptr, 1, 0};
    const ZovaLoginOptions noAddress = {nullptr, nullptr, nullptr, 0, 0};
    const ZovaLoginOptions badAddress = {"somewhere", nullptr, nullptr, 0, 0};
    const ZovaLoginOptions longApp = {kClient, longText.c_str(), nullptr, 0, 0};
    const ZovaLoginOptions splitApp = {kClient, nullptr, "a\nb", 0, 0};
    EXPECT_LT(Create("alice", nullptr), 0);
    EXPECT_LT(Create("alice", &good, 64), 0);
    EXPECT_LT(Create("alice", &good, 65, 64), 0);
    EXPECT_LT(Create("alice", &noAddress), 0);
    EXPECT_LT(Create("alice", &badAddress), 0);
    EXPECT_LT(Create("alice", &longApp), 0);
    EXPECT_LT(Create("alice", &splitApp), 0);
    char sid[65];
    EXPECT_LT(ZovaSessionCreate("alice", &good, sid, sizeof(sid), nullptr, 0), 0);
    EXPECT_LT(ZovaSessionCreate("alice", &good, nullptr, 65, sid, 65), 0);
    EXPECT_EQ(Create("alice", &good), 0);
}

TEST_F(SessionOperations, RefusesAFolderThatIsNotRootsOwnAndPrivate) {
    const ZovaLoginOptions options = {kClient, nullptr, nullptr, 0, 0};
    const std::string folder = InRoot("/run/zova/sessions");
    LogIn();
    ASSERT_EQ(chmod(folder.c_str(), 0755), 0);
    EXPECT_LT(Create("alice", &options), 0);
    ASSERT_EQ(chmod(folder.c_str(), 0700), 0);
    ASSERT_EQ(chown(folder.c_str(), kAliceUid, 0), 0);
    EXPECT_LT(Create("alice", &options), 0);
    ASSERT_EQ(rename(folder.c_str(), InRoot("/run/zova/moved").c_str()), 0);
    ASSERT_EQ(symlink(InRoot("/run/zova/moved").c_str(), folder.c_str()), 0);
    EXPECT_LT(Create("alice", &options), 0);
}

TEST_F(SessionOperations, SweepsSessionsThatEndedLongAgo) {
    const Login old = LogIn();
    const Login late = LogIn();
    const std::string half = InRoot("/run/zova/sessions/.new-0123");
    WriteFile(half, "x");
    MakeOlder(half, 26 * 3600);
    MakeOlder(FileOf(old.sid), 26 * 3600);
    MakeOlder(FileOf(late.sid), 3600);
    LogIn();
    EXPECT_FALSE(Exists(FileOf(old.sid)));
    EXPECT_FALSE(Exists(half));
    EXPECT_TRUE(Exists(FileOf(late.sid)));
}

TEST_F(SessionOperations, NamesTheUserOfASession) {
    const Login login = LogIn("alice", true);
    char user[493] = "before";
    EXPECT_EQ(ZovaSessionUser(login.sid.c_str(), kClient, login.token.c_str(), user, sizeof(user)), 1);
    EXPECT_STREQ(user, "alice");
}

TEST_F(SessionOperations, LeavesTheNameAloneOnARefusal) {
    const Login login = LogIn("alice", true);
    const char* sid = login.sid.c_str();
    const char* token = login.token.c_str();
    char user[493] = "before";
    EXPECT_EQ(ZovaSessionUser(nullptr, kClient, token, user, sizeof(user)), -5);
    EXPECT_EQ(ZovaSessionUser("../x", kClient, token, user, sizeof(user)), -5);
    EXPECT_EQ(ZovaSessionUser(sid, nullptr, token, user, sizeof(user)), -8);
    EXPECT_EQ(ZovaSessionUser(sid, "192.0.2.8", token, user, sizeof(user)), -8);
    EXPECT_EQ(ZovaSessionUser(sid, kClient, nullptr, user, sizeof(user)), -7);
    EXPECT_EQ(ZovaSessionUser(sid, kClient, "x", user, sizeof(user)), -7);
    EXPECT_EQ(ZovaSessionUser(sid, kClient, token, user, 5), -2);
    EXPECT_EQ(ZovaSessionUser(sid, kClient, token, nullptr, 0), -2);
    MakeOlder(FileOf(login.sid), 3600);
    EXPECT_EQ(ZovaSessionUser(sid, kClient, token, user, sizeof(user)), -1);
    EXPECT_STREQ(user, "before");
}

TEST_F(SessionOperations, DoesNotRenewTheIdleTime) {
    const Login login = LogIn();
    MakeOlder(FileOf(login.sid), 600);
    char user[493];
    ASSERT_EQ(ZovaSessionUser(login.sid.c_str(), kClient, nullptr, user, sizeof(user)), 1);
    struct stat status;
    ASSERT_EQ(stat(FileOf(login.sid).c_str(), &status), 0);
    EXPECT_LE(status.st_mtime, time(nullptr) - 600);
}

TEST_F(SessionOperations, EndsASessionOnce) {
    const Login login = LogIn();
    EXPECT_EQ(ZovaSessionRemove(login.sid.c_str()), 0);
    EXPECT_FALSE(Exists(FileOf(login.sid)));
    EXPECT_LT(ZovaSessionRemove(login.sid.c_str()), 0);
    EXPECT_EQ(Record().Check(login.sid), -5);
}

TEST_F(SessionOperations, RemovesNothingOutsideTheStore) {
    LogIn();
    WriteFile(InRoot("/run/zova/victim"), "x");
    for (const char* sid : {static_cast<const char*>(nullptr), "", ".", "../victim", "victim"}) {
        EXPECT_LT(ZovaSessionRemove(sid), 0);
    }
    EXPECT_TRUE(Exists(InRoot("/run/zova/victim")));
}
