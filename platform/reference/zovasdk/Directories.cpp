#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>

#include "Seam.h"
#include "common/Files.h"

using reference::UniqueFd;

namespace {

bool HasParentStep(const std::string& path) {
    return (path + "/").find("/../") != std::string::npos;
}

}  // namespace

int ZOVAFSMkdirP(const char* path, int, int keepMode, int uid, int gid, unsigned int mode) {
    std::string place(path != nullptr ? path : "");
    while (place.size() > 1 && place.back() == '/') {
        place.pop_back();
    }
    if (place.size() < 2 || place.front() != '/' || HasParentStep(place) || (mode & ~(07777u | S_IFDIR)) != 0) {
        errno = EINVAL;
        return -1;
    }
    if (!reference::MakeParents(place.c_str(), 0755)) {
        return -1;
    }
    const bool isNew = mkdir(place.c_str(), 0700) == 0;
    if (!isNew && errno != EEXIST) {
        return -1;
    }
    const UniqueFd directory(open(place.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW));
    if (!directory.IsOpen()) {
        return -1;
    }
    if (!isNew && keepMode != 0) {
        return 0;
    }
    if ((uid != -1 || gid != -1) && fchown(directory.Get(), static_cast<uid_t>(uid), static_cast<gid_t>(gid)) != 0) {
        return -1;
    }
    return fchmod(directory.Get(), static_cast<mode_t>(mode & 07777u));
}
