#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>

#include "Paths.h"
#include "Seam.h"
#include "common/DeviceInformation.h"
#include "common/Files.h"
#include "common/KeyValueText.h"

using reference::UniqueFd;

int QLIBCFileExist(const char* path) {
    struct stat status;
    return path != nullptr && stat(path, &status) == 0 ? 1 : 0;
}

int QLIBCFileCheckKeyValue(const char* path, const char* key, const char* value, int) {
    constexpr size_t kLargest = 65536;
    std::string text;
    if (path == nullptr || key == nullptr || value == nullptr ||
        reference::ReadFile(path, kLargest, reference::FileTrust::kAny, text) != reference::ReadResult::kGood) {
        return 0;
    }
    return reference::FindKeyValue(text, key) == std::string_view(value) ? 1 : 0;
}

int QLIBCFileTouch(const char* path) {
    if (path == nullptr) {
        errno = EINVAL;
        return -1;
    }
    const UniqueFd file(open(path, O_WRONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY, 0600));
    return file.IsOpen() ? futimens(file.Get(), nullptr) : -1;
}

int QLIBCFileUTime(const char* path, int now, int time) {
    if (path == nullptr) {
        errno = EINVAL;
        return -1;
    }
    const struct timespec given[2] = {{time, 0}, {time, 0}};
    return utimensat(AT_FDCWD, path, now != 0 ? nullptr : given, AT_SYMLINK_NOFOLLOW);
}

int QLIBCConfGetZELMTimeout() {
    return reference::DeviceInformation().IdleMinutes();
}
