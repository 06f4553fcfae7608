#include "taskmanager/TaskSweep.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <ctime>
#include <string>
#include <string_view>

#include "Paths.h"
#include "common/Accounts.h"
#include "common/Files.h"
#include "common/UniqueFd.h"
#include "taskmanager/TaskProcess.h"
#include "taskmanager/TaskRecord.h"
#include "taskmanager/TaskTrust.h"

namespace reference {

namespace {

constexpr time_t kInterval = 30;
constexpr time_t kDay = 24 * 60 * 60;

/** By the exact clock: that of `time` may be behind the one that stamps files. */
time_t AgeOf(const struct stat& status) {
    struct timespec now;
    clock_gettime(CLOCK_REALTIME, &now);
    return now.tv_sec - status.st_mtime;
}

/** Whether the interval is over; it begins anew then. */
bool IsDue() {
    struct stat status;
    if (lstat(paths::kTaskSweepStamp, &status) == 0 && S_ISREG(status.st_mode)) {
        const time_t age = AgeOf(status);
        return (age < 0 || age >= kInterval) && utimensat(AT_FDCWD, paths::kTaskSweepStamp, nullptr, 0) == 0;
    }
    const UniqueFd stamp(open(paths::kTaskSweepStamp, O_WRONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    return stamp.IsOpen();
}

/**
 * Whether the file may hold a record of that owner. A user database that cannot be asked knows nobody, which makes no
 * record of a running task junk.
 */
bool MayBeRecord(const struct stat& status, const std::string& owner) {
    return S_ISREG(status.st_mode) && status.st_nlink == 1 && (status.st_mode & 077) == 0 &&
           status.st_size <= static_cast<off_t>(kLargestTaskRecord) &&
           (MayKeepTasks(status.st_uid, owner) || !FindAccountOf(status.st_uid));
}

bool IsAbandoned(int folder, const char* file, const struct stat& status) {
    constexpr int kFlags = O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY;
    const auto key = KeyOfTaskFile(file);
    if (!key || !MayBeRecord(status, key->owner)) {
        return true;
    }
    UniqueFd open(openat(folder, file, kFlags));
    std::string text;
    if (!open.IsOpen() || !ReadAll(open.Get(), kLargestTaskRecord, text)) {
        // The system is short of something: the next sweep will tell.
        return false;
    }
    // The look at the process needs a descriptor, which may be the last one.
    open.Reset(-1);
    TaskRecord record;
    if (!ParseTaskRecord(text, *key, record) || record.IsExpired(SecondsSinceBoot())) {
        return true;
    }
    return !record.finished && !IsProcessRunning(record.pid, record.processStart);
}

/** What lies there waits for its removal by its mode alone: only the file's owner can have set it. */
bool IsToBeSwept(int folder, const char* file, const struct stat& status) {
    const time_t age = AgeOf(status);
    if (S_ISDIR(status.st_mode) || age < static_cast<time_t>(kTaskKeptSeconds)) {
        return false;
    }
    const bool isRecord = KeyOfTaskFile(file).has_value();
    if (isRecord && S_ISREG(status.st_mode) && (status.st_mode & 0777) == 0400) {
        return true;
    }
    constexpr std::string_view kUnfinished = ".new-";
    if (std::string_view(file).substr(0, kUnfinished.size()) == kUnfinished) {
        return true;
    }
    return age >= kDay && IsAbandoned(folder, file, status);
}

}  // namespace

void SweepTasks() {
    if (geteuid() != 0 || !IsDue()) {
        return;
    }
    DIR* directory = opendir(paths::kTaskDirectory);
    if (directory == nullptr) {
        return;
    }
    while (const struct dirent* file = readdir(directory)) {
        struct stat status;
        if (fstatat(dirfd(directory), file->d_name, &status, AT_SYMLINK_NOFOLLOW) == 0 &&
            IsToBeSwept(dirfd(directory), file->d_name, status)) {
            unlinkat(dirfd(directory), file->d_name, 0);
        }
    }
    closedir(directory);
}

}  // namespace reference
