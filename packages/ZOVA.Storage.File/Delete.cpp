#include "Delete.h"

#include <errno.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <webapi/APIPolling.h>

#include <string>
#include <utility>
#include <vector>

#include "../common/Fence.h"
#include "Caller.h"
#include "Places.h"
#include "Requests.h"
#include "TreeRemoval.h"

namespace package {
namespace {

FileError RemoveOne(const std::string& path) {
    Spot spot;
    const FileError error = OpenSpot(CurrentCaller(), path, spot);
    if (error != FILE_OK) {
        return error;
    }
    struct stat status;
    if (fstatat(spot.folder.Get(), spot.name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) {
        return ErrorOf(errno, "looking at a path");
    }
    const int flags = S_ISDIR(status.st_mode) ? AT_REMOVEDIR : 0;
    return unlinkat(spot.folder.Get(), spot.name.c_str(), flags) == 0 ? FILE_OK : ErrorOf(errno, "removing");
}

void RemoveAtOnce(const std::vector<std::string>& paths, ZOVA::APIResponse* response) {
    Results results;
    for (const std::string& path : paths) {
        results.Add(path, RemoveOne(path));
    }
    results.Answer(response);
}

void RemoveTrees(ZOVA::APIRequest*, ZOVA::APIResponse* response, void* data) {
    TreeRemoval removal([response](const RemovalState& state) { response->SetSuccess(state.ToJson()); });
    removal.Run(CurrentCaller(), *static_cast<std::vector<std::string>*>(data));
}

/** Whether there is something at the path that the caller might remove. */
FileError Find(const std::string& path) {
    Spot spot;
    const FileError error = OpenSpot(CurrentCaller(), path, spot);
    if (error != FILE_OK) {
        return error;
    }
    struct stat status;
    return fstatat(spot.folder.Get(), spot.name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0
               ? FILE_OK
               : ErrorOf(errno, "looking at a path");
}

void RemoveInBackground(std::vector<std::string> paths, ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Results results;
    for (const std::string& path : paths) {
        results.Add(path, Find(path));
    }
    if (results.FirstError() != FILE_OK) {
        results.Answer(response);
        return;
    }
    ZOVA::APIPolling polling(request);
    polling.SetPrefixAttr(kDeletePrefix);
    // Where it fails, the response holds what the framework set, or the 117 that it held before.
    polling.Start(response, RemoveTrees, &paths);
}

}  // namespace

void Delete(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("delete", response, [&] {
        std::vector<std::string> paths;
        bool isRecursive = false;
        if (!ReadPaths(request, response, paths) || !ReadFlag(request, response, "recursive", isRecursive)) {
            return;
        }
        if (isRecursive) {
            RemoveInBackground(std::move(paths), request, response);
        } else {
            RemoveAtOnce(paths, response);
        }
    });
}

}  // namespace package
