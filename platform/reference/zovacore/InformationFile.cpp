#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "Paths.h"
#include "Seam.h"
#include "common/ControlBytes.h"
#include "common/Files.h"
#include "common/KeyValueText.h"
#include "common/TimedLock.h"

using reference::UniqueFd;
namespace paths = reference::paths;

namespace {

constexpr size_t kLargestFile = 65536;
constexpr size_t kLongestKey = 128;
constexpr size_t kLongestValue = 4096;
constexpr int kLockSeconds = 10;

bool IsKey(std::string_view key) {
    constexpr const char* kKeyBytes = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_";
    return !key.empty() && key.size() <= kLongestKey && key.find_first_not_of(kKeyBytes) == std::string_view::npos;
}

bool IsValue(std::string_view value) {
    return value.size() <= kLongestValue && !reference::HasControlByte(value) &&
           value.find('"') == std::string_view::npos;
}

bool WriteLike(int descriptor, std::string_view content, const struct stat& before) {
    return fchown(descriptor, before.st_uid, before.st_gid) == 0 && fchmod(descriptor, before.st_mode & 07777) == 0 &&
           reference::WriteAll(descriptor, content) && fsync(descriptor) == 0;
}

/** Replaces the information file by one with the content, and the owner and mode of `before`. Under the lock. */
bool Replace(std::string_view content, const struct stat& before) {
    if (unlink(paths::kNewDeviceInformation) != 0 && errno != ENOENT) {
        return false;
    }
    const UniqueFd file(open(paths::kNewDeviceInformation, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!file.IsOpen()) {
        return false;
    }
    if (WriteLike(file.Get(), content, before) &&
        rename(paths::kNewDeviceInformation, paths::kDeviceInformation) == 0) {
        return true;
    }
    unlink(paths::kNewDeviceInformation);
    return false;
}

bool SetUnderLock(std::string_view key, std::string_view value) {
    struct stat before = {};
    before.st_mode = 0644;
    std::string text;
    if (reference::ReadFile(paths::kDeviceInformation, kLargestFile, reference::FileTrust::kRootOnlyWrites, text,
                            &before) == reference::ReadResult::kRefused) {
        syslog(LOG_ERR, "information file %s cannot be used", paths::kDeviceInformation);
        return false;
    }
    const std::string changed = reference::WithKeyValue(text, key, value);
    return changed.size() <= kLargestFile && Replace(changed, before);
}

}  // namespace

int QLIBCINFOSetKeyValue(const char* key, const char* value) {
    if (key == nullptr || value == nullptr || !IsKey(key) || !IsValue(value) ||
        !reference::EnsurePrivateDirectory(paths::kSecretDirectory)) {
        return -1;
    }
    const UniqueFd lock = reference::TakeTimedLock(paths::kDeviceInformationLock, kLockSeconds);
    return lock.IsOpen() && SetUnderLock(key, value) ? 0 : -1;
}
