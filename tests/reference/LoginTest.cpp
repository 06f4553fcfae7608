#include <sys/stat.h>
#include <unistd.h>

#include <ctime>

#include "PrivateDevice.h"
#include "Seam.h"
#include "login/LoginFailures.h"

using reference::FailureCount;

namespace {

constexpr const char* kClient = "192.0.2.7";
constexpr const char* kUnixService = "auth required pam_unix.so\naccount required pam_unix.so\n";

class Login : public DeviceTest {
protected:
    void SetUp() override {
        DeviceTest::SetUp();
        WriteFile(InRoot("/etc/pam.d/zova-webapi"), kUnixService);
    }

    static std::string CountOf(const std::string& file) {
        return ReadWholeFile(InRoot("/run/zova/login-failures/") + file);
    }
    /** "alice" in hex. */
    static constexpr const char* kAliceFile = "account-616c696365";
    /** `kClient`, mapped into IPv6, in hex. */
    static constexpr const char* kClientFile = "address-00000000000000000000ffffc0000207";
};

}  // namespace

TEST_F(Login, AcceptsTheRightPassword) {
    EXPECT_EQ(ZovaLoginCheckPassword("alice", kPassword, kClient), ZOVA_LOGIN_OK);
    EXPECT_EQ(ZovaLoginCheckPassword("boss", kPassword, nullptr), ZOVA_LOGIN_OK);
    EXPECT_EQ(ModeOf(InRoot("/run/zova/login-failures")), 0700u);
}

TEST_F(Login, RefusesEveryOtherReasonAlikeAndAfterTheSameTime) {
    const std::pair<const char*, const char*> attempts[] = {
        {"alice", "wrong"}, {"nobodyknows", kPassword}, {"locked", kPassword}, {"expired", kPassword}, {"root", ""},
    };
    for (const auto& [user, password] : attempts) {
        struct timespec before;
        struct timespec after;
        clock_gettime(CLOCK_MONOTONIC, &before);
        EXPECT_EQ(ZovaLoginCheckPassword(user, password, nullptr), ZOVA_LOGIN_REFUSED) << user;
        clock_gettime(CLOCK_MONOTONIC, &after);
        const double seconds = static_cast<double>(after.tv_sec - before.tv_sec) +
                               static_cast<double>(after.tv_nsec - before.tv_nsec) * 1e-9;
        EXPECT_GE(seconds, 1.0) << user;
    }
}

TEST_F(Login, RefusesRootUnderAnyNameWithTheRightPassword) {
    EXPECT_EQ(ZovaLoginCheckPassword("otherroot", kPassword, kClient), ZOVA_LOGIN_REFUSED);
    EXPECT_EQ(ZovaLoginCheckPassword("system", kPassword, kClient), ZOVA_LOGIN_REFUSED);
}

TEST_F(Login, RefusesNamesAndPasswordsOfAnotherFormWithoutAskingPam) {
    const std::string longName(121, 'a');
    const std::string longPassword(1025, 'a');
    EXPECT_EQ(ZovaLoginCheckPassword(nullptr, kPassword, kClient), ZOVA_LOGIN_REFUSED);
    EXPECT_EQ(ZovaLoginCheckPassword("alice", nullptr, kClient), ZOVA_LOGIN_REFUSED);
    for (const char* user : {"", "alice\n", "../alice", "a:b", longName.c_str()}) {
        EXPECT_EQ(ZovaLoginCheckPassword(user, kPassword, kClient), ZOVA_LOGIN_REFUSED);
    }
    EXPECT_EQ(ZovaLoginCheckPassword("alice", longPassword.c_str(), kClient), ZOVA_LOGIN_REFUSED);
    EXPECT_FALSE(Exists(InRoot("/run/zova/login-failures")));
}

TEST_F(Login, BlocksAnAccountAfterFiveFailuresAlsoForTheRightPassword) {
    for (int i = 0; i < 5; ++i) {
        const std::string address = "192.0.2." + std::to_string(100 + i);
        ASSERT_EQ(ZovaLoginCheckPassword("alice", "wrong", address.c_str()), ZOVA_LOGIN_REFUSED);
    }
    EXPECT_EQ(ZovaLoginCheckPassword("alice", kPassword, "192.0.2.200"), ZOVA_LOGIN_BLOCKED);
    EXPECT_EQ(ZovaLoginCheckPassword("boss", kPassword, "192.0.2.200"), ZOVA_LOGIN_OK);
}

TEST_F(Login, BlocksAnAddressAfterFiveFailuresOfAnyAccounts) {
    for (int i = 0; i < 5; ++i) {
        const std::string user = "guess" + std::to_string(i);
        ASSERT_EQ(ZovaLoginCheckPassword(user.c_str(), "wrong", kClient), ZOVA_LOGIN_REFUSED);
    }
    EXPECT_EQ(ZovaLoginCheckPassword("alice", kPassword, kClient), ZOVA_LOGIN_BLOCKED);
    EXPECT_EQ(ZovaLoginCheckPassword("alice", kPassword, "192.0.2.8"), ZOVA_LOGIN_OK);
}

TEST_F(Login, ASuccessClearsTheAccountButNotTheAddress) {
    for (int i = 0; i < 2; ++i) {
        ASSERT_EQ(ZovaLoginCheckPassword("alice", "wrong", kClient), ZOVA_LOGIN_REFUSED);
    }
    EXPECT_EQ(CountOf(kAliceFile).substr(0, 2), "2 ");
    ASSERT_EQ(ZovaLoginCheckPassword("alice", kPassword, kClient), ZOVA_LOGIN_OK);
    EXPECT_EQ(CountOf(kAliceFile), "");
    EXPECT_EQ(CountOf(kClientFile).substr(0, 2), "2 ");
}

TEST_F(Login, FallsBackToTheSystemsServiceForOthers) {
    ASSERT_EQ(rename(InRoot("/etc/pam.d/zova-webapi").c_str(), InRoot("/etc/pam.d/other").c_str()), 0);
    EXPECT_EQ(ZovaLoginCheckPassword("alice", kPassword, kClient), ZOVA_LOGIN_OK);
    EXPECT_EQ(ZovaLoginCheckPassword("alice", "wrong", kClient), ZOVA_LOGIN_REFUSED);
}

TEST_F(Login, NeverAcceptsWithoutAUsableService) {
    // In children, since the PAM library keeps memory of a module that it could not open.
    const auto attempt = [] { return ZovaLoginCheckPassword("alice", kPassword, nullptr); };
    for (const char* service : {"auth required pam_no_such_module.so\n", "", "auth\n", "auth required pam_deny.so\n"}) {
        WriteFile(InRoot("/etc/pam.d/zova-webapi"), service);
        EXPECT_EQ(StatusOfChild(attempt), ZOVA_LOGIN_REFUSED) << service;
    }
    ASSERT_EQ(unlink(InRoot("/etc/pam.d/zova-webapi").c_str()), 0);
    EXPECT_NE(StatusOfChild(attempt), ZOVA_LOGIN_OK);
}

TEST_F(Login, FailsWhereAttemptsCannotBeCounted) {
    ASSERT_EQ(mkdir(InRoot("/run/zova").c_str(), 0755), 0);
    ASSERT_EQ(mkdir(InRoot("/run/zova/login-failures").c_str(), 0777), 0);
    ASSERT_EQ(chmod(InRoot("/run/zova/login-failures").c_str(), 0777), 0);
    EXPECT_EQ(ZovaLoginCheckPassword("alice", kPassword, kClient), ZOVA_LOGIN_FAILED);
}

TEST(FailureCount, BlocksAtTheLimitForTheBlockTime) {
    FailureCount count;
    for (int i = 0; i < 5; ++i) {
        EXPECT_FALSE(count.IsBlocked(1000));
        count.Charge(1000);
    }
    EXPECT_TRUE(count.IsBlocked(1000));
    EXPECT_TRUE(count.IsBlocked(1599));
    EXPECT_FALSE(count.IsBlocked(1600));
    count.Charge(1600);
    EXPECT_EQ(count.attempts, 1);
    EXPECT_FALSE(count.IsBlocked(1600));
}

TEST(FailureCount, ForgetsAfterTheWindow) {
    FailureCount count;
    for (int i = 0; i < 4; ++i) {
        count.Charge(1000);
    }
    count.Charge(1601);
    EXPECT_EQ(count.attempts, 1);
    count.Charge(1602);
    EXPECT_EQ(count.attempts, 2);
}

TEST(FailureCount, ARefundBelowTheLimitUnblocks) {
    FailureCount count;
    for (int i = 0; i < 5; ++i) {
        count.Charge(1000);
    }
    count.Refund();
    EXPECT_FALSE(count.IsBlocked(1000));
    for (int i = 0; i < 9; ++i) {
        count.Refund();
    }
    EXPECT_EQ(count.attempts, 0);
}

TEST(FailureCount, ReadsBackItsTextAndTakesOthersAsNone) {
    FailureCount count;
    count.Charge(12345);
    EXPECT_EQ(FailureCount::Parse(count.Text()).since, 12345);
    for (const char* text : {"", "x", "5 2", "5 2 3", "-5 2 3\n", "5 -2 3\n", "99999999999 1 1\n", "5 2 3 \n"}) {
        EXPECT_EQ(FailureCount::Parse(text).attempts, 0) << text;
    }
}

TEST_F(Login, ManyAttemptsAtOnceGetNoMoreTriesThanTheLimit) {
    const reference::LoginFailures failures("alice", "client");
    int allowed = 0;
    for (int i = 0; i < 20; ++i) {
        allowed += failures.Charge() == reference::LoginFailures::Result::kMayTry ? 1 : 0;
    }
    EXPECT_EQ(allowed, 5);
}

TEST_F(Login, TwoSuccessesAtOnceBothCount) {
    const reference::LoginFailures failures("alice", "client");
    ASSERT_EQ(failures.Charge(), reference::LoginFailures::Result::kMayTry);
    ASSERT_EQ(failures.Charge(), reference::LoginFailures::Result::kMayTry);
    EXPECT_TRUE(failures.Succeed());
    EXPECT_TRUE(failures.Succeed());
    EXPECT_EQ(CountOf("address-client").substr(0, 2), "0 ");
    EXPECT_FALSE(Exists(InRoot("/run/zova/login-failures/") + kAliceFile));
}

TEST_F(Login, ACheckThatCouldNotBeMadeIsTakenBack) {
    const reference::LoginFailures failures("alice", "client");
    for (int i = 0; i < 20; ++i) {
        ASSERT_EQ(failures.Charge(), reference::LoginFailures::Result::kMayTry);
        ASSERT_TRUE(failures.TakeBack());
    }
}

TEST_F(Login, CountsThatBlockNobodyAnyMoreAreSwept) {
    ASSERT_EQ(reference::LoginFailures("alice", "first").Charge(), reference::LoginFailures::Result::kMayTry);
    const std::string half = InRoot("/run/zova/login-failures/.new-0123");
    WriteFile(half, "x");
    MakeOlder(half, 1300);
    MakeOlder(InRoot("/run/zova/login-failures/address-first"), 1300);
    ASSERT_EQ(reference::LoginFailures("boss", "second").Charge(), reference::LoginFailures::Result::kMayTry);
    EXPECT_FALSE(Exists(half));
    EXPECT_FALSE(Exists(InRoot("/run/zova/login-failures/address-first")));
    EXPECT_TRUE(Exists(InRoot("/run/zova/login-failures/") + kAliceFile));
}
