#include "ChangeNames.h"

#include <errno.h>
#include <fcntl.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <string>
#include <utility>

#include "../common/Fence.h"
#include "Beneath.h"
#include "Caller.h"
#include "ClientPath.h"
#include "EntryJson.h"
#include "NewThings.h"
#include "Places.h"
#include "Requests.h"

namespace package {
namespace {

constexpr const char* kExisting[] = {"error", "overwrite", nullptr};

void AnswerPath(ZOVA::APIResponse* response, FileError error, const std::string& path) {
    if (error != FILE_OK) {
        Refuse(response, error);
        return;
    }
    Json::Value data(Json::objectValue);
    AddText(data, "path", path);
    response->SetSuccess(data);
}

FileError MakeOne(const std::string& path) {
    Spot spot;
    const FileError error = OpenSpot(CurrentCaller(), path, spot);
    if (error != FILE_OK) {
        return error;
    }
    return IsNewName(spot.name) ? MakeFolderIn(spot.folder.Get(), spot.name) : FILE_ERR_BAD_PATH;
}

/** Goes down from the caller's folder, one part after the other, and makes those that are missing. */
FileError MakeAll(const std::string& path) {
    Location location;
    FileError error = Locate(CurrentCaller(), path, location);
    if (error != FILE_OK) {
        return error;
    }
    if (!location.folder->writable) {
        return FILE_ERR_DENIED;
    }
    UniqueFd folder = std::move(location.top);
    std::size_t at = 0;
    while (at < location.below.size()) {
        const std::size_t end = std::min(location.below.find('/', at), location.below.size());
        const std::string part = location.below.substr(at, end - at);
        UniqueFd next = OpenBeneath(folder.Get(), part, O_PATH | O_DIRECTORY);
        if (!next.IsOpen() && errno == ENOENT) {
            error = IsNewName(part) ? MakeFolderIn(folder.Get(), part) : FILE_ERR_BAD_PATH;
            if (error != FILE_OK && error != FILE_ERR_EXISTS) {
                return error;
            }
            next = OpenBeneath(folder.Get(), part, O_PATH | O_DIRECTORY);
        }
        if (!next.IsOpen()) {
            return ErrorOf(errno, "opening a folder");
        }
        folder = std::move(next);
        at = end + 1;
    }
    return FILE_OK;
}

/** As the kernel's, where a file system has no renaming that spares what is there. */
int RenameByLink(const Spot& from, const Spot& to) {
    if (linkat(from.folder.Get(), from.name.c_str(), to.folder.Get(), to.name.c_str(), 0) != 0) {
        return -1;
    }
    return unlinkat(from.folder.Get(), from.name.c_str(), 0);
}

FileError RenameError(int error) {
    switch (error) {
        case EINVAL:
            return FILE_ERR_INTO_ITSELF;
        case EBUSY:
            return FILE_ERR_ELSEWHERE;
        case ENOTEMPTY:
            return FILE_ERR_EXISTS;
        default:
            return ErrorOf(error, "renaming");
    }
}

bool IsFolder(const Spot& spot) {
    struct stat status;
    return fstatat(spot.folder.Get(), spot.name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0 || S_ISDIR(status.st_mode);
}

FileError Move(const Spot& from, const Spot& to, bool overwrites) {
    int result = renameat2(from.folder.Get(), from.name.c_str(), to.folder.Get(), to.name.c_str(),
                           overwrites ? 0 : RENAME_NOREPLACE);
    if (result != 0 && errno == EINVAL && !overwrites && !IsFolder(from)) {
        result = RenameByLink(from, to);
    }
    return result == 0 ? FILE_OK : RenameError(errno);
}

FileError MoveTo(const std::string& path, const std::string& target, bool overwrites) {
    Spot from;
    Spot to;
    FileError error = OpenSpot(CurrentCaller(), path, from);
    if (error == FILE_OK) {
        error = OpenSpot(CurrentCaller(), target, to);
    }
    if (error != FILE_OK) {
        return error;
    }
    if (from.top != to.top) {
        return FILE_ERR_ELSEWHERE;
    }
    return IsNewName(to.name) ? Move(from, to, overwrites) : FILE_ERR_BAD_PATH;
}

}  // namespace

void MakeFolder(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("mkdir", response, [&] {
        std::string path;
        bool withParents = false;
        if (ReadPath(request, response, "path", path) && ReadFlag(request, response, "parents", withParents)) {
            AnswerPath(response, withParents ? MakeAll(path) : MakeOne(path), path);
        }
    });
}

void Rename(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("rename", response, [&] {
        std::string path;
        std::string target;
        int existing = 0;
        if (ReadPath(request, response, "path", path) && ReadPath(request, response, "to", target) &&
            ReadWord(request, response, "existing", kExisting, existing)) {
            AnswerPath(response, MoveTo(path, target, existing == 1), target);
        }
    });
}

}  // namespace package
