#include "TreeSearch.h"

#include <dirent.h>
#include <fcntl.h>
#include <fnmatch.h>
#include <string.h>
#include <time.h>

#include <algorithm>
#include <utility>

#include "../common/Text.h"
#include "FileContent.h"

namespace package {
namespace {

constexpr std::size_t kMostFound = 1000;
/** Of all found paths together, so that a report stays small. */
constexpr std::size_t kMostFoundBytes = 512 * 1024;
/** Each level holds a descriptor. */
constexpr std::size_t kDeepest = 256;
constexpr std::int64_t kReportMilliseconds = 500;
constexpr int kFolderFlags = O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK;

std::int64_t MonotonicMilliseconds() {
    timespec now = {};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<std::int64_t>(now.tv_sec) * 1000 + now.tv_nsec / 1000000;
}

std::string Join(const std::string& folder, const std::string& name) {
    return folder.back() == '/' ? folder + name : folder + "/" + name;
}

}  // namespace

Json::Value SearchState::ToJson() const {
    Json::Value json(Json::objectValue);
    json["found"] = Json::Value(Json::arrayValue);
    for (const std::string& path : found) {
        json["found"].append(ValidUtf8(path));
    }
    json["found_count"] = Json::UInt64(foundCount);
    json["files"] = Json::UInt64(files);
    json["folders"] = Json::UInt64(folders);
    json["bytes"] = Json::UInt64(bytes);
    json["skipped"] = Json::UInt64(skipped);
    json["share"] = share;
    json["done"] = done;
    return json;
}

TreeSearch::TreeSearch(const SearchOrder& searchOrder, std::function<void(const SearchState&)> reportState)
    : order(searchOrder), report(std::move(reportState)) {}

void TreeSearch::Run() {
    Report();
    struct stat status;
    if (fstat(order.folder.Get(), &status) == 0) {
        device = status.st_dev;
    }
    Enter(UniqueFd(openat(order.folder.Get(), ".", kFolderFlags)), order.path, 1);
    while (!levels.empty()) {
        if (levels.back().folders.empty()) {
            levels.pop_back();
        } else {
            EnterNext();
        }
    }
    state.share = 1;
    state.done = true;
    Report();
}

void TreeSearch::EnterNext() {
    Level& above = levels.back();
    const std::string name = std::move(above.folders.back());
    above.folders.pop_back();
    UniqueFd folder;
    struct stat status;
    if (levels.size() < kDeepest) {
        folder.Reset(openat(above.folder.Get(), name.c_str(), kFolderFlags));
    }
    if (folder.IsOpen() && (fstat(folder.Get(), &status) != 0 || status.st_dev != device)) {
        folder.Reset(-1);
    }
    Enter(std::move(folder), Join(above.path, name), above.share);
}

void TreeSearch::Enter(UniqueFd folder, const std::string& path, double share) {
    if (!folder.IsOpen()) {
        ++state.skipped;
        state.share = std::min(1.0, state.share + share);
        return;
    }
    ++state.folders;
    Level level;
    level.folder = std::move(folder);
    level.path = path;
    ReadLevel(level);
    // The folder itself counts as much as each of those in it.
    level.share = share / static_cast<double>(level.folders.size() + 1);
    state.share = std::min(1.0, state.share + level.share);
    levels.push_back(std::move(level));
}

void TreeSearch::ReadLevel(Level& level) {
    // The stream owns a descriptor of its own.
    UniqueFd copy(fcntl(level.folder.Get(), F_DUPFD_CLOEXEC, 3));
    DIR* directory = copy.IsOpen() ? fdopendir(copy.Get()) : nullptr;
    if (directory == nullptr) {
        ++state.skipped;
        return;
    }
    static_cast<void>(copy.Release());
    while (const dirent* entry = readdir(directory)) {
        if (strcmp(entry->d_name, ".") != 0 && strcmp(entry->d_name, "..") != 0) {
            Look(level, entry->d_name);
        }
        ReportIfDue();
    }
    closedir(directory);
}

void TreeSearch::Look(Level& level, const char* name) {
    struct stat status;
    if (fstatat(level.folder.Get(), name, &status, AT_SYMLINK_NOFOLLOW) != 0) {
        ++state.skipped;
        return;
    }
    if (S_ISDIR(status.st_mode)) {
        level.folders.emplace_back(name);
    } else if (S_ISREG(status.st_mode)) {
        ++state.files;
        state.bytes += static_cast<std::uint64_t>(status.st_size);
    }
    if (Matches(level, name, status)) {
        Found(Join(level.path, name));
    }
}

bool TreeSearch::Matches(const Level& level, const char* name, const struct stat& status) {
    if (fnmatch(order.pattern.c_str(), name, 0) != 0) {
        return false;
    }
    if (order.content.empty()) {
        return true;
    }
    if (!S_ISREG(status.st_mode)) {
        return false;
    }
    const ContentResult result = FindContent(level.folder.Get(), name, order.content, [this] { ReportIfDue(); });
    state.skipped += result == ContentResult::kUnreadable ? 1 : 0;
    return result == ContentResult::kFound;
}

void TreeSearch::Found(const std::string& path) {
    ++state.foundCount;
    if (state.found.size() < kMostFound && foundBytes + path.size() <= kMostFoundBytes) {
        foundBytes += path.size();
        state.found.push_back(path);
    }
}

void TreeSearch::ReportIfDue() {
    if (MonotonicMilliseconds() - reportedAt >= kReportMilliseconds) {
        Report();
    }
}

void TreeSearch::Report() {
    report(state);
    reportedAt = MonotonicMilliseconds();
}

}  // namespace package
