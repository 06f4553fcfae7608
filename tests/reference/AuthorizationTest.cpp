#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>

#include "SessionFixture.h"

namespace {

using Authorization = SessionTest;

constexpr int kGood = 1;
constexpr int kTimedOut = -1;
constexpr int kBroken = -2;
constexpr int kInterrupted = -3;
constexpr int kUnknown = -5;
constexpr int kNoToken = -7;
constexpr int kOtherAddress = -8;

}  // namespace

TEST_F(Authorization, AcceptsAFreshSessionAndFillsInUserAndFile) {
    const Login login = LogIn();
    Record record;
    EXPECT_EQ(record.Check(login.sid), kGood);
    EXPECT_STREQ(record.user, "alice");
    EXPECT_EQ(record.cgi.sessFile, FileOf(login.sid));
    EXPECT_EQ(record.Check(login.sid), kGood);
}

TEST_F(Authorization, AnswersUnknownToIdsOfAnotherFormAndToOnesNotThere) {
    const Login login = LogIn();
    for (const std::string& sid :
         {std::string(), std::string("x"), "../sessions/" + login.sid, "./" + login.sid, login.sid + "/",
          login.sid + "a", login.sid.substr(1), std::string(64, '0'), std::string(65536, 'a'), std::string(64, '.'),
          InRoot("/run/zova/sessions/") + login.sid, std::string("\xff\xfe\n")}) {
        Record record;
        EXPECT_EQ(record.Check(sid), kUnknown) << sid.substr(0, 80);
        EXPECT_STREQ(record.user, "");
        EXPECT_EQ(record.cgi.sessFile, nullptr);
    }
}

TEST_F(Authorization, RefusesBadArguments) {
    const Login login = LogIn();
    Record record;
    const ZovaCgiAuthOptions options = {kAllFlags, 0};
    char user[493];
    EXPECT_LT(ZovaCgiIsAuthorizedEx(nullptr, login.sid.c_str(), user, sizeof(user), &options, 0), 0);
    EXPECT_LT(ZovaCgiIsAuthorizedEx(&record.cgi, nullptr, user, sizeof(user), &options, 0), 0);
    EXPECT_LT(ZovaCgiIsAuthorizedEx(&record.cgi, login.sid.c_str(), nullptr, sizeof(user), &options, 0), 0);
    EXPECT_LT(ZovaCgiIsAuthorizedEx(&record.cgi, login.sid.c_str(), user, 0, &options, 0), 0);
    EXPECT_LT(ZovaCgiIsAuthorizedEx(&record.cgi, login.sid.c_str(), user, sizeof(user), nullptr, 0), 0);
}

TEST_F(Authorization, RefusesABufferTooSmallForTheName) {
    const Login login = LogIn();
    Record record;
    const ZovaCgiAuthOptions options = {kAllFlags, 0};
    char user[6] = "xxxxx";
    EXPECT_EQ(ZovaCgiIsAuthorizedEx(&record.cgi, login.sid.c_str(), user, 5, &options, 0), kBroken);
    EXPECT_STREQ(user, "");
    EXPECT_EQ(ZovaCgiIsAuthorizedEx(&record.cgi, login.sid.c_str(), user, 6, &options, 0), kGood);
    EXPECT_STREQ(user, "alice");
}

TEST_F(Authorization, RefusesFilesThatAreNotRootsOwnAndPrivate) {
    const Login login = LogIn();
    const std::string file = FileOf(login.sid);
    ASSERT_EQ(chmod(file.c_str(), 0640), 0);
    EXPECT_EQ(Record().Check(login.sid), kBroken);
    ASSERT_EQ(chmod(file.c_str(), 0602), 0);
    EXPECT_EQ(Record().Check(login.sid), kBroken);
    ASSERT_EQ(chmod(file.c_str(), 0600), 0);
    ASSERT_EQ(chown(file.c_str(), kAliceUid, 0), 0);
    EXPECT_EQ(Record().Check(login.sid), kBroken);
    ASSERT_EQ(chown(file.c_str(), 0, 0), 0);
    EXPECT_EQ(Record().Check(login.sid), kGood);
}

TEST_F(Authorization, RefusesLinksPipesAndFolders) {
    const Login login = LogIn();
    const std::string link(64, 'a');
    ASSERT_EQ(symlink(FileOf(login.sid).c_str(), FileOf(link).c_str()), 0);
    const std::string pipe(64, 'b');
    ASSERT_EQ(mkfifo(FileOf(pipe).c_str(), 0600), 0);
    const std::string folder(64, 'c');
    ASSERT_EQ(mkdir(FileOf(folder).c_str(), 0700), 0);
    for (const std::string& sid : {link, pipe, folder}) {
        EXPECT_EQ(Record().Check(sid), kBroken) << sid;
    }
}

TEST_F(Authorization, RefusesEmptyCutForeignAndLongFiles) {
    const Login login = LogIn();
    const std::string good = ReadWholeFile(FileOf(login.sid));
    for (const std::string& text :
         {std::string(), good.substr(0, good.size() / 2), std::string("alice\n"), std::string("[]"),
          std::string(100000, '['), good + good, good + std::string(20000, ' '),
          std::string("\x7f"
                      "ELF\0\0",
                      6)}) {
        WriteFile(FileOf(login.sid), text);
        EXPECT_EQ(Record().Check(login.sid), kBroken) << text.substr(0, 40);
    }
}

TEST_F(Authorization, AnswersTimedOutAfterTheIdleTimeAndKeepsTheFile) {
    const Login login = LogIn();
    MakeOlder(FileOf(login.sid), 15 * 60 - 5);
    EXPECT_EQ(Record().Check(login.sid), kGood);
    MakeOlder(FileOf(login.sid), 15 * 60 + 5);
    EXPECT_EQ(Record().Check(login.sid), kTimedOut);
    EXPECT_TRUE(Exists(FileOf(login.sid)));
    EXPECT_EQ(Record().Check(login.sid, kAllFlags & ~ZOVA_CGI_AUTH_IDLE), kGood);
}

TEST_F(Authorization, LetsATimedOutSessionThroughWithoutBringingItBack) {
    const Login login = LogIn();
    MakeOlder(FileOf(login.sid), 3600);
    EXPECT_EQ(Record().Check(login.sid, kAllFlags, true), kGood);
    EXPECT_EQ(Record().Check(login.sid), kTimedOut);
}

TEST_F(Authorization, RenewsTheIdleTimeOnlyOnSuccessAndOnlyWhenAsked) {
    const Login login = LogIn();
    MakeOlder(FileOf(login.sid), 600);
    EXPECT_EQ(Record().Check(login.sid, kAllFlags & ~ZOVA_CGI_AUTH_REFRESH), kGood);
    {
        const ScopedVariable elsewhere("REMOTE_ADDR", "192.0.2.8");
        EXPECT_EQ(Record().Check(login.sid), kOtherAddress);
    }
    struct stat status;
    ASSERT_EQ(stat(FileOf(login.sid).c_str(), &status), 0);
    EXPECT_LE(status.st_mtime, time(nullptr) - 600);
    EXPECT_EQ(Record().Check(login.sid), kGood);
    ASSERT_EQ(stat(FileOf(login.sid).c_str(), &status), 0);
    EXPECT_GE(status.st_mtime, time(nullptr) - 60);
}

TEST_F(Authorization, TakesTheIdleTimeFromTheDeviceInformation) {
    WriteFile(InRoot("/etc/zovainfo.conf"), "login_idle_minutes=\"60\"\n");
    const Login login = LogIn();
    MakeOlder(FileOf(login.sid), 50 * 60);
    EXPECT_EQ(Record().Check(login.sid), kGood);
    EXPECT_EQ(QLIBCConfGetZELMTimeout(), 60);
}

TEST_F(Authorization, BindsTheSessionToItsAddress) {
    const Login login = LogIn();
    for (const char* address : {static_cast<const char*>(nullptr), "", "192.0.2.8", "not an address"}) {
        const ScopedVariable elsewhere("REMOTE_ADDR", address);
        EXPECT_EQ(Record().Check(login.sid), kOtherAddress);
    }
    const ScopedVariable mapped("REMOTE_ADDR", "::ffff:192.0.2.7");
    EXPECT_EQ(Record().Check(login.sid), kGood);
}

TEST_F(Authorization, ForgetsTheAddressWhereRecordFlagOrSessionSaySo) {
    const Login bound = LogIn();
    const Login free = LogIn("alice", false, true);
    const ScopedVariable elsewhere("REMOTE_ADDR", "192.0.2.8");
    EXPECT_EQ(Record().Check(free.sid), kGood);
    EXPECT_EQ(Record().Check(bound.sid, kAllFlags & ~ZOVA_CGI_AUTH_ADDRESS), kGood);
    Record record;
    record.cgi.skipCheckIP = 1;
    EXPECT_EQ(record.Check(bound.sid), kGood);
    WriteFile(InRoot("/etc/zovainfo.conf"), "skip_ip_checking=\"yes\"\n");
    EXPECT_EQ(Record().Check(bound.sid), kGood);
}

TEST_F(Authorization, AsksForTheTokenOfASessionThatHasOne) {
    const Login login = LogIn("alice", true);
    ASSERT_EQ(login.token.size(), 64u);
    for (const std::string& token : {std::string(), login.token.substr(1), login.token + "0", login.sid}) {
        const ScopedVariable brought("HTTP_X_ZOVA_TOKEN", token.c_str());
        EXPECT_EQ(Record().Check(login.sid), kNoToken) << token;
    }
    {
        const ScopedVariable none("HTTP_X_ZOVA_TOKEN", nullptr);
        EXPECT_EQ(Record().Check(login.sid), kNoToken);
        EXPECT_EQ(Record().Check(login.sid, 15), kGood);
    }
    const ScopedVariable brought("HTTP_X_ZOVA_TOKEN", login.token.c_str());
    EXPECT_EQ(Record().Check(login.sid), kGood);
}

TEST_F(Authorization, AnswersInterruptedWhereTheAccountIsNoLongerInForce) {
    const Login login = LogIn();
    const std::string good = ReadWholeFile(FileOf(login.sid));
    const std::pair<const char*, const char*> accounts[] = {
        {"nobodyknows", "61001"}, {"alice", "61002"}, {"locked", "61004"},
        {"expired", "61005"},     {"root", "0"},      {"system", "61006"},
    };
    for (const auto& [name, uid] : accounts) {
        std::string text = good;
        text.replace(text.find("\"alice\""), 7, std::string("\"").append(name).append("\""));
        text.replace(text.find("61001"), 5, uid);
        WriteFile(FileOf(login.sid), text);
        EXPECT_EQ(Record().Check(login.sid), kInterrupted) << name;
    }
}

TEST_F(Authorization, GivesTheOptionsOfTheSessionOnlyAfterItWasLoaded) {
    const Login login = LogIn("alice", false, true);
    Record record;
    EXPECT_STREQ(ZovaCgiGetOption(&record.cgi, ZOVA_CGI_OPTION_APP, "none"), "none");
    ASSERT_EQ(record.Check(login.sid, kAllFlags & ~ZOVA_CGI_AUTH_LOAD), kGood);
    EXPECT_STREQ(ZovaCgiGetOption(&record.cgi, ZOVA_CGI_OPTION_APP, "none"), "none");
    ASSERT_EQ(record.Check(login.sid), kGood);
    EXPECT_STREQ(ZovaCgiGetOption(&record.cgi, ZOVA_CGI_OPTION_APP, "none"), "app");
    EXPECT_STREQ(ZovaCgiGetOption(&record.cgi, ZOVA_CGI_OPTION_WEBAPI, "none"), "webapi");
    EXPECT_STREQ(ZovaCgiGetOption(&record.cgi, ZOVA_CGI_OPTION_SKIP_CHECK_IP, nullptr), "1");
    EXPECT_STREQ(ZovaCgiGetOption(&record.cgi, ZOVA_CGI_OPTION_TIMEOUT, "0"), "0");
    EXPECT_EQ(ZovaCgiGetOption(&record.cgi, 99, nullptr), nullptr);
    const Login bound = LogIn();
    ASSERT_EQ(record.Check(bound.sid), kGood);
    EXPECT_EQ(ZovaCgiGetOption(&record.cgi, ZOVA_CGI_OPTION_SKIP_CHECK_IP, nullptr), nullptr);
}

TEST_F(Authorization, ASessionsOwnIdleTimeGoesBeforeTheDevices) {
    const Login login = LogIn();
    std::string text = ReadWholeFile(FileOf(login.sid));
    text.replace(text.find("\"timeout\":0"), 11, "\"timeout\":45");
    WriteFile(FileOf(login.sid), text);
    MakeOlder(FileOf(login.sid), 40 * 60);
    Record record;
    ASSERT_EQ(record.Check(login.sid), kGood);
    EXPECT_STREQ(ZovaCgiGetOption(&record.cgi, ZOVA_CGI_OPTION_TIMEOUT, "0"), "45");
    MakeOlder(FileOf(login.sid), 46 * 60);
    EXPECT_EQ(Record().Check(login.sid), kTimedOut);
}

TEST_F(Authorization, TellsTheUserIdOfASession) {
    const Login login = LogIn();
    EXPECT_EQ(ZovaCgiUIDGet(login.sid.c_str()), kAliceUid);
    for (const char* sid : {static_cast<const char*>(nullptr), "", "x", "../etc/passwd"}) {
        EXPECT_EQ(ZovaCgiUIDGet(sid), 4294967295u);
    }
    EXPECT_EQ(ZovaCgiUIDGet(std::string(64, '0').c_str()), 4294967295u);
}

TEST_F(Authorization, TellsTheUserIdOfTheAuthorisedSessionWithoutRightsOnTheStore) {
    const Login login = LogIn();
    const Login other = LogIn("boss");
    ASSERT_EQ(Record().Check(login.sid), kGood);
    EXPECT_EQ(StatusOfChild([&] {
                  if (!ResetCredentialsByName("alice", false)) {
                      return 2;
                  }
                  const bool known = ZovaCgiUIDGet(login.sid.c_str()) == kAliceUid;
                  return known && ZovaCgiUIDGet(other.sid.c_str()) == 4294967295u ? 0 : 1;
              }),
              0);
}
