#include "LinkFence.h"

#include "../common/PlatformSharedPath.h"
#include "../common/UniqueFd.h"
#include "ClientPath.h"

namespace package {

bool LinkFence::Admit(const ZOVA::APIRequest* request, const std::vector<std::string>& paths) {
    const ZOVA::sharing::record::Entry link = request->GetSharingEntry();
    owner = link.ownerUid;
    for (const std::string& path : paths) {
        struct stat status;
        const UniqueFd shared(IsClientPath(path) ? ZovaLinkOpenPath(&link, path.c_str()) : -1);
        if (!shared.IsOpen() || fstat(shared.Get(), &status) != 0) {
            return false;
        }
        admitted[path] = {status.st_dev, status.st_ino};
    }
    return true;
}

bool LinkFence::IsAdmitted(const std::string& path, const struct stat& status) const {
    const auto found = admitted.find(path);
    return found != admitted.end() && found->second == std::make_pair(status.st_dev, status.st_ino) && IsShared(status);
}

bool LinkFence::IsShared(const struct stat& status) const {
    return status.st_uid == owner && (S_ISREG(status.st_mode) || S_ISDIR(status.st_mode));
}

std::vector<std::string> SharedPaths(const ZOVA::APIRequest* request) {
    const ZOVA::sharing::record::Entry link = request->GetSharingEntry();
    return link.paths;
}

}  // namespace package
