#include "zovacgi/SessionStore.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>

#include "Paths.h"
#include "common/DeviceInformation.h"
#include "common/Files.h"
#include "zovacgi/SessionId.h"

namespace reference {

namespace {

constexpr size_t kLargestFile = 16384;
constexpr size_t kMostSessions = 10000;
/** No session lives longer unused, so its file serves no answer any more. */
constexpr time_t kSweepAge = (kLongestIdleMinutes + 60) * 60;

/** Removes files that were not touched for `kSweepAge`, half-written ones included. Gives the number of the others. */
size_t Sweep() {
    DIR* directory = opendir(paths::kSessionDirectory);
    if (directory == nullptr) {
        return kMostSessions;
    }
    const time_t now = time(nullptr);
    size_t kept = 0;
    while (const struct dirent* entry = readdir(directory)) {
        struct stat status;
        if (fstatat(dirfd(directory), entry->d_name, &status, AT_SYMLINK_NOFOLLOW) != 0 || !S_ISREG(status.st_mode)) {
            continue;
        }
        if (now - status.st_mtime <= kSweepAge || unlinkat(dirfd(directory), entry->d_name, 0) != 0) {
            ++kept;
        }
    }
    closedir(directory);
    return kept;
}

}  // namespace

std::string SessionStore::PathOf(std::string_view sid) {
    std::string path;
    if (IsSessionId(sid)) {
        path = paths::kSessionDirectory;
        path += '/';
        path += sid;
    }
    return path;
}

SessionStore::Result SessionStore::Load(std::string_view sid, Entry& entry) {
    const std::string path = PathOf(sid);
    if (path.empty()) {
        return Result::kUnknown;
    }
    std::string text;
    struct stat status;
    switch (ReadFile(path.c_str(), kLargestFile, FileTrust::kRootOnly, text, &status)) {
        case ReadResult::kMissing:
            return Result::kUnknown;
        case ReadResult::kRefused:
            return Result::kBroken;
        case ReadResult::kGood:
            break;
    }
    if (!ParseSession(text, entry.session)) {
        return Result::kBroken;
    }
    entry.used = status.st_mtime;
    return Result::kGood;
}

std::string SessionStore::Create(const Session& session) {
    if (!EnsurePrivateDirectory(paths::kSessionDirectory)) {
        syslog(LOG_ERR, "session folder %s cannot be used", paths::kSessionDirectory);
        return "";
    }
    if (Sweep() >= kMostSessions) {
        syslog(LOG_ERR, "too many sessions");
        return "";
    }
    const std::string sid = MakeSecret();
    const std::string path = PathOf(sid);
    return !path.empty() && ReplaceFile(path, WriteSession(session)) ? sid : std::string();
}

SessionStore::Result SessionStore::Renew(std::string_view sid) {
    const std::string path = PathOf(sid);
    if (path.empty()) {
        return Result::kUnknown;
    }
    if (utimensat(AT_FDCWD, path.c_str(), nullptr, AT_SYMLINK_NOFOLLOW) == 0) {
        return Result::kGood;
    }
    return errno == ENOENT ? Result::kUnknown : Result::kBroken;
}

bool SessionStore::Remove(std::string_view sid) {
    const std::string path = PathOf(sid);
    return !path.empty() && unlink(path.c_str()) == 0;
}

}  // namespace reference
