#pragma once

#include <json/value.h>
#include <sys/stat.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "../common/UniqueFd.h"

namespace package {

/** What is looked for, and where. */
struct SearchOrder {
    /** The folder, open for reading, and the path by which the user named it. */
    UniqueFd folder;
    std::string path;
    /** Shell pattern for the name of what is found. */
    std::string pattern;
    /** What a found file must hold; "" for anything, which then need not be a file. */
    std::string content;
};

/** How far a search is. */
struct SearchState {
    /** The first paths found; the others are only counted. */
    std::vector<std::string> found;
    std::uint64_t foundCount = 0;
    std::uint64_t files = 0;
    std::uint64_t folders = 0;
    /** Sum of the sizes of the files. */
    std::uint64_t bytes = 0;
    /** Folders and files that could not be looked into, and folders of other file systems. */
    std::uint64_t skipped = 0;
    /** How much of the tree is done, from 0 to 1, estimated by its upper levels. */
    double share = 0;
    bool done = false;

    /** "found", "found_count", "files", "folders", "bytes", "skipped", "share", "done". */
    Json::Value ToJson() const;
};

/**
 * One walk through a folder and all below it, on its own file system. Links are never followed: what they lead to is
 * found where it lies, or not at all.
 */
class TreeSearch {
public:
    /** `report` is called at the begin of the search, every half second, and at its end. `order` must outlive it. */
    TreeSearch(const SearchOrder& order, std::function<void(const SearchState&)> report);

    void Run();

private:
    struct Level {
        UniqueFd folder;
        std::string path;
        /** Folders in it that are still to be walked. */
        std::vector<std::string> folders;
        /** How much of the whole one of them is. */
        double share = 0;
    };

    void Enter(UniqueFd folder, const std::string& path, double share);
    void EnterNext();
    void ReadLevel(Level& level);
    void Look(Level& level, const char* name);
    bool Matches(const Level& level, const char* name, const struct stat& status);
    void Found(const std::string& path);
    void ReportIfDue();
    void Report();

    const SearchOrder& order;
    std::function<void(const SearchState&)> report;
    SearchState state;
    std::vector<Level> levels;
    dev_t device = 0;
    std::size_t foundBytes = 0;
    std::int64_t reportedAt = 0;
};

}  // namespace package
