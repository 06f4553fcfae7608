#include "PrivateFile.h"

#include <errno.h>
#include <fcntl.h>
#include <stdio.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <utility>

#include "UniqueFd.h"

namespace package {
namespace {

constexpr mode_t kOthers = S_IRWXG | S_IRWXO;
constexpr mode_t kFolderMode = 0700;
constexpr mode_t kFileMode = 0600;

bool IsPrivate(const struct stat& status, mode_t kind) {
    return (status.st_mode & S_IFMT) == kind && status.st_uid == geteuid() && (status.st_mode & kOthers) == 0;
}

/** What an opened descriptor that is -1 means. A link in the last place is refused with ELOOP or ENOTDIR. */
PrivateFileResult WhyNotOpen() {
    if (errno == ENOENT) {
        return PrivateFileResult::kMissing;
    }
    return errno == ELOOP || errno == ENOTDIR ? PrivateFileResult::kUntrusted : PrivateFileResult::kFailed;
}

PrivateFileResult CheckKind(int descriptor, mode_t kind) {
    struct stat status = {};
    if (fstat(descriptor, &status) != 0) {
        return PrivateFileResult::kFailed;
    }
    return IsPrivate(status, kind) ? PrivateFileResult::kDone : PrivateFileResult::kUntrusted;
}

PrivateFileResult OpenFolder(const char* path, UniqueFd& out) {
    out.Reset(open(path, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    return out.IsOpen() ? CheckKind(out.Get(), S_IFDIR) : WhyNotOpen();
}

PrivateFileResult OpenFile(int folder, const char* name, UniqueFd& out) {
    // Neither a pipe nor a device in the file's place may hold the caller up.
    out.Reset(openat(folder, name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    return out.IsOpen() ? CheckKind(out.Get(), S_IFREG) : WhyNotOpen();
}

PrivateFileResult ReadAll(int descriptor, std::size_t limit, std::string& out) {
    std::string content;
    char buffer[4096];
    for (;;) {
        const ssize_t count = read(descriptor, buffer, sizeof(buffer));
        if (count == 0) {
            out = std::move(content);
            return PrivateFileResult::kDone;
        }
        if (count > 0) {
            content.append(buffer, static_cast<std::size_t>(count));
        } else if (errno != EINTR) {
            return PrivateFileResult::kFailed;
        }
        if (content.size() > limit) {
            return PrivateFileResult::kUntrusted;
        }
    }
}

bool WriteAll(int descriptor, const std::string& content) {
    std::size_t at = 0;
    while (at < content.size()) {
        const ssize_t count = write(descriptor, content.data() + at, content.size() - at);
        if (count < 0 && errno != EINTR) {
            return false;
        }
        at += count > 0 ? static_cast<std::size_t>(count) : 0;
    }
    return true;
}

bool WriteNew(int folder, const char* name, const std::string& content) {
    const UniqueFd file(openat(folder, name, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, kFileMode));
    // The mode anew: the process's mask may have taken the owner's bits away.
    return file.IsOpen() && fchmod(file.Get(), kFileMode) == 0 && WriteAll(file.Get(), content) &&
           fsync(file.Get()) == 0;
}

bool NewName(std::string& out) {
    std::uint64_t random = 0;
    if (getrandom(&random, sizeof(random), 0) != static_cast<ssize_t>(sizeof(random))) {
        return false;
    }
    char text[32];
    snprintf(text, sizeof(text), ".new-%016llx", static_cast<unsigned long long>(random));
    out = text;
    return true;
}

PrivateFileResult MakeFolder(const char* path, UniqueFd& out) {
    const PrivateFileResult result = OpenFolder(path, out);
    if (result != PrivateFileResult::kMissing) {
        return result;
    }
    if (mkdir(path, kFolderMode) != 0 && errno != EEXIST) {
        return PrivateFileResult::kFailed;
    }
    return OpenFolder(path, out);
}

}  // namespace

PrivateFileResult ReadPrivateFile(const char* folder, const char* name, std::size_t limit, std::string& out) {
    UniqueFd directory;
    PrivateFileResult result = OpenFolder(folder, directory);
    UniqueFd file;
    if (result == PrivateFileResult::kDone) {
        result = OpenFile(directory.Get(), name, file);
    }
    return result == PrivateFileResult::kDone ? ReadAll(file.Get(), limit, out) : result;
}

PrivateFileResult ReplacePrivateFile(const char* folder, const char* name, const std::string& content) {
    UniqueFd directory;
    PrivateFileResult result = MakeFolder(folder, directory);
    UniqueFd old;
    if (result == PrivateFileResult::kDone) {
        result = OpenFile(directory.Get(), name, old);
    }
    if (result != PrivateFileResult::kDone && result != PrivateFileResult::kMissing) {
        return result;
    }
    std::string fresh;
    if (!directory.IsOpen() || !NewName(fresh)) {
        return PrivateFileResult::kFailed;
    }
    if (!WriteNew(directory.Get(), fresh.c_str(), content) ||
        renameat(directory.Get(), fresh.c_str(), directory.Get(), name) != 0) {
        const int error = errno;
        unlinkat(directory.Get(), fresh.c_str(), 0);
        errno = error;
        return PrivateFileResult::kFailed;
    }
    return fsync(directory.Get()) == 0 ? PrivateFileResult::kDone : PrivateFileResult::kFailed;
}

}  // namespace package
