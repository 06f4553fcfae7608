// libzovacore.so.6 on the fake platform.

#include <cctype>
#include <cerrno>

#include "FakePlatform.h"
#include "zovacore.h"

using fake::FakePlatform;

namespace {

constexpr int kLockDescriptor = 77001;
constexpr int kChildId = 77002;

}  // namespace

extern "C" {

void QLIBCStrCaseLower(char* text, int first, int second, std::size_t size) {
    FakePlatform::Required(__func__).Enter(
        __func__, std::to_string(first) + ", " + std::to_string(second) + ", " + std::to_string(size), 0);
    for (std::size_t at = 0; at < size; ++at) {
        text[at] = static_cast<char>(tolower(static_cast<unsigned char>(text[at])));
    }
}

int BlQLIBIsHostname(const char* text) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, text, 0);
    return static_cast<int>(platform.hostNames.count(text));
}

int BlQLIBIsDomain(const char* text) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, text, 0);
    return static_cast<int>(platform.domainNames.count(text));
}

int QLIBCFileExist(const char* path) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, path, EACCES)) {
        return 0;
    }
    errno = platform.files.count(path) != 0 ? 0 : ENOENT;
    return platform.files.count(path) != 0 ? 1 : 0;
}

int QLIBCFileCheckKeyValue(const char* path, const char* key, const char* value, int unused) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(path) + ", " + key + ", " + value + ", " + std::to_string(unused),
                        EACCES)) {
        return 0;
    }
    const auto file = platform.keyValueFiles.find(path);
    if (file == platform.keyValueFiles.end()) {
        return 0;
    }
    const auto pair = file->second.find(key);
    return pair != file->second.end() && pair->second == value ? 1 : 0;
}

int QLIBCINFOSetKeyValue(const char* key, const char* value) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(key) + ", " + value, EROFS)) {
        return -1;
    }
    if (platform.process.user.effective != 0 || platform.process.group.effective != 0) {
        errno = EACCES;
        return -1;
    }
    platform.keyValueFiles["/etc/zovainfo.conf"][key] = value;
    return 0;
}

int QLIBCFileTouch(const char* path) {
    return FakePlatform::Required(__func__).Enter(__func__, path, EACCES) ? 0 : -1;
}

int QLIBCFileUTime(const char* path, int now, int time) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    return platform.Enter(__func__, std::string(path) + ", " + std::to_string(now) + ", " + std::to_string(time),
                          EACCES)
               ? 0
               : -1;
}

int QLIBCFileLockTimeByFile(const char* path, int mode, int seconds, int* fd) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__,
                        std::string(path) + ", " + std::to_string(mode) + ", " + std::to_string(seconds) + ", " +
                            std::to_string(*fd),
                        EAGAIN)) {
        return -1;
    }
    if (!platform.lockedFiles.insert(path).second) {
        errno = EAGAIN;
        return -1;
    }
    *fd = kLockDescriptor;
    return 0;
}

int QLIBCFileUnlockByFile(int fd) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, std::to_string(fd), 0);
    if (fd != kLockDescriptor) {
        fake::Unmodelled("unlocking a descriptor that holds no lock");
    }
    platform.lockedFiles.clear();
    return 0;
}

int QLIBCConfGetZELMTimeout() {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, "", 0);
    return platform.systemTimeout;
}

int QLIBCProcFork() {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, "", EAGAIN) || platform.forkAs == fake::ForkAs::kRefused) {
        return -1;
    }
    return platform.forkAs == fake::ForkAs::kChild ? 0 : kChildId;
}

int QLIBCProcForkEx(int flags) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    return platform.Enter(__func__, std::to_string(flags), EAGAIN) ? platform.children.Fork(platform) : -1;
}

}  // extern "C"
