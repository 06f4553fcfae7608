#pragma once

// What the packages import from libzovasharing.so.6 to judge what a link shares.

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <vector>

namespace ZOVA::sharing::record {

/** A sharing link. */
class Entry {
public:
    /** 0: none was found. */
    std::int64_t id = 0;
    std::string hash;
    uid_t ownerUid = 0;
    std::string ownerName;
    std::string projectName;
    /** What is shared: absolute paths without "." and ".." parts. */
    std::vector<std::string> paths;
    int protectType = 0;
    bool matchIp = false;
};

}  // namespace ZOVA::sharing::record

extern "C" {

/**
 * Opens what lies at the path, if the link shares it: one of the link's paths or something below it, reached without
 * any symbolic link, a regular file or folder that belongs to the link's owner. Needs effective root.
 * @return a descriptor (O_PATH, close-on-exec) of the very thing that was checked, for the caller to close; negative if
 * it is not shared.
 */
int ZovaLinkOpenPath(const ZOVA::sharing::record::Entry* entry, const char* path);

}  // extern "C"
