#include "../../packages/common/PrivateFile.h"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <string>

#include "OwnDeviceFolder.h"

namespace {

using package::PrivateFileResult;

constexpr char kName[] = "list.json";
constexpr std::size_t kLimit = 10;

class PrivateFile : public testing::Test {
protected:
    PrivateFileResult Read() { return package::ReadPrivateFile(folder.Path().c_str(), kName, kLimit, content); }
    PrivateFileResult Replace(const std::string& fresh) {
        return package::ReplacePrivateFile(folder.Path().c_str(), kName, fresh);
    }
    static unsigned int ModeOf(const std::string& path) {
        struct stat status = {};
        return lstat(path.c_str(), &status) == 0 ? status.st_mode & 07777U : 0;
    }

    OwnDeviceFolder folder;
    std::string content = "as before";
};

TEST_F(PrivateFile, IsMissingWithoutItsFolderAndInAnEmptyOne) {
    EXPECT_EQ(Read(), PrivateFileResult::kMissing);
    folder.Make();
    EXPECT_EQ(Read(), PrivateFileResult::kMissing);
    EXPECT_EQ(content, "as before");
}

TEST_F(PrivateFile, IsReadUpToTheLimitAndNotBeyond) {
    folder.Put(kName, "0123456789");
    EXPECT_EQ(Read(), PrivateFileResult::kDone);
    EXPECT_EQ(content, "0123456789");
    folder.Put(kName, "0123456789+");
    EXPECT_EQ(Read(), PrivateFileResult::kUntrusted);
    EXPECT_EQ(content, "0123456789");
}

TEST_F(PrivateFile, IsReplacedTogetherWithAMissingFolderForTheOwnerAlone) {
    const mode_t mask = umask(0);
    EXPECT_EQ(Replace("fresh"), PrivateFileResult::kDone);
    umask(0777);
    EXPECT_EQ(Replace("fresher"), PrivateFileResult::kDone);
    umask(mask);
    EXPECT_EQ(folder.Content(kName), "fresher");
    EXPECT_EQ(ModeOf(folder.Path()), 0700U);
    EXPECT_EQ(ModeOf(folder.Path(kName)), 0600U);
    EXPECT_EQ(folder.Names(), kName);
}

TEST_F(PrivateFile, IsAnotherFileAfterItWasReplacedSoThatAReaderKeepsTheOldOne) {
    ASSERT_EQ(Replace("old"), PrivateFileResult::kDone);
    struct stat before = {};
    ASSERT_EQ(stat(folder.Path(kName).c_str(), &before), 0);
    ASSERT_EQ(link(folder.Path(kName).c_str(), folder.Path("kept").c_str()), 0);
    ASSERT_EQ(Replace("fresh"), PrivateFileResult::kDone);
    EXPECT_EQ(folder.Content("kept"), "old");
    EXPECT_EQ(folder.Content(kName), "fresh");
}

TEST_F(PrivateFile, IsNeitherUsedNorReplacedWhenOthersMayReadOrWriteIt) {
    for (const unsigned int mode : {0640U, 0604U, 0620U, 0602U, 0610U}) {
        folder.Put(kName, "old", mode);
        EXPECT_EQ(Read(), PrivateFileResult::kUntrusted) << mode;
        EXPECT_EQ(Replace("fresh"), PrivateFileResult::kUntrusted) << mode;
        EXPECT_EQ(folder.Content(kName), "old") << mode;
    }
    EXPECT_EQ(folder.Names(), kName);
}

TEST_F(PrivateFile, IsNeitherUsedNorReplacedInAFolderThatIsOpenToOthers) {
    folder.Put(kName, "old");
    for (const unsigned int mode : {0750U, 0705U, 0711U, 0770U}) {
        folder.Make(mode);
        EXPECT_EQ(Read(), PrivateFileResult::kUntrusted) << mode;
        EXPECT_EQ(Replace("fresh"), PrivateFileResult::kUntrusted) << mode;
    }
    EXPECT_EQ(folder.Content(kName), "old");
}

TEST_F(PrivateFile, IsNotLookedForBehindALink) {
    folder.Put("other", "secret");
    ASSERT_EQ(symlink("other", folder.Path(kName).c_str()), 0);
    EXPECT_EQ(Read(), PrivateFileResult::kUntrusted);
    EXPECT_EQ(Replace("fresh"), PrivateFileResult::kUntrusted);
    EXPECT_EQ(folder.Content("other"), "secret");
    EXPECT_EQ(content, "as before");
}

TEST_F(PrivateFile, IsNotLookedForInAFolderBehindALink) {
    const std::string real = folder.Path() + "-real";
    ASSERT_EQ(mkdir(real.c_str(), 0700), 0);
    ASSERT_EQ(symlink(real.c_str(), folder.Path().c_str()), 0);
    EXPECT_EQ(Read(), PrivateFileResult::kUntrusted);
    EXPECT_EQ(Replace("fresh"), PrivateFileResult::kUntrusted);
    EXPECT_NE(access((real + "/" + kName).c_str(), F_OK), 0);
}

TEST_F(PrivateFile, IsNoPipeWhichWouldBlockAndNoFolder) {
    folder.Make();
    ASSERT_EQ(mkfifo(folder.Path(kName).c_str(), 0600), 0);
    EXPECT_EQ(Read(), PrivateFileResult::kUntrusted);
    ASSERT_EQ(unlink(folder.Path(kName).c_str()), 0);
    ASSERT_EQ(mkdir(folder.Path(kName).c_str(), 0700), 0);
    EXPECT_EQ(Read(), PrivateFileResult::kUntrusted);
    EXPECT_EQ(Replace("fresh"), PrivateFileResult::kUntrusted);
}

TEST_F(PrivateFile, OfAnotherOwnerIsNeitherUsedNorReplaced) {
    ASSERT_EQ(geteuid(), 0U) << "only root can give a file away";
    folder.Put(kName, "old");
    ASSERT_EQ(chown(folder.Path(kName).c_str(), 1, 1), 0);
    EXPECT_EQ(Read(), PrivateFileResult::kUntrusted);
    EXPECT_EQ(Replace("fresh"), PrivateFileResult::kUntrusted);
    ASSERT_EQ(chown(folder.Path(kName).c_str(), 0, 0), 0);
    ASSERT_EQ(chown(folder.Path().c_str(), 1, 1), 0);
    EXPECT_EQ(Read(), PrivateFileResult::kUntrusted);
}

TEST_F(PrivateFile, StaysAsItWasWhenTheNewContentCannotBeWrittenWhole) {
    folder.Put(kName, "old");
    // As a full disk does: the file can grow to four bytes only.
    rlimit before = {};
    ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &before), 0);
    const auto handler = std::signal(SIGXFSZ, SIG_IGN);
    rlimit small = before;
    small.rlim_cur = 4;
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &small), 0);
    const PrivateFileResult result = Replace("too long for it");
    setrlimit(RLIMIT_FSIZE, &before);
    std::signal(SIGXFSZ, handler);
    EXPECT_EQ(result, PrivateFileResult::kFailed);
    EXPECT_EQ(folder.Content(kName), "old");
    EXPECT_EQ(folder.Names(), kName);
}

}  // namespace
