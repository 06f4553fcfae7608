#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <iterator>

#include "../../packages/ZOVA.Storage.File/NewThings.h"
#include "../../packages/ZOVA.Storage.File/Placement.h"
#include "../../packages/ZOVA.Storage.File/Places.h"
#include "../../packages/ZOVA.Storage.File/TreeRemoval.h"
#include "Call.h"

namespace {

namespace fs = std::filesystem;
using package::Existing;
using package::UniqueFd;

/** A caller whose only folder is a temporary one. */
class FileTree : public testing::Test {
protected:
    FileTree() {
        std::string pattern = testing::TempDir() + "files-XXXXXX";
        top = fs::canonical(mkdtemp(pattern.data()));
        home = top + "/home";
        fs::create_directories(home + "/sub/deep");
        fs::create_directories(top + "/outside");
        Write(top + "/outside/file", "outside");
        Write(home + "/file", "file");
        caller.folders = {{"home", home, true}};
    }
    ~FileTree() override {
        std::error_code ignored;
        fs::remove_all(top, ignored);
    }

    static void Write(const std::string& path, const std::string& content) {
        std::ofstream(path, std::ios::binary) << content;
    }
    static std::string Content(const std::string& path) {
        std::ifstream file(path, std::ios::binary);
        return {std::istreambuf_iterator<char>(file), {}};
    }
    std::size_t NamesIn(const std::string& path) const {
        return static_cast<std::size_t>(std::distance(fs::directory_iterator(path), fs::directory_iterator()));
    }

    package::FileError Thing(const std::string& path) {
        UniqueFd thing;
        return package::OpenThing(caller, path, O_RDONLY, thing);
    }
    package::FileError SpotAt(const std::string& path) {
        package::Spot spot;
        return package::OpenSpot(caller, path, spot);
    }
    package::FileError TargetAt(const std::string& path) {
        UniqueFd target;
        return package::OpenTarget(caller, path, target);
    }

    package::RemovalState Remove(const std::vector<std::string>& paths) {
        package::RemovalState last;
        package::TreeRemoval([&](const package::RemovalState& state) { last = state; }).Run(caller, paths);
        return last;
    }

    /** Puts a new file with the content in its place. */
    package::Placed Place(const std::string& content, const std::string& name, Existing existing) {
        Write(top + "/part", content);
        const UniqueFd folder(open(home.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
        return package::PlaceFile(folder.Get(), {top + "/part", name, changed}, existing);
    }

    std::string top;
    std::string home;
    package::Caller caller;
    std::optional<std::int64_t> changed;
};

TEST_F(FileTree, IsReachedByPathsWithinAndByNoOther) {
    EXPECT_EQ(Thing(home), package::FILE_OK);
    EXPECT_EQ(Thing(home + "/file"), package::FILE_OK);
    EXPECT_EQ(Thing(home + "/sub/deep"), package::FILE_OK);
    EXPECT_EQ(Thing(home + "/none"), package::FILE_ERR_NOT_FOUND);
    EXPECT_EQ(Thing(home + "/file/x"), package::FILE_ERR_WRONG_KIND);
    EXPECT_EQ(Thing(top + "/outside/file"), package::FILE_ERR_OUTSIDE);
    EXPECT_EQ(Thing(home + "x"), package::FILE_ERR_OUTSIDE);
    EXPECT_EQ(Thing("/"), package::FILE_ERR_OUTSIDE);
    EXPECT_EQ(Thing(home + "/../outside/file"), package::FILE_ERR_BAD_PATH);
    caller.isTableGood = false;
    EXPECT_EQ(Thing(top + "/outside/file"), package::FILE_ERR_TABLE);
}

TEST_F(FileTree, IsLeftByNoLink) {
    fs::create_symlink(top + "/outside", home + "/absolute");
    fs::create_symlink("../outside", home + "/relative");
    fs::create_symlink("/proc/self/fd/0", home + "/magic");
    fs::create_symlink("sub", home + "/inside");
    for (const char* name :
         {"/absolute", "/absolute/file", "/relative", "/relative/file", "/magic", "/inside", "/inside/deep"}) {
        EXPECT_EQ(Thing(home + name), package::FILE_ERR_WRONG_KIND) << name;
    }
    EXPECT_EQ(SpotAt(home + "/relative/new"), package::FILE_ERR_WRONG_KIND);
    EXPECT_EQ(TargetAt(home + "/absolute"), package::FILE_ERR_WRONG_KIND);
    caller.folders[0].path = home + "/inside";
    EXPECT_EQ(Thing(home + "/inside/deep"), package::FILE_ERR_WRONG_KIND);
}

TEST_F(FileTree, InnermostFolderDecidesWhoWrites) {
    caller.folders.push_back({"sub", home + "/sub", false});
    EXPECT_EQ(SpotAt(home + "/new"), package::FILE_OK);
    EXPECT_EQ(SpotAt(home + "/sub/new"), package::FILE_ERR_DENIED);
    EXPECT_EQ(TargetAt(home + "/sub/deep"), package::FILE_ERR_DENIED);
    EXPECT_EQ(SpotAt(home + "/sub"), package::FILE_ERR_TOP_FOLDER);
    EXPECT_EQ(SpotAt(home), package::FILE_ERR_TOP_FOLDER);
    EXPECT_EQ(Thing(home + "/sub/deep"), package::FILE_OK);
}

// ---- removal ----

TEST_F(FileTree, IsRemovedWithoutFollowingLinks) {
    fs::create_symlink(top + "/outside", home + "/sub/link");
    fs::create_symlink(top + "/outside", home + "/link");
    const package::RemovalState state = Remove({home + "/sub", home + "/link", home + "/file"});
    EXPECT_EQ(Json::toString(state.ToJson()), R"({"done":true,"failed":0,"failures":[],"files":3,"folders":2})");
    EXPECT_EQ(NamesIn(home), 0U);
    EXPECT_EQ(Content(top + "/outside/file"), "outside");
}

TEST_F(FileTree, RemovalGoesOnPastWhatCannotBeFound) {
    const package::RemovalState state = Remove({home + "/none", top + "/outside/file", home, home + "/file"});
    EXPECT_EQ(Json::toString(state.failures), R"([{"error":403,"path":")" + home + R"(/none"},{"error":402,"path":")" +
                                                  top + R"(/outside/file"},{"error":409,"path":")" + home + R"("}])");
    EXPECT_EQ(state.files, 1U);
    EXPECT_TRUE(fs::exists(home + "/sub/deep"));
}

TEST_F(FileTree, RemovalTellsTheFirstHundredFailures) {
    const package::RemovalState state = Remove(std::vector<std::string>(150, home + "/none"));
    EXPECT_EQ(state.failed, 150U);
    EXPECT_EQ(state.failures.size(), 100U);
}

// ---- placement ----

TEST_F(FileTree, FileIsPlacedWithItsTimeAndTheRightsOfTheFolder) {
    chmod(home.c_str(), 0750);
    changed = 12345;
    const package::Placed placed = Place("content", "new", Existing::kRefuse);
    EXPECT_EQ(placed.error, package::FILE_OK);
    EXPECT_EQ(placed.size, 7U);
    struct stat status = {};
    ASSERT_EQ(stat((home + "/new").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode, S_IFREG | 0640U);
    EXPECT_EQ(status.st_mtime, 12345);
    EXPECT_EQ(Content(home + "/new"), "content");
    EXPECT_FALSE(fs::exists(top + "/part"));
}

TEST_F(FileTree, FileThatIsThereIsRefusedSkippedOrOverwritten) {
    EXPECT_EQ(Place("new", "file", Existing::kRefuse).error, package::FILE_ERR_EXISTS);
    const package::Placed skipped = Place("new", "file", Existing::kSkip);
    EXPECT_EQ(skipped.error, package::FILE_OK);
    EXPECT_TRUE(skipped.isSkipped);
    EXPECT_EQ(Content(home + "/file"), "file");
    EXPECT_TRUE(fs::exists(top + "/part"));
    EXPECT_EQ(Place("new", "file", Existing::kOverwrite).error, package::FILE_OK);
    EXPECT_EQ(Content(home + "/file"), "new");
    EXPECT_EQ(Place("new", "sub", Existing::kOverwrite).error, package::FILE_ERR_WRONG_KIND);
}

TEST_F(FileTree, OnlyAFileOfOnesOwnIsPlaced) {
    const UniqueFd folder(open(home.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    fs::create_symlink(top + "/outside/file", top + "/soft");
    EXPECT_EQ(package::PlaceFile(folder.Get(), {top + "/soft", "n", {}}, Existing::kRefuse).error,
              package::FILE_ERR_WRONG_KIND);
    ASSERT_EQ(mkfifo((top + "/pipe").c_str(), 0600), 0);
    EXPECT_EQ(package::PlaceFile(folder.Get(), {top + "/pipe", "n", {}}, Existing::kRefuse).error,
              package::FILE_ERR_WRONG_KIND);
    EXPECT_EQ(package::PlaceFile(folder.Get(), {top + "/none", "n", {}}, Existing::kRefuse).error,
              package::FILE_ERR_NOT_FOUND);
    EXPECT_FALSE(fs::exists(home + "/n"));
}

TEST(NewThings, GetTheFoldersRightsButStrangersMayNotWrite) {
    const std::tuple<mode_t, mode_t, mode_t> rows[] = {{0700, 0700, 0600}, {0755, 0755, 0644},  {0777, 0775, 0664},
                                                       {0500, 0700, 0600}, {02770, 0770, 0660}, {01777, 0775, 0664}};
    for (const auto& [above, folder, file] : rows) {
        struct stat status = {};
        status.st_mode = S_IFDIR | above;
        EXPECT_EQ(package::ModeOfNewFolder(status), folder) << std::oct << above;
        EXPECT_EQ(package::ModeOfNewFile(status), file) << std::oct << above;
    }
}

}  // namespace
