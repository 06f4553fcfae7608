#include <sys/statvfs.h>

#include <limits>

#include "web/APIUploadPrivate.h"
#include "zovacore.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr const char* kInformationFile = "/etc.defaults/zovainfo.conf";
constexpr const char* kTmp = "/tmp";
constexpr const char* kRootTmp = "/var/tmp";
constexpr int kErrNoRoom = 0x2900;
constexpr int kErrNoFolder = 0xC00;
constexpr unsigned long long kRootReserve = 209715200;

/** False if it cannot be told. */
bool FreeBytes(const char* path, unsigned long long& bytes) {
    struct statvfs figures {};
    if (statvfs(path, &figures) != 0) {
        return false;
    }
    bytes = static_cast<unsigned long long>(figures.f_frsize) * figures.f_bfree;
    return true;
}

}  // namespace

bool APIUploadPrivate::FindUploadTmpDir(std::string& dir, unsigned long long size) {
    ZovaVolumeInfo info{};
    int id = -1;
    if (QLIBCFileCheckKeyValue(kInformationFile, "portbox", "yes", 0) == 0 &&
        VolumeAvailGet(size, &info, &id, 1) == 1) {
        dir = std::string(info.path) + "/@tmp";
        ZOVAFSMkdirP(dir.c_str(), 0, 1, -1, -1, 0777);
        return true;
    }
    return CanUploadtoTmp(dir, size) || CanUploadtoRoot(dir, size);
}

bool APIUploadPrivate::CanUploadtoTmp(std::string& dir, unsigned long long size) {
    unsigned long long bytes = 0;
    if (!FreeBytes(kTmp, bytes)) {
        return false;
    }
    if (size > bytes) {
        QLIBCErrSetEx(kErrNoRoom, __FILE__, __LINE__);
        return false;
    }
    dir = kTmp;
    return true;
}

bool APIUploadPrivate::CanUploadtoRoot(std::string& dir, unsigned long long size) {
    unsigned long long bytes = 0;
    if (!FreeBytes("/", bytes)) {
        return false;
    }
    if (bytes < kRootReserve || size > bytes - kRootReserve) {
        QLIBCErrSetEx(kErrNoRoom, __FILE__, __LINE__);
        return false;
    }
    // The directory bit belongs to the mode as this call takes it.
    if (ZOVAFSMkdirP(kRootTmp, 0, 1, -1, -1, 040700) < 0) {
        QLIBCErrSetEx(kErrNoFolder, __FILE__, __LINE__);
        return false;
    }
    dir = kRootTmp;
    return true;
}

}  // namespace ZOVA
