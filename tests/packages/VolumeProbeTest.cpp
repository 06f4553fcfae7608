#include "../../packages/ZOVA.Core.System/VolumeProbe.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>

namespace {

using std::chrono::milliseconds;

// Under load a child may need a while to be scheduled: long where an answer comes, short where none does.
constexpr milliseconds kLong(30000);
constexpr milliseconds kShort(200);

bool SizeFromName(const char* mountPoint, package::VolumeSize& out) {
    if (std::strcmp(mountPoint, "hang") == 0) {
        for (;;) {
            pause();
        }
    }
    if (std::strcmp(mountPoint, "die") == 0) {
        _exit(3);
    }
    if (std::strcmp(mountPoint, "unreadable") == 0) {
        return false;
    }
    out = {std::strlen(mountPoint), 2, 1};
    return true;
}

std::string Totals(const std::vector<std::string>& mountPoints, milliseconds patience) {
    std::string totals;
    for (const auto& size : package::ProbeVolumes(mountPoints, patience, SizeFromName)) {
        totals += size ? std::to_string(size->total) : "-";
    }
    return totals;
}

TEST(VolumeProbe, GivesTheSizesInOrder) {
    EXPECT_EQ(Totals({"a", "bb", "ccc"}, kLong), "123");
}

TEST(VolumeProbe, HasNothingToAskWithoutVolumes) {
    EXPECT_EQ(Totals({}, kLong), "");
}

TEST(VolumeProbe, SkipsOneThatCannotBeRead) {
    EXPECT_EQ(Totals({"a", "unreadable", "ccc"}, kLong), "1-3");
}

TEST(VolumeProbe, SkipsOneThatHangs) {
    EXPECT_EQ(Totals({"hang", "bb", "ccc"}, milliseconds(2000)), "-23");
}

TEST(VolumeProbe, GivesUpAfterTheSecondThatHangs) {
    EXPECT_EQ(Totals({"hang", "hang", "ccc"}, kShort), "---");
}

TEST(VolumeProbe, GoesOnBehindOneThatEndsTheChild) {
    EXPECT_EQ(Totals({"a", "die", "ccc"}, kLong), "1-3");
}

/** Whether any descriptor of the process, but one pipe, leads to the file that the parent holds open. */
bool SeesParentsFile(const char* path, package::VolumeSize& out) {
    struct stat wanted = {};
    if (stat(path, &wanted) != 0) {
        return false;
    }
    out = {0, 0, 0};
    for (int fd = 0; fd < 256; ++fd) {
        struct stat held = {};
        if (fstat(fd, &held) == 0 && held.st_ino == wanted.st_ino && held.st_dev == wanted.st_dev) {
            ++out.total;
        }
    }
    return true;
}

TEST(VolumeProbe, HoldsNoneOfTheCallersDescriptors) {
    char path[] = "/tmp/volume-probe-XXXXXX";
    const int fd = mkostemp(path, O_CLOEXEC);
    ASSERT_GE(fd, 0);
    const int low = dup(STDOUT_FILENO);
    ASSERT_EQ(dup2(fd, STDOUT_FILENO), STDOUT_FILENO);
    const auto sizes = package::ProbeVolumes({path}, kLong, SeesParentsFile);
    dup2(low, STDOUT_FILENO);
    close(low);
    close(fd);
    unlink(path);
    ASSERT_TRUE(sizes[0].has_value());
    EXPECT_EQ(sizes[0]->total, 0U);
}

TEST(VolumeProbe, LeavesNoDescriptorOpen) {
    const int before = open("/dev/null", O_RDONLY | O_CLOEXEC);
    close(before);
    Totals({"hang", "bb", "die", "ccc"}, milliseconds(2000));
    const int after = open("/dev/null", O_RDONLY | O_CLOEXEC);
    close(after);
    EXPECT_EQ(after, before);
}

TEST(VolumeProbe, ReadsTheSizeOfTheRoot) {
    package::VolumeSize size = {};
    ASSERT_TRUE(package::ReadVolumeSize("/", size));
    EXPECT_GT(size.total, 0U);
    EXPECT_LE(size.free, size.total);
    EXPECT_LE(size.available, size.free);
}

TEST(VolumeProbe, HasNoSizeForWhatIsNoVolume) {
    package::VolumeSize size = {};
    EXPECT_FALSE(package::ReadVolumeSize("/no/such/folder", size));
    EXPECT_FALSE(package::ReadVolumeSize("/proc", size));
}

}  // namespace
