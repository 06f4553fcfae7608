#include "common/Files.h"

#include <fcntl.h>

#include <cerrno>
#include <cstdio>

#include "common/Hex.h"
#include "common/RandomBytes.h"

namespace reference {

namespace {

bool IsTrusted(const struct stat& status, FileTrust trust) {
    switch (trust) {
        case FileTrust::kAny:
            return true;
        case FileTrust::kRootOnlyWrites:
            return status.st_uid == 0 && (status.st_mode & 022) == 0;
        case FileTrust::kRootOnly:
            return status.st_uid == 0 && (status.st_mode & 077) == 0;
    }
    return false;
}

}  // namespace

bool ReadAll(int descriptor, size_t limit, std::string& content) {
    struct stat status;
    if (fstat(descriptor, &status) != 0 || status.st_size < 0 || static_cast<size_t>(status.st_size) > limit) {
        return false;
    }
    // One byte more than the file claims to have, so that one that grows meanwhile is noticed.
    content.resize(static_cast<size_t>(status.st_size) + 1);
    size_t length = 0;
    while (length < content.size()) {
        const ssize_t got = read(descriptor, &content[length], content.size() - length);
        if (got == 0) {
            break;
        }
        if (got < 0 && errno != EINTR) {
            return false;
        }
        length += got > 0 ? static_cast<size_t>(got) : 0;
    }
    if (length != static_cast<size_t>(status.st_size)) {
        return false;
    }
    content.resize(length);
    return true;
}

bool WriteAll(int descriptor, std::string_view content) {
    while (!content.empty()) {
        const ssize_t written = write(descriptor, content.data(), content.size());
        if (written < 0 && errno != EINTR) {
            return false;
        }
        if (written > 0) {
            content.remove_prefix(static_cast<size_t>(written));
        }
    }
    return true;
}

ReadResult ReadFile(const char* path, size_t limit, FileTrust trust, std::string& content, struct stat* status) {
    const int follow = trust == FileTrust::kAny ? 0 : O_NOFOLLOW;
    const UniqueFd file(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY | follow));
    if (!file.IsOpen()) {
        return errno == ENOENT || errno == ENOTDIR ? ReadResult::kMissing : ReadResult::kRefused;
    }
    struct stat found;
    if (fstat(file.Get(), &found) != 0 || !S_ISREG(found.st_mode) || !IsTrusted(found, trust)) {
        return ReadResult::kRefused;
    }
    if (!ReadAll(file.Get(), limit, content)) {
        return ReadResult::kRefused;
    }
    if (status != nullptr) {
        *status = found;
    }
    return ReadResult::kGood;
}

bool ReplaceFile(const std::string& path, std::string_view content) {
    char random[8];
    if (!FillRandom(random, sizeof(random))) {
        return false;
    }
    const size_t name = path.rfind('/') + 1;
    const std::string fresh = path.substr(0, name) + ".new-" + HexText(std::string_view(random, sizeof(random)));
    {
        const UniqueFd file(open(fresh.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
        if (!file.IsOpen()) {
            return false;
        }
        if (fchmod(file.Get(), 0600) != 0 || !WriteAll(file.Get(), content) || fsync(file.Get()) != 0) {
            unlink(fresh.c_str());
            return false;
        }
    }
    if (rename(fresh.c_str(), path.c_str()) != 0) {
        unlink(fresh.c_str());
        return false;
    }
    return true;
}

bool MakeParents(const char* path, mode_t mode) {
    std::string text(path);
    for (size_t slash = text.find('/', 1); slash != std::string::npos; slash = text.find('/', slash + 1)) {
        text[slash] = '\0';
        if (mkdir(text.c_str(), 0700) == 0) {
            if (chmod(text.c_str(), mode) != 0) {
                return false;
            }
        } else if (errno != EEXIST) {
            return false;
        }
        text[slash] = '/';
    }
    return true;
}

bool EnsurePrivateDirectory(const char* path) {
    if (mkdir(path, 0700) != 0 && errno != EEXIST) {
        if (errno != ENOENT || !MakeParents(path, 0755) || (mkdir(path, 0700) != 0 && errno != EEXIST)) {
            return false;
        }
    }
    struct stat status;
    return lstat(path, &status) == 0 && S_ISDIR(status.st_mode) && status.st_uid == 0 && (status.st_mode & 077) == 0;
}

}  // namespace reference
