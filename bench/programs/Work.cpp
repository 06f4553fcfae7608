// The package of the batches and background tasks, apart from the small one, whose call must not grow with them.

#include <webapi/APIPolling.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>

namespace {

void DoNothing(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetSuccess(Json::Value());
}

void ReportAndEnd(ZOVA::APIRequest*, ZOVA::APIResponse* response, void*) {
    response->SetSuccess(Json::Value(Json::objectValue));
}

void StartTask(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    ZOVA::APIPolling polling(request);
    polling.SetPrefixAttr("bench-");
    polling.Start(response, ReportAndEnd, nullptr);
}

const ZOVA::_tag_API_TABLE kTable[] = {
    {"ZOVA.Bench.Work.Batch", 1, "nothing", DoNothing},
    {"ZOVA.Bench.Work.Batch", 1, "nothingForked", DoNothing},
    {"ZOVA.Bench.Work.Task", 1, "start", StartTask},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
