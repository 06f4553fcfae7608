// The package of the calls through the API daemon: one method, behind an API that names the daemon's socket and one
// that does not.

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>

namespace {

void DoNothing(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetSuccess(Json::Value());
}

const ZOVA::_tag_API_TABLE kTable[] = {
    {"ZOVA.Bench.Daemon.Socket", 1, "nothing", DoNothing},
    {"ZOVA.Bench.Daemon.Process", 1, "nothing", DoNothing},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
