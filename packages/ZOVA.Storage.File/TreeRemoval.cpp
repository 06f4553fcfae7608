#include "TreeRemoval.h"

#include <errno.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <utility>

#include "Beneath.h"
#include "ClientPath.h"
#include "EntryJson.h"

namespace package {
namespace {

/** Each level holds a descriptor. */
constexpr std::size_t kDeepest = 512;
/** Others may add to a folder while it is emptied, but not for ever. */
constexpr int kMostRounds = 8;
constexpr Json::ArrayIndex kMostFailures = 100;
constexpr std::int64_t kReportMilliseconds = 500;
constexpr int kFolderFlags = O_RDONLY | O_DIRECTORY;

std::int64_t MonotonicMilliseconds() {
    timespec now = {};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<std::int64_t>(now.tv_sec) * 1000 + now.tv_nsec / 1000000;
}

}  // namespace

Json::Value RemovalState::ToJson() const {
    Json::Value json(Json::objectValue);
    json["files"] = Json::UInt64(files);
    json["folders"] = Json::UInt64(folders);
    json["failed"] = Json::UInt64(failed);
    json["failures"] = failures;
    json["done"] = done;
    return json;
}

TreeRemoval::TreeRemoval(std::function<void(const RemovalState&)> reportState) : report(std::move(reportState)) {}

void TreeRemoval::Run(const Caller& caller, const std::vector<std::string>& paths) {
    Report();
    for (const std::string& path : paths) {
        Spot spot;
        const FileError error = OpenSpot(caller, path, spot);
        if (error == FILE_OK) {
            RemoveTree(spot, path);
        } else {
            Fail(path, error);
        }
    }
    state.done = true;
    Report();
}

void TreeRemoval::RemoveTree(const Spot& spot, const std::string& path) {
    Remove(spot.folder.Get(), spot.name, path);
    while (!levels.empty()) {
        ReportIfDue();
        Level& level = levels.back();
        if (const dirent* entry = level.names.Next()) {
            const std::string name = entry->d_name;
            Remove(level.names.Get(), name, Join(level.path, name));
        } else {
            Leave(spot.folder.Get());
        }
    }
}

void TreeRemoval::Remove(int folder, const std::string& name, const std::string& path) {
    if (unlinkat(folder, name.c_str(), 0) == 0) {
        ++state.files;
        return;
    }
    const int error = errno;
    struct stat status;
    if ((error == EISDIR || error == EPERM) && fstatat(folder, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 &&
        S_ISDIR(status.st_mode)) {
        Enter(folder, name, path);
    } else if (error != ENOENT || levels.empty()) {
        Fail(path, ErrorOf(error, "removing a file"));
    }
}

void TreeRemoval::Enter(int folder, const std::string& name, const std::string& path) {
    if (levels.size() == kDeepest) {
        Fail(path, FILE_ERR_BAD_PATH);
        return;
    }
    UniqueFd opened = OpenOnSameMount(folder, name, kFolderFlags);
    if (!opened.IsOpen()) {
        const int error = errno;
        // One that may not be read can be removed if it is empty.
        if (unlinkat(folder, name.c_str(), AT_REMOVEDIR) == 0) {
            ++state.folders;
        } else {
            Fail(path, ErrorOf(error, "opening a folder"));
        }
        return;
    }
    FolderNames names(std::move(opened));
    if (names.IsOpen()) {
        levels.push_back({std::move(names), name, path});
    } else {
        Fail(path, ErrorOf(errno, "reading a folder"));
    }
}

void TreeRemoval::Leave(int folder) {
    Level& level = levels.back();
    const int above = levels.size() == 1 ? folder : levels[levels.size() - 2].names.Get();
    if (unlinkat(above, level.name.c_str(), AT_REMOVEDIR) == 0) {
        ++state.folders;
        levels.pop_back();
        return;
    }
    const int error = errno;
    const bool isFull = error == ENOTEMPTY || error == EEXIST;
    if (isFull && !level.keeps && ++level.rounds < kMostRounds) {
        level.names.Rewind();
        return;
    }
    const bool keeps = level.keeps;
    const std::string path = level.path;
    levels.pop_back();
    if (isFull && keeps) {
        if (!levels.empty()) {
            levels.back().keeps = true;
        }
    } else {
        Fail(path, ErrorOf(error, "removing a folder"));
    }
}

void TreeRemoval::Fail(const std::string& path, FileError error) {
    ++state.failed;
    if (!levels.empty()) {
        levels.back().keeps = true;
    }
    if (state.failures.size() < kMostFailures) {
        Json::Value failure(Json::objectValue);
        AddText(failure, "path", path);
        failure["error"] = static_cast<int>(error);
        state.failures.append(failure);
    }
}

void TreeRemoval::ReportIfDue() {
    if (MonotonicMilliseconds() - reportedAt >= kReportMilliseconds) {
        Report();
    }
}

void TreeRemoval::Report() {
    report(state);
    reportedAt = MonotonicMilliseconds();
}

}  // namespace package
