#include "zovasharing/SharedPath.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include "common/ControlBytes.h"
#include "zovasharing/Link.h"

namespace reference::sharing {

bool IsPlainPath(const std::string& path) {
    if (path.size() < 2 || path.size() > kLongestPath || path.front() != '/' || HasControlByte(path)) {
        return false;
    }
    const std::string closed = path + "/";
    return closed.find("//") == std::string::npos && closed.find("/./") == std::string::npos &&
           closed.find("/../") == std::string::npos;
}

UniqueFd OpenOwned(const std::string& path, uid_t owner) {
    struct open_how how = {};
    how.flags = O_PATH | O_NOFOLLOW | O_CLOEXEC;
    how.resolve = RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS;
    UniqueFd opened(static_cast<int>(syscall(SYS_openat2, AT_FDCWD, path.c_str(), &how, sizeof(how))));
    struct stat status;
    const bool good = opened.IsOpen() && fstat(opened.Get(), &status) == 0 && status.st_uid == owner &&
                      (S_ISREG(status.st_mode) || S_ISDIR(status.st_mode));
    return good ? std::move(opened) : UniqueFd();
}

}  // namespace reference::sharing

int ZovaLinkOpenPath(const ZOVA::sharing::record::Entry* entry, const char* path) {
    if (entry == nullptr || path == nullptr || entry->id == 0 || !reference::sharing::IsPlainPath(path)) {
        return -1;
    }
    const std::string wanted = path;
    for (const std::string& shared : entry->paths) {
        if (wanted == shared || wanted.compare(0, shared.size() + 1, shared + "/") == 0) {
            return reference::sharing::OpenOwned(wanted, entry->ownerUid).Release();
        }
    }
    return -1;
}
