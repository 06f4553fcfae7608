#include "zovacgi/PartFolder.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <syslog.h>

#include <cerrno>
#include <ctime>

#include "zovacgi/PartFile.h"

namespace reference {

namespace {

constexpr mode_t kTemporaryFolder = 01777;
constexpr int kMostLookedAt = 100000;
constexpr time_t kSweepAge = 60;

bool IsFit(int descriptor) {
    struct stat status;
    if (fstat(descriptor, &status) != 0 || status.st_uid != 0) {
        errno = EPERM;
        return false;
    }
    if ((status.st_mode & 07777) == kTemporaryFolder) {
        return true;
    }
    if (geteuid() == 0) {
        return fchmod(descriptor, kTemporaryFolder) == 0;
    }
    errno = EPERM;
    return (status.st_mode & S_ISVTX) != 0 || (status.st_mode & 022) == 0;
}

/** Whether the entry is a part file that no process holds any more. */
bool IsLeftOver(int folder, const char* name, time_t now) {
    const UniqueFd file(openat(folder, name, O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY));
    struct stat status;
    return file.IsOpen() && fstat(file.Get(), &status) == 0 && S_ISREG(status.st_mode) &&
           now - status.st_mtime >= kSweepAge && flock(file.Get(), LOCK_EX | LOCK_NB) == 0;
}

}  // namespace

PartFolder::PartFolder(const char* place)
    : path(place), descriptor(open(place, O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW)) {
    if (!descriptor.IsOpen() || !IsFit(descriptor.Get())) {
        syslog(LOG_ERR, "folder %s cannot be used for uploads: %m", place);
        descriptor.Reset(-1);
    }
}

void PartFolder::Sweep() const {
    if (geteuid() != 0) {
        return;
    }
    const int again = openat(descriptor.Get(), ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    DIR* entries = again >= 0 ? fdopendir(again) : nullptr;
    if (entries == nullptr) {
        if (again >= 0) {
            close(again);
        }
        return;
    }
    const time_t now = time(nullptr);
    int seen = 0;
    while (const struct dirent* entry = readdir(entries)) {
        if (++seen > kMostLookedAt) {
            break;
        }
        if (PartFile::IsName(entry->d_name) && IsLeftOver(descriptor.Get(), entry->d_name, now) &&
            unlinkat(descriptor.Get(), entry->d_name, 0) == 0) {
            syslog(LOG_NOTICE, "removed %s/%s, which an upload left", path.c_str(), entry->d_name);
        }
    }
    closedir(entries);
}

}  // namespace reference
