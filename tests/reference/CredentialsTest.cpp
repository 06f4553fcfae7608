#include <grp.h>
#include <linux/capability.h>
#include <linux/securebits.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <vector>

#include "PrivateDevice.h"
#include "Seam.h"

namespace {

struct Ids {
    unsigned int real, effective, saved;
    bool operator==(const Ids& other) const {
        return real == other.real && effective == other.effective && saved == other.saved;
    }
};

Ids UserIds() {
    Ids ids{};
    getresuid(&ids.real, &ids.effective, &ids.saved);
    return ids;
}

Ids GroupIds() {
    Ids ids{};
    getresgid(&ids.real, &ids.effective, &ids.saved);
    return ids;
}

std::vector<gid_t> Groups() {
    std::vector<gid_t> groups(static_cast<size_t>(getgroups(0, nullptr)));
    if (getgroups(static_cast<int>(groups.size()), groups.data()) < 0) {
        groups.clear();
    }
    std::sort(groups.begin(), groups.end());
    return groups;
}

/** Groups that none of the accounts has, so that one that stays behind is seen. */
void TakeOddGroups() {
    const gid_t odd[] = {0, 4242, 4243};
    ASSERT_EQ(setgroups(3, odd), 0);
}

bool IsAsBefore() {
    return UserIds() == Ids{0, 0, 0} && GroupIds() == Ids{0, 0, 0} && Groups() == std::vector<gid_t>{0, 4242, 4243};
}

/** Takes a capability away from this process, as a failing system call does it with its right. */
bool DropCapability(unsigned int capability) {
    struct __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
    struct __user_cap_data_struct data[2] = {};
    if (syscall(SYS_capget, &header, data) != 0) {
        return false;
    }
    data[0].effective &= ~(1u << capability);
    return syscall(SYS_capset, &header, data) == 0;
}

}  // namespace

TEST(Credentials, ForGoodAreTheUsersInEveryRespect) {
    EXPECT_EQ(StatusOfChild([] {
                  TakeOddGroups();
                  if (!ResetCredentialsByName("alice", false)) {
                      return 1;
                  }
                  const Ids user{kAliceUid, kAliceUid, kAliceUid};
                  const Ids group{kAliceGid, kAliceGid, kAliceGid};
                  if (!(UserIds() == user) || !(GroupIds() == group)) {
                      return 2;
                  }
                  if (Groups() != std::vector<gid_t>{kAliceGid, kFriendsGid}) {
                      return 3;
                  }
                  const bool regained = seteuid(0) == 0 || setuid(0) == 0 || setegid(0) == 0 || setgid(0) == 0 ||
                                        setgroups(0, nullptr) == 0;
                  return regained ? 4 : 0;
              }),
              0);
}

TEST(Credentials, WithAWayBackKeepTheRealIdAndLeaveRootSaved) {
    EXPECT_EQ(StatusOfChild([] {
                  TakeOddGroups();
                  if (!ResetCredentialsByName("alice", true)) {
                      return 1;
                  }
                  if (!(UserIds() == Ids{0, kAliceUid, 0}) || !(GroupIds() == Ids{0, kAliceGid, 0})) {
                      return 2;
                  }
                  if (Groups() != std::vector<gid_t>{kAliceGid, kFriendsGid}) {
                      return 3;
                  }
                  return setresuid(-1, 0, -1) == 0 && setresgid(-1, 0, -1) == 0 ? 0 : 4;
              }),
              0);
}

TEST(Credentials, WithAWayBackCannotBeSignalledByTheUser) {
    int ready[2];
    ASSERT_EQ(pipe(ready), 0);
    const pid_t target = fork();
    if (target == 0) {
        const bool taken = ResetCredentialsByName("alice", true);
        const bool told = write(ready[1], taken ? "y" : "n", 1) == 1;
        pause();
        _exit(told ? 0 : 1);
    }
    char byte = 0;
    ASSERT_EQ(read(ready[0], &byte, 1), 1);
    EXPECT_EQ(byte, 'y');
    EXPECT_EQ(StatusOfChild([target] {
                  return ResetCredentialsByName("alice", false) && kill(target, SIGTERM) != 0 && errno == EPERM ? 0 : 1;
              }),
              0);
    ASSERT_EQ(kill(target, SIGKILL), 0);
    EXPECT_EQ(waitpid(target, nullptr, 0), target);
    close(ready[0]);
    close(ready[1]);
}

TEST(Credentials, OfSystemAreRootsWithRootsGroups) {
    for (const bool keep : {false, true}) {
        EXPECT_EQ(StatusOfChild([keep] {
                      TakeOddGroups();
                      const bool taken = ResetCredentialsByName("system", keep);
                      const bool root = UserIds() == Ids{0, 0, 0} && GroupIds() == Ids{0, 0, 0};
                      return taken && root && Groups() == std::vector<gid_t>{0} ? 0 : 1;
                  }),
                  0);
    }
}

TEST(Credentials, OfAnUnknownUserChangeNothing) {
    for (const char* user : {static_cast<const char*>(nullptr), "", "nobodyknows", "alice\n", "61001"}) {
        for (const bool keep : {false, true}) {
            EXPECT_EQ(StatusOfChild([user, keep] {
                          TakeOddGroups();
                          return !ResetCredentialsByName(user, keep) && IsAsBefore() ? 0 : 1;
                      }),
                      0);
        }
    }
}

TEST(Credentials, CannotBeTakenWithoutEffectiveRoot) {
    EXPECT_EQ(StatusOfChild([] {
                  if (!ResetCredentialsByName("alice", false)) {
                      return 1;
                  }
                  const Ids before = UserIds();
                  return !ResetCredentialsByName("boss", false) && !ResetCredentialsByName("system", true) &&
                                 !ResetCredentialsByName("alice", true) && UserIds() == before
                             ? 0
                             : 2;
              }),
              0);
}

TEST(Credentials, CanBeTakenAgainAfterTheWayBack) {
    EXPECT_EQ(StatusOfChild([] {
                  if (!ResetCredentialsByName("alice", true) || setresuid(-1, 0, -1) != 0) {
                      return 1;
                  }
                  return ResetCredentialsByName("boss", false) && UserIds() == Ids{61002, 61002, 61002} &&
                                 Groups() == std::vector<gid_t>({61002, kAdministratorsGid})
                             ? 0
                             : 2;
              }),
              0);
}

TEST(Credentials, AreAsBeforeWhereOneOfTheirPartsIsRefused) {
    for (const unsigned int capability : {CAP_SETUID, CAP_SETGID}) {
        for (const bool keep : {false, true}) {
            EXPECT_EQ(StatusOfChild([capability, keep] {
                          TakeOddGroups();
                          if (!DropCapability(capability)) {
                              return 1;
                          }
                          return !ResetCredentialsByName("alice", keep) && IsAsBefore() ? 0 : 2;
                      }),
                      0)
                << capability << keep;
        }
    }
}

TEST(Credentials, AreNotTakenForGoodWhereTheWayBackStaysOpen) {
    EXPECT_EQ(StatusOfChild([] {
                  TakeOddGroups();
                  // With this bit the kernel leaves a process its capabilities when it stops being root.
                  if (prctl(PR_SET_SECUREBITS, SECBIT_NO_SETUID_FIXUP) != 0) {
                      return 1;
                  }
                  return !ResetCredentialsByName("alice", false) && IsAsBefore() ? 0 : 2;
              }),
              0);
}

TEST(Credentials, ByExecutableAreThoseOfTheAccountNamedLikeTheFile) {
    for (const char* path : {"/usr/lib/x/alice.so", "alice.so", "/usr/lib/x/alice"}) {
        EXPECT_EQ(StatusOfChild([path] {
                      TakeOddGroups();
                      return InitCredentialsByExecutable(path, 1) && UserIds() == Ids{0, kAliceUid, 0} &&
                                     GroupIds() == Ids{0, kAliceGid, 0} &&
                                     Groups() == std::vector<gid_t>{kAliceGid, kFriendsGid}
                                 ? 0
                                 : 1;
                  }),
                  0)
            << path;
    }
}

TEST(Credentials, ByExecutableChangeNothingWhereNoAccountHasItsName) {
    for (const char* path : {static_cast<const char*>(nullptr), "", "/usr/lib/x/nobodyknows.so", "/usr/lib/alice/",
                             "/usr/lib/x/system.so", ".so", "/usr/lib/x/alice.b.so"}) {
        EXPECT_EQ(StatusOfChild([path] {
                      TakeOddGroups();
                      return !InitCredentialsByExecutable(path, 1) && IsAsBefore() ? 0 : 1;
                  }),
                  0);
    }
}
