#include "Mounts.h"

#include <algorithm>
#include <cstddef>
#include <map>
#include <sstream>
#include <tuple>
#include <utility>

namespace package {
namespace {

constexpr const char* kRealTypes[] = {"ext2", "ext3",  "ext4",  "xfs",     "btrfs",   "f2fs", "zfs",    "bcachefs",
                                      "vfat", "exfat", "ntfs3", "hfsplus", "iso9660", "udf",  "overlay"};

struct Entry {
    std::string deviceNumber;
    std::string root;
    Mount mount;
};

bool IsReal(const std::string& type) {
    return std::any_of(std::begin(kRealTypes), std::end(kRealTypes), [&](const char* real) { return type == real; });
}

bool IsOctal(char c) {
    return c >= '0' && c <= '7';
}

/** Resolves the kernel's escapes: a backslash and three octal digits. */
std::string Unescape(const std::string& text) {
    std::string plain;
    for (std::size_t at = 0; at < text.size(); ++at) {
        if (text[at] == '\\' && at + 3 < text.size() && text[at + 1] <= '3' && IsOctal(text[at + 1]) &&
            IsOctal(text[at + 2]) && IsOctal(text[at + 3])) {
            plain += static_cast<char>((text[at + 1] - '0') * 64 + (text[at + 2] - '0') * 8 + (text[at + 3] - '0'));
            at += 3;
        } else {
            plain += text[at];
        }
    }
    return plain;
}

/** "id parent major:minor root mountpoint options [tags...] - type source superoptions" */
bool ParseLine(const std::string& line, Entry& out) {
    std::istringstream words(line);
    std::string id;
    std::string parent;
    std::string options;
    Entry entry;
    if (!(words >> id >> parent >> entry.deviceNumber >> entry.root >> entry.mount.mountPoint >> options)) {
        return false;
    }
    std::string tag;
    while (words >> tag && tag != "-") {
    }
    if (tag != "-" || !(words >> entry.mount.type >> entry.mount.device)) {
        return false;
    }
    entry.mount.mountPoint = Unescape(entry.mount.mountPoint);
    entry.mount.device = Unescape(entry.mount.device);
    out = std::move(entry);
    return true;
}

/** What tells one device from another: sub-volumes of one block device have numbers of their own. */
std::string DeviceKey(const Entry& entry) {
    const bool blockDevice = entry.mount.device.rfind("/dev/", 0) == 0;
    return blockDevice ? entry.mount.device : entry.deviceNumber;
}

/** Whether `left` stands better for its device than `right`. */
bool Better(const Entry& left, const Entry& right) {
    const auto rank = [](const Entry& entry) {
        return std::make_tuple(entry.root != "/", entry.mount.mountPoint.size(), entry.mount.mountPoint);
    };
    return rank(left) < rank(right);
}

}  // namespace

std::vector<Mount> RealMounts(const std::string& mountTable) {
    std::map<std::string, Entry> byMountPoint;
    std::istringstream lines(mountTable);
    std::string line;
    while (std::getline(lines, line)) {
        Entry entry;
        if (ParseLine(line, entry)) {
            byMountPoint[entry.mount.mountPoint] = entry;
        }
    }
    std::map<std::string, Entry> byDevice;
    for (const auto& [mountPoint, entry] : byMountPoint) {
        if (!IsReal(entry.mount.type)) {
            continue;
        }
        const auto [known, isNew] = byDevice.emplace(DeviceKey(entry), entry);
        if (!isNew && Better(entry, known->second)) {
            known->second = entry;
        }
    }
    std::vector<Mount> mounts;
    for (const auto& [device, entry] : byDevice) {
        mounts.push_back(entry.mount);
    }
    std::sort(mounts.begin(), mounts.end(),
              [](const Mount& left, const Mount& right) { return left.mountPoint < right.mountPoint; });
    return mounts;
}

}  // namespace package
