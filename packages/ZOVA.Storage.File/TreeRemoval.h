#pragma once

#include <json/value.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "FileErrors.h"
#include "FolderNames.h"
#include "Places.h"

namespace package {

/** How far a removal is. */
struct RemovalState {
    /** What was removed, links and the like among the files. */
    std::uint64_t files = 0;
    std::uint64_t folders = 0;
    /** What could not be, the folders that hold it not among them. */
    std::uint64_t failed = 0;
    /** The first of what could not be, with the error numbers. */
    Json::Value failures{Json::arrayValue};
    bool done = false;

    /** "files", "folders", "failed", "failures", "done". */
    Json::Value ToJson() const;
};

/**
 * Removes things with all that is in them. Links are removed and never followed, and what is mounted in a folder stays.
 * What somebody else adds or swaps meanwhile is removed or fails, and nothing outside is touched.
 */
class TreeRemoval {
public:
    /** `report` is called at the begin, every half second, and at the end. */
    explicit TreeRemoval(std::function<void(const RemovalState&)> report);

    /** @param paths in the caller's folders. */
    void Run(const Caller& caller, const std::vector<std::string>& paths);

private:
    struct Level {
        FolderNames names;
        /** How the folder above knows it. */
        std::string name;
        std::string path;
        /** Whether something in it stays, so that it stays too. */
        bool keeps = false;
        /** How often its names were read. */
        int rounds = 0;
    };

    void RemoveTree(const Spot& spot, const std::string& path);
    /** Removes what is no folder, and goes into a folder. */
    void Remove(int folder, const std::string& name, const std::string& path);
    void Enter(int folder, const std::string& name, const std::string& path);
    /** Leaves the innermost level, whose names are all done. @param folder that the outermost level lies in. */
    void Leave(int folder);
    void Fail(const std::string& path, FileError error);
    void ReportIfDue();
    void Report();

    std::function<void(const RemovalState&)> report;
    RemovalState state;
    std::vector<Level> levels;
    std::int64_t reportedAt = 0;
};

}  // namespace package
