#include "../../packages/ZOVA.Core.System/Mounts.h"

#include <gtest/gtest.h>

namespace {

std::string Rows(const std::string& table) {
    std::string rows;
    for (const package::Mount& mount : package::RealMounts(table)) {
        rows += mount.mountPoint + "|" + mount.device + "|" + mount.type + "\n";
    }
    return rows;
}

TEST(Mounts, KeepsRealFileSystemsOnly) {
    EXPECT_EQ(Rows("22 1 8:1 / / rw,relatime shared:1 - ext4 /dev/sda1 rw\n"
                   "23 22 0:21 / /proc rw - proc proc rw\n"
                   "24 22 0:22 / /run rw shared:2 master:1 - tmpfs tmpfs rw\n"
                   "25 22 0:40 / /mnt/far rw - nfs4 server:/export rw\n"
                   "26 22 0:41 / /mnt/user rw - fuse.sshfs user@server: rw\n"
                   "27 22 253:0 / /volume1 rw - btrfs /dev/mapper/vg1-volume1 rw\n"),
              "/|/dev/sda1|ext4\n/volume1|/dev/mapper/vg1-volume1|btrfs\n");
}

TEST(Mounts, GivesOneRowPerDeviceAtItsRoot) {
    EXPECT_EQ(Rows("30 1 8:1 /etc/hosts /etc/hosts rw - ext4 /dev/sda1 rw\n"
                   "31 1 8:1 / /data rw - ext4 /dev/sda1 rw\n"
                   "32 1 8:1 /sub /a rw - ext4 /dev/sda1 rw\n"),
              "/data|/dev/sda1|ext4\n");
}

TEST(Mounts, GivesOneRowForTheSubVolumesOfOneDevice) {
    EXPECT_EQ(Rows("30 1 0:31 /@ / rw - btrfs /dev/sda2 rw\n"
                   "31 1 0:32 /@home /home rw - btrfs /dev/sda2 rw\n"),
              "/|/dev/sda2|btrfs\n");
}

TEST(Mounts, KeepsFileSystemsWithoutABlockDeviceApart) {
    EXPECT_EQ(Rows("30 1 0:31 / / rw - overlay overlay rw\n"
                   "31 1 0:32 / /other rw - overlay overlay rw\n"),
              "/|overlay|overlay\n/other|overlay|overlay\n");
}

TEST(Mounts, LeavesOutAMountPointThatIsCovered) {
    EXPECT_EQ(Rows("30 1 8:1 / /mnt rw - ext4 /dev/sda1 rw\n"
                   "31 30 0:50 / /mnt rw - tmpfs tmpfs rw\n"),
              "");
}

TEST(Mounts, ResolvesTheKernelsEscapes) {
    EXPECT_EQ(Rows("30 1 8:1 / /mnt/my\\040disk\\134x rw - vfat /dev/sd\\011b rw\n"),
              "/mnt/my disk\\x|/dev/sd\tb|vfat\n");
}

struct BadTable {
    const char* name;
    const char* table;
};

class BadMountLines : public testing::TestWithParam<BadTable> {};

TEST_P(BadMountLines, ArePassedOver) {
    EXPECT_EQ(Rows(std::string(GetParam().table) + "\n40 1 8:1 / /good rw - ext4 /dev/sda1 rw\n"),
              "/good|/dev/sda1|ext4\n");
}

INSTANTIATE_TEST_SUITE_P(Rows, BadMountLines,
                         testing::Values(BadTable{"Empty", ""}, BadTable{"Words", "30 1 8:2"},
                                         BadTable{"NoSeparator", "30 1 8:2 / /x rw ext4 /dev/sdb rw"},
                                         BadTable{"NothingBehindTheSeparator", "30 1 8:2 / /x rw -"},
                                         BadTable{"TypeOnly", "30 1 8:2 / /x rw - ext4"},
                                         BadTable{"Bytes", "\xFF\xFE\x01 - - -"}),
                         [](const testing::TestParamInfo<BadTable>& row) { return std::string(row.param.name); });

TEST(Mounts, KeepsABrokenEscapeAsItStands) {
    EXPECT_EQ(Rows("30 1 8:1 / /a\\04 rw - ext4 /dev/sda1 rw\n"), "/a\\04|/dev/sda1|ext4\n");
    EXPECT_EQ(Rows("30 1 8:1 / /a\\999 rw - ext4 /dev/sda1 rw\n"), "/a\\999|/dev/sda1|ext4\n");
}

}  // namespace
