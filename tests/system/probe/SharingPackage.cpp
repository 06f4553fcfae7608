// An API whose methods can be called through sharing links, and the check library of the project "probe", in one file.
// The method "read" gives out what lies at "path"; the check lets visitors have nothing but what their link shares.

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/Json.h>

#include <unistd.h>

#include <fstream>
#include <iterator>

#include "zovalinks.h"
#include "zovasharing.h"

namespace {

std::string PathOf(const ZOVA::APIRequest* request) {
    return Json::asString(request->GetParam("path", ""));
}

void Tell(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Json::Value data(Json::objectValue);
    data["sharing"] = request->IsSharing();
    data["user"] = request->GetLoginUserName();
    data["authorized"] = request->IsAuthorized();
    data["project"] = request->GetSharingEntry().get_project_name();
    response->SetSuccess(data);
}

void Read(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::ifstream file(PathOf(request), std::ios::binary);
    Json::Value data(Json::objectValue);
    data["content"] = std::string(std::istreambuf_iterator<char>(file), {});
    data["user"] = request->GetLoginUserName();
    response->SetSuccess(data);
}

bool MayRead(ZOVA::APIRequest* request, ZOVA::APIResponse*) {
    const ZOVA::sharing::record::Entry entry = request->GetSharingEntry();
    const int shared = ZovaLinkOpenPath(&entry, PathOf(request).c_str());
    if (shared >= 0) {
        close(shared);
    }
    return shared >= 0;
}

bool Refuse(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetError(1001, Json::Value());
    return false;
}

const ZOVA::_tag_API_TABLE kTable[] = {
    {"ZOVA.Test.Sharing", 1, "read", Read},     {"ZOVA.Test.Sharing", 1, "refused", Tell},
    {"ZOVA.Test.Sharing", 1, "unlisted", Tell}, {"ZOVA.Test.Sharing", 1, "unchecked", Tell},
    {"ZOVA.Test.Sharing", 1, "closed", Tell},   {nullptr, 0, nullptr, nullptr},
};

const ZOVA::_tag_API_SHARING_CHECK_TABLE kChecks[] = {
    {"^ZOVA[.]Test[.]Sharing$", 1, "^read$", MayRead},
    {"^ZOVA[.]Test[.]Sharing$", 1, "^refused$", Refuse},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
    return kChecks;
}
