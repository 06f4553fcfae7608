// The check library of a project's sharing links, as docs/sharing.md shows it.

#include <unistd.h>
#include <webapi/APIRequest.h>
#include <webapi/APITable.h>
#include <webapi/Json.h>
#include <zova/zovalinks.h>
#include <zova/zovasharing.h>

namespace {

bool MayRead(ZOVA::APIRequest* request, ZOVA::APIResponse*) {
    const ZOVA::sharing::record::Entry entry = request->GetSharingEntry();
    const int shared = ZovaLinkOpenPath(&entry, Json::asString(request->GetParam("path", "")).c_str());
    if (shared >= 0) {
        close(shared);
    }
    return shared >= 0;
}

const ZOVA::_tag_API_SHARING_CHECK_TABLE kTable[] = {
    {"^Example[.]Greeting$", 1, "^hello$", MayRead},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
    return kTable;
}
