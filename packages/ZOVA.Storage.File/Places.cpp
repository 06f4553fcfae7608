#include "Places.h"

#include <errno.h>
#include <fcntl.h>

#include "Beneath.h"
#include "ClientPath.h"

namespace package {
namespace {

constexpr int kPlace = O_PATH | O_DIRECTORY;

const CallerFolder* InnermostFolder(const Caller& caller, const std::string& path) {
    const CallerFolder* innermost = nullptr;
    for (const CallerFolder& folder : caller.folders) {
        if (IsWithin(path, folder.path) && (innermost == nullptr || folder.path.size() > innermost->path.size())) {
            innermost = &folder;
        }
    }
    return innermost;
}

}  // namespace

FileError Locate(const Caller& caller, const std::string& path, Location& out) {
    if (!IsClientPath(path)) {
        return FILE_ERR_BAD_PATH;
    }
    out.folder = InnermostFolder(caller, path);
    if (out.folder == nullptr) {
        return caller.isTableGood ? FILE_ERR_OUTSIDE : FILE_ERR_TABLE;
    }
    out.top = OpenTopFolder(out.folder->path);
    if (!out.top.IsOpen()) {
        return ErrorOf(errno, "opening a folder of the caller's");
    }
    out.below = path == out.folder->path ? "" : path.substr(out.folder->path.size() + 1);
    return FILE_OK;
}

FileError OpenThing(const Caller& caller, const std::string& path, int flags, UniqueFd& out) {
    Location location;
    const FileError error = Locate(caller, path, location);
    if (error != FILE_OK) {
        return error;
    }
    out = OpenBeneath(location.top.Get(), location.below, flags);
    return out.IsOpen() ? FILE_OK : ErrorOf(errno, "opening a path");
}

FileError OpenSpot(const Caller& caller, const std::string& path, Spot& out) {
    Location location;
    const FileError error = Locate(caller, path, location);
    if (error != FILE_OK) {
        return error;
    }
    if (location.below.empty()) {
        return FILE_ERR_TOP_FOLDER;
    }
    if (!location.folder->writable) {
        return FILE_ERR_DENIED;
    }
    const std::size_t slash = location.below.rfind('/');
    const std::string above = slash == std::string::npos ? "" : location.below.substr(0, slash);
    out.top = location.folder;
    out.name = NameOf(path);
    out.folder = OpenBeneath(location.top.Get(), above, kPlace);
    return out.folder.IsOpen() ? FILE_OK : ErrorOf(errno, "opening a folder");
}

FileError OpenTarget(const Caller& caller, const std::string& path, UniqueFd& out) {
    Location location;
    const FileError error = Locate(caller, path, location);
    if (error != FILE_OK) {
        return error;
    }
    if (!location.folder->writable) {
        return FILE_ERR_DENIED;
    }
    out = OpenBeneath(location.top.Get(), location.below, kPlace);
    return out.IsOpen() ? FILE_OK : ErrorOf(errno, "opening a folder");
}

}  // namespace package
