// The check library of the project "ZOVA.Storage.File": what visitors may call, and about which paths.

#include <webapi/APIRequest.h>
#include <webapi/APITable.h>
#include <webapi/Json.h>

#include <string>
#include <vector>

#include "ClientPath.h"
#include "LinkFence.h"

namespace {

constexpr unsigned int kMostPaths = 1000;

/** A text, or an array of texts. */
bool ReadPaths(const Json::Value& given, std::vector<std::string>& paths) {
    if (given.isString()) {
        paths.push_back(given.asString());
        return true;
    }
    if (given.type() != Json::arrayValue || given.size() > kMostPaths) {
        return false;
    }
    for (const Json::Value& path : given) {
        if (!path.isString()) {
            return false;
        }
        paths.push_back(path.asString());
    }
    return true;
}

bool AreShared(const ZOVA::APIRequest* request, const Json::Value& given) {
    std::vector<std::string> paths;
    return ReadPaths(given, paths) && package::LinkFence().Admit(request, paths);
}

/** What the link shares, or what lies in a folder of it. The first is the method's own answer and no path. */
bool MayList(ZOVA::APIRequest* request, ZOVA::APIResponse*) {
    const Json::Value path = request->GetParam("path", package::kTopPath);
    return path == Json::Value(package::kTopPath) || AreShared(request, path);
}

bool MayRead(ZOVA::APIRequest* request, ZOVA::APIResponse*) {
    return AreShared(request, request->GetParam("paths", Json::Value(Json::arrayValue)));
}

constexpr char kApi[] = "^ZOVA[.]Storage[.]File$";

const ZOVA::_tag_API_SHARING_CHECK_TABLE kTable[] = {
    {kApi, 1, "^list$", MayList},
    {kApi, 1, "^(stat|download)$", MayRead},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
    return kTable;
}
