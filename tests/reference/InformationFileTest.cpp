#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <ctime>
#include <vector>

#include "Paths.h"
#include "PrivateDevice.h"
#include "Seam.h"
#include "common/KeyValueText.h"
#include "common/TimedLock.h"

namespace {

const std::string kFile = reference::paths::kDeviceInformation;

std::string ValueOf(const std::string& key) {
    const std::string text = ReadWholeFile(kFile);
    return std::string(reference::FindKeyValue(text, key).value_or("(absent)"));
}

void ExpectNothingBesideIt() {
    EXPECT_FALSE(Exists(reference::paths::kNewDeviceInformation));
}

class InformationFile : public DeviceTest {
protected:
    void TearDown() override { ExpectNothingBesideIt(); }
};

/** Starts a process that sets `key` to the values 0 to `last`. */
pid_t StartWriter(const std::string& key, int last) {
    const pid_t child = fork();
    if (child == 0) {
        for (int at = 0; at <= last; ++at) {
            if (QLIBCINFOSetKeyValue(key.c_str(), std::to_string(at).c_str()) < 0) {
                _exit(1);
            }
        }
        _exit(0);
    }
    return child;
}

int StatusOf(pid_t child) {
    int status = -1;
    return waitpid(child, &status, 0) == child ? status : -1;
}

}  // namespace

TEST_F(InformationFile, KeepsCommentsOrderAndUnknownLines) {
    WriteFile(kFile, "# title\n\nfirst=\"1\"\nbroken=unquoted\n  second = \"x\"\n\tthird=\"3\" \r\n# end");
    ASSERT_GE(QLIBCINFOSetKeyValue("third", "three"), 0);
    ASSERT_GE(QLIBCINFOSetKeyValue("first", ""), 0);
    EXPECT_EQ(ReadWholeFile(kFile),
              "# title\n\nfirst=\"\"\nbroken=unquoted\n  second = \"x\"\n\tthird=\"three\" \r\n# end");
}

TEST_F(InformationFile, GetsANewKeyInALineOfItsOwn) {
    WriteFile(kFile, "#new=\"old\"\nnewer=\"1\"\nnew=unquoted");
    ASSERT_GE(QLIBCINFOSetKeyValue("new", "a b=c#d \xc3\xa9"), 0);
    EXPECT_EQ(ReadWholeFile(kFile), "#new=\"old\"\nnewer=\"1\"\nnew=unquoted\nnew=\"a b=c#d \xc3\xa9\"\n");
    EXPECT_NE(QLIBCFileCheckKeyValue(kFile.c_str(), "new", "a b=c#d \xc3\xa9", 0), 0);
}

TEST_F(InformationFile, ChangesTheLineThatCountsOfSeveralWithOneKey) {
    WriteFile(kFile, "key=\"1\"\nkey=\"2\"\nother=\"x\"\nkey=unquoted\n");
    ASSERT_GE(QLIBCINFOSetKeyValue("key", "3"), 0);
    EXPECT_EQ(ReadWholeFile(kFile), "key=\"1\"\nkey=\"3\"\nother=\"x\"\nkey=unquoted\n");
    EXPECT_EQ(ValueOf("key"), "3");
}

TEST_F(InformationFile, IsMadeReadableForAllIfThereIsNone) {
    const mode_t before = umask(0077);
    EXPECT_GE(QLIBCINFOSetKeyValue("key", "value"), 0);
    umask(before);
    EXPECT_EQ(ReadWholeFile(kFile), "key=\"value\"\n");
    EXPECT_EQ(ModeOf(kFile), 0644u);
}

TEST_F(InformationFile, KeepsOwnerAndMode) {
    WriteFile(kFile, "key=\"1\"\n");
    ASSERT_EQ(chown(kFile.c_str(), 0, kFriendsGid), 0);
    ASSERT_EQ(chmod(kFile.c_str(), 0640), 0);
    ASSERT_GE(QLIBCINFOSetKeyValue("key", "2"), 0);
    struct stat status;
    ASSERT_EQ(stat(kFile.c_str(), &status), 0);
    EXPECT_EQ(status.st_uid, 0u);
    EXPECT_EQ(status.st_gid, kFriendsGid);
    EXPECT_EQ(status.st_mode & 07777u, 0640u);
}

TEST_F(InformationFile, StaysAsItIsOnABadKeyOrValue) {
    const std::string content = "key=\"1\"\n";
    WriteFile(kFile, content);
    for (const std::string& key :
         {std::string(), std::string("a b"), std::string("a=b"), std::string("#key"), std::string("a\nb"),
          std::string("a-b"), std::string("\xc3\xa9"), std::string(129, 'a')}) {
        EXPECT_LT(QLIBCINFOSetKeyValue(key.c_str(), "v"), 0) << key;
    }
    for (const std::string& value : {std::string("a\"b"), std::string("a\nb"), std::string("a\rb"), std::string("a\tb"),
                                     std::string("a\x7f"), std::string(4097, 'a')}) {
        EXPECT_LT(QLIBCINFOSetKeyValue("key", value.c_str()), 0) << value;
    }
    EXPECT_LT(QLIBCINFOSetKeyValue(nullptr, "v"), 0);
    EXPECT_LT(QLIBCINFOSetKeyValue("key", nullptr), 0);
    EXPECT_EQ(ReadWholeFile(kFile), content);
    EXPECT_GE(QLIBCINFOSetKeyValue(std::string(128, 'a').c_str(), std::string(4096, 'a').c_str()), 0);
}

TEST_F(InformationFile, GrowsToTheSizeThatIsReadAndNoFurther) {
    const std::string line = "k=\"\"\n";
    const std::string full = std::string(65536 - line.size() - 1, '#') + "\n";
    WriteFile(kFile, full);
    EXPECT_LT(QLIBCINFOSetKeyValue("k", "1"), 0);
    EXPECT_EQ(ReadWholeFile(kFile), full);
    EXPECT_GE(QLIBCINFOSetKeyValue("k", ""), 0);
    EXPECT_EQ(ValueOf("k"), "");
    const std::string tooLong(65537, '#');
    WriteFile(kFile, tooLong);
    EXPECT_LT(QLIBCINFOSetKeyValue("k", "1"), 0);
    EXPECT_EQ(ReadWholeFile(kFile), tooLong);
}

TEST_F(InformationFile, IsNotChangedWhereItCannotBeTrusted) {
    WriteFile(InRoot("/scratch/target"), "key=\"1\"\n");
    ASSERT_EQ(symlink(InRoot("/scratch/target").c_str(), kFile.c_str()), 0);
    EXPECT_LT(QLIBCINFOSetKeyValue("key", "2"), 0);
    struct stat status;
    ASSERT_EQ(lstat(kFile.c_str(), &status), 0);
    EXPECT_TRUE(S_ISLNK(status.st_mode));
    EXPECT_EQ(ReadWholeFile(InRoot("/scratch/target")), "key=\"1\"\n");
    ASSERT_EQ(unlink(kFile.c_str()), 0);
    WriteFile(kFile, "key=\"1\"\n");
    ASSERT_EQ(chmod(kFile.c_str(), 0666), 0);
    EXPECT_LT(QLIBCINFOSetKeyValue("key", "2"), 0);
    EXPECT_EQ(ReadWholeFile(kFile), "key=\"1\"\n");
}

TEST_F(InformationFile, IsWrittenThroughNoLinkInThePlaceOfTheNewFile) {
    WriteFile(InRoot("/scratch/target"), "precious");
    ASSERT_EQ(symlink(InRoot("/scratch/target").c_str(), reference::paths::kNewDeviceInformation), 0);
    EXPECT_GE(QLIBCINFOSetKeyValue("key", "1"), 0);
    EXPECT_EQ(ValueOf("key"), "1");
    EXPECT_EQ(ReadWholeFile(InRoot("/scratch/target")), "precious");
}

TEST_F(InformationFile, IsSetByRootOnly) {
    WriteFile(kFile, "key=\"1\"\n");
    EXPECT_EQ(StatusOfChild([] {
                  return setresgid(kAliceGid, kAliceGid, kAliceGid) == 0 &&
                                 setresuid(kAliceUid, kAliceUid, kAliceUid) == 0 && QLIBCINFOSetKeyValue("key", "2") < 0
                             ? 0
                             : 1;
              }),
              0);
    EXPECT_EQ(ValueOf("key"), "1");
}

TEST_F(InformationFile, IsGivenUpWhenItsLockIsHeldForTooLong) {
    ASSERT_GE(QLIBCINFOSetKeyValue("key", "1"), 0);
    const reference::UniqueFd lock = reference::TakeTimedLock(reference::paths::kDeviceInformationLock, 0);
    ASSERT_TRUE(lock.IsOpen());
    const time_t begin = time(nullptr);
    EXPECT_LT(QLIBCINFOSetKeyValue("key", "2"), 0);
    EXPECT_LT(time(nullptr) - begin, 60);
    EXPECT_EQ(ValueOf("key"), "1");
}

TEST_F(InformationFile, LosesNothingOfTwentyWritersAtOnce) {
    constexpr int kWriters = 20;
    constexpr int kLast = 9;
    WriteFile(kFile, "# kept\n");
    std::vector<pid_t> writers;
    for (int at = 0; at < kWriters; ++at) {
        writers.push_back(StartWriter("key" + std::to_string(at), kLast));
        writers.push_back(StartWriter("shared", kLast));
    }
    for (const pid_t writer : writers) {
        EXPECT_EQ(StatusOf(writer), 0);
    }
    for (int at = 0; at < kWriters; ++at) {
        EXPECT_EQ(ValueOf("key" + std::to_string(at)), std::to_string(kLast));
    }
    EXPECT_EQ(ValueOf("shared"), std::to_string(kLast));
    const std::string text = ReadWholeFile(kFile);
    EXPECT_EQ(text.compare(0, 7, "# kept\n"), 0);
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), kWriters + 2);
}

TEST_F(InformationFile, IsWholeAfterAWriterWasKilledInTheMiddle) {
    constexpr int kForever = 1000000;
    const std::string before = "# kept\n" + std::string(60000, '#') + "\ncount=\"";
    WriteFile(kFile, before + "0\"\n");
    for (int round = 0; round < 50; ++round) {
        const pid_t writer = StartWriter("count", kForever);
        const struct timespec pause = {0, 1000000 + round * 137000};
        nanosleep(&pause, nullptr);
        ASSERT_EQ(kill(writer, SIGKILL), 0);
        ASSERT_TRUE(WIFSIGNALED(StatusOf(writer)));
        const std::string text = ReadWholeFile(kFile);
        ASSERT_EQ(text.compare(0, before.size(), before), 0);
        ASSERT_EQ(text.compare(text.size() - 2, 2, "\"\n"), 0);
        ASSERT_EQ(ModeOf(kFile), 0600u);
    }
    // The next writer removes what a killed one left beside the file.
    WriteFile(reference::paths::kNewDeviceInformation, "half");
    ASSERT_GE(QLIBCINFOSetKeyValue("count", "done"), 0);
    EXPECT_EQ(ReadWholeFile(kFile), before + "done\"\n");
}
