#include "taskmanager/TaskStore.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>

#include "Paths.h"
#include "common/Files.h"
#include "common/Hex.h"
#include "common/JsonSyntax.h"
#include "common/PrintableText.h"
#include "common/RandomBytes.h"
#include "common/TimedLock.h"
#include "taskmanager/TaskTrust.h"

namespace reference {

namespace {

constexpr mode_t kFolderMode = 01733;
constexpr mode_t kRecordMode = 0600;
/** Says without a look into the file that the record waits for its removal. */
constexpr mode_t kRemovedMode = 0400;
constexpr std::uint64_t kLockSeconds = 5;
/** How often a record may be replaced by others between two looks at it. */
constexpr int kAttempts = 1000;

/** An open record file that may hold a record of that owner. */
struct OpenRecord {
    UniqueFd file;
    struct stat status = {};
};

bool IsSameFile(const struct stat& first, const struct stat& second) {
    return first.st_dev == second.st_dev && first.st_ino == second.st_ino;
}

bool IsTrusted(const struct stat& status, const TaskKey& key) {
    return S_ISREG(status.st_mode) && status.st_nlink == 1 && (status.st_mode & 077) == 0 &&
           MayKeepTasks(status.st_uid, key.owner);
}

TaskStore::Result Refused(const TaskKey& key) {
    syslog(LOG_ERR, "task record %s of %s cannot be used", key.id.c_str(), PrintableText(key.owner).c_str());
    return TaskStore::Result::kRefused;
}

TaskStore::Result Open(const UniqueFd& folder, const TaskKey& key, OpenRecord& record) {
    constexpr int kFlags = O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY;
    const std::string name = key.FileName();
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        record.file.Reset(openat(folder.Get(), name.c_str(), kFlags));
        if (!record.file.IsOpen()) {
            return errno == ENOENT ? TaskStore::Result::kMissing : TaskStore::Result::kRefused;
        }
        if (fstat(record.file.Get(), &record.status) != 0) {
            return TaskStore::Result::kRefused;
        }
        if (record.status.st_nlink != 0) {
            return IsTrusted(record.status, key) ? TaskStore::Result::kGood : TaskStore::Result::kRefused;
        }
        // Replaced or removed since it was opened.
    }
    return TaskStore::Result::kRefused;
}

/** Reads the file; a record that has expired is removed. */
TaskStore::Result Read(const UniqueFd& folder, const TaskKey& key, const OpenRecord& open, TaskRecord& record) {
    std::string text;
    if (!ReadAll(open.file.Get(), kLargestTaskRecord, text) || !ParseTaskRecord(text, key, record)) {
        return TaskStore::Result::kRefused;
    }
    if (record.IsExpired(SecondsSinceBoot())) {
        unlinkat(folder.Get(), key.FileName().c_str(), 0);
        return TaskStore::Result::kMissing;
    }
    return TaskStore::Result::kGood;
}

/** Opens the record and takes its lock. What is locked is the file of that name, not one that was replaced. */
TaskStore::Result OpenLocked(const UniqueFd& folder, const TaskKey& key, OpenRecord& record) {
    const std::string name = key.FileName();
    const std::uint64_t begin = SecondsSinceBoot();
    while (SecondsSinceBoot() - begin <= kLockSeconds) {
        const TaskStore::Result result = Open(folder, key, record);
        if (result != TaskStore::Result::kGood) {
            return result;
        }
        if (!LockDescriptor(record.file.Get(), kLockSeconds)) {
            return TaskStore::Result::kRefused;
        }
        struct stat now;
        if (fstatat(folder.Get(), name.c_str(), &now, AT_SYMLINK_NOFOLLOW) == 0 && IsSameFile(now, record.status)) {
            return TaskStore::Result::kGood;
        }
    }
    return TaskStore::Result::kRefused;
}

/** Writes the text beside the records, under a name of its own. @return the name, "" on failure. */
std::string WriteBeside(const UniqueFd& folder, const std::string& text, mode_t mode, const struct stat* before) {
    char random[16];
    // A value nested too deep can be written, but not read again.
    if (text.size() > kLargestTaskRecord || !IsJsonText(text) || !FillRandom(random, sizeof(random))) {
        return "";
    }
    std::string name = ".new-" + HexText(std::string_view(random, sizeof(random)));
    const UniqueFd file(
        openat(folder.Get(), name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, kRecordMode));
    if (!file.IsOpen()) {
        return "";
    }
    const bool keepsOwner =
        before == nullptr || before->st_uid == geteuid() || fchown(file.Get(), before->st_uid, before->st_gid) == 0;
    if (!keepsOwner || !WriteAll(file.Get(), text) || fchmod(file.Get(), mode) != 0) {
        unlinkat(folder.Get(), name.c_str(), 0);
        return "";
    }
    return name;
}

enum class Placed { kDone, kExists, kFailed };

/** Writes the record and gives it its name. `before` is null for a record that must not exist yet. */
Placed PutInPlace(const UniqueFd& folder, const TaskKey& key, const TaskRecord& record, const struct stat* before) {
    const mode_t mode = record.finished && record.removed ? kRemovedMode : kRecordMode;
    const std::string fresh = WriteBeside(folder, WriteTaskRecord(key, record), mode, before);
    if (fresh.empty()) {
        return Placed::kFailed;
    }
    const unsigned int flags = before == nullptr ? RENAME_NOREPLACE : 0;
    if (renameat2(folder.Get(), fresh.c_str(), folder.Get(), key.FileName().c_str(), flags) == 0) {
        return Placed::kDone;
    }
    const Placed result = errno == EEXIST ? Placed::kExists : Placed::kFailed;
    unlinkat(folder.Get(), fresh.c_str(), 0);
    return result;
}

Placed Create(const UniqueFd& folder, const TaskKey& key, const std::function<void(TaskRecord&)>& change,
              TaskStore::Entry& entry) {
    if (!MayKeepTasks(geteuid(), key.owner)) {
        syslog(LOG_ERR, "user id %u may not keep tasks of %s", static_cast<unsigned int>(geteuid()),
               PrintableText(key.owner).c_str());
        return Placed::kFailed;
    }
    TaskStore::Entry made;
    made.user = geteuid();
    change(made.record);
    const Placed placed = PutInPlace(folder, key, made.record, nullptr);
    if (placed == Placed::kDone) {
        entry = std::move(made);
    }
    return placed;
}

bool IsUsableFolder(const struct stat& status) {
    return S_ISDIR(status.st_mode) && status.st_uid == 0 &&
           ((status.st_mode & 022) == 0 || (status.st_mode & S_ISVTX) != 0);
}

}  // namespace

std::string TaskStore::PathOf(const TaskKey& key) {
    return std::string(paths::kTaskDirectory) + "/" + key.FileName();
}

UniqueFd TaskStore::OpenFolder() {
    constexpr int kFlags = O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
    UniqueFd folder(open(paths::kTaskDirectory, kFlags));
    if (!folder.IsOpen() && errno == ENOENT && geteuid() == 0 && MakeParents(paths::kTaskDirectory, 0755)) {
        if (mkdir(paths::kTaskDirectory, 0700) == 0 && chmod(paths::kTaskDirectory, kFolderMode) != 0) {
            rmdir(paths::kTaskDirectory);
        }
        folder.Reset(open(paths::kTaskDirectory, kFlags));
    }
    struct stat status;
    if (!folder.IsOpen() || fstat(folder.Get(), &status) != 0 || !IsUsableFolder(status)) {
        syslog(LOG_ERR, "task folder %s cannot be used", paths::kTaskDirectory);
        folder.Reset(-1);
    }
    return folder;
}

TaskStore::Result TaskStore::Load(const TaskKey& key, Entry& entry) {
    const UniqueFd folder = OpenFolder();
    if (!folder.IsOpen()) {
        return Result::kRefused;
    }
    OpenRecord open;
    Result result = Open(folder, key, open);
    Entry loaded;
    if (result == Result::kGood) {
        result = Read(folder, key, open, loaded.record);
    }
    if (result == Result::kGood) {
        loaded.user = open.status.st_uid;
        entry = std::move(loaded);
    }
    return result == Result::kRefused ? Refused(key) : result;
}

TaskStore::Result TaskStore::Update(const TaskKey& key, bool mayCreate, const std::function<void(TaskRecord&)>& change,
                                    Entry& entry) {
    const UniqueFd folder = OpenFolder();
    if (!folder.IsOpen()) {
        return Result::kRefused;
    }
    OpenRecord open;
    Result result = OpenLocked(folder, key, open);
    if (result == Result::kMissing && mayCreate) {
        const Placed placed = Create(folder, key, change, entry);
        if (placed != Placed::kExists) {
            return placed == Placed::kDone ? Result::kGood : Result::kRefused;
        }
        // Another process was faster.
        result = OpenLocked(folder, key, open);
    }
    Entry changed;
    if (result == Result::kGood) {
        result = Read(folder, key, open, changed.record);
    }
    if (result != Result::kGood) {
        return result == Result::kRefused ? Refused(key) : result;
    }
    change(changed.record);
    changed.user = open.status.st_uid;
    if (PutInPlace(folder, key, changed.record, &open.status) != Placed::kDone) {
        return Result::kRefused;
    }
    entry = std::move(changed);
    return Result::kGood;
}

bool TaskStore::Remove(const TaskKey& key) {
    const UniqueFd folder = OpenFolder();
    OpenRecord open;
    return folder.IsOpen() && OpenLocked(folder, key, open) == Result::kGood &&
           unlinkat(folder.Get(), key.FileName().c_str(), 0) == 0;
}

std::vector<std::string> TaskStore::List(const std::string& owner, const std::string& prefix) {
    std::vector<std::string> ids;
    const UniqueFd folder = OpenFolder();
    DIR* directory = folder.IsOpen() ? opendir(paths::kTaskDirectory) : nullptr;
    if (directory == nullptr) {
        return ids;
    }
    while (const struct dirent* file = readdir(directory)) {
        const std::string_view id = IdOfTaskFile(file->d_name, owner);
        if (id.empty() || id.substr(0, prefix.size()) != prefix) {
            continue;
        }
        const TaskKey key{owner, std::string(id)};
        OpenRecord open;
        TaskRecord record;
        if (Open(folder, key, open) == Result::kGood && Read(folder, key, open, record) == Result::kGood) {
            ids.push_back(key.id);
        }
    }
    closedir(directory);
    std::sort(ids.begin(), ids.end());
    return ids;
}

}  // namespace reference
