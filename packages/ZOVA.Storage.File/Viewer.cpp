#include "Viewer.h"

#include <errno.h>

#include "Places.h"

namespace package {

bool Viewer::BecomeCaller(ZOVA::APIResponse* response) const {
    if (!TakeIdentity(*caller)) {
        response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
        return false;
    }
    return true;
}

bool Viewer::Begin(const ZOVA::APIRequest* request, ZOVA::APIResponse* response,
                   const std::vector<std::string>& paths) {
    caller = &CurrentCaller();
    isVisitor = request->IsSharing();
    const bool isAdmitted = !isVisitor || fence.Admit(request, paths);
    if (!BecomeCaller(response)) {
        return false;
    }
    if (!isAdmitted) {
        Refuse(response, FILE_ERR_OUTSIDE);
    }
    return isAdmitted;
}

bool Viewer::BeginAtTop(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::vector<std::string>& paths) {
    caller = &CurrentCaller();
    isVisitor = request->IsSharing();
    if (isVisitor) {
        for (const std::string& path : SharedPaths(request)) {
            if (fence.Admit(request, {path})) {
                paths.push_back(path);
            }
        }
    } else {
        for (const CallerFolder& folder : caller->folders) {
            paths.push_back(folder.path);
        }
    }
    return BecomeCaller(response);
}

FileError Viewer::Open(const std::string& path, int flags, UniqueFd& out, struct stat& status) const {
    const FileError error = OpenThing(*caller, path, flags, out);
    if (error != FILE_OK) {
        return error;
    }
    if (fstat(out.Get(), &status) != 0) {
        return ErrorOf(errno, "looking at a path");
    }
    return isVisitor && !fence.IsAdmitted(path, status) ? FILE_ERR_OUTSIDE : FILE_OK;
}

}  // namespace package
