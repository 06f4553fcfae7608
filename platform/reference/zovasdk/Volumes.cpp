#include <sys/stat.h>
#include <sys/statvfs.h>

#include <cstring>

#include "Paths.h"
#include "Seam.h"
#include "common/JsonText.h"

namespace {

constexpr size_t kLargestTable = 65536;

/** Whether the path is that of a folder with `size` bytes free for others than root as well. */
bool HasRoom(const std::string& path, unsigned long long size) {
    struct stat status;
    struct statvfs figures;
    return stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) && statvfs(path.c_str(), &figures) == 0 &&
           static_cast<unsigned long long>(figures.f_frsize) * figures.f_bavail >= size;
}

}  // namespace

int VolumeAvailGet(unsigned long long size, ZovaVolumeInfo* info, int* id, int) {
    Json::Value table;
    if (info == nullptr || id == nullptr ||
        reference::ReadJson(reference::paths::kVolumes, kLargestTable, reference::FileTrust::kRootOnlyWrites, table) !=
            reference::ReadResult::kGood ||
        table.type() != Json::objectValue || table["volumes"].type() != Json::arrayValue) {
        return 0;
    }
    int number = 0;
    for (const Json::Value& volume : table["volumes"]) {
        ++number;
        if (!volume.isString()) {
            continue;
        }
        const std::string path = volume.asString();
        if (path.size() > 1 && path.size() < sizeof(info->path) && path.front() == '/' && path.back() != '/' &&
            path.find('\0') == std::string::npos && HasRoom(path, size)) {
            memcpy(info->path, path.c_str(), path.size() + 1);
            *id = number;
            return 1;
        }
    }
    return 0;
}
