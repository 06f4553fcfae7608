#include <webapi/APITable.h>

#include "../common/Fence.h"
#include "../common/TaskCalls.h"
#include "StartSearch.h"

namespace {

constexpr char kApi[] = "ZOVA.Storage.Search";

/** "status": as that of ZOVA.Core.Task, for searches. */
void SearchStatus(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    package::Fenced("status", response, [&] { package::AnswerTaskStatus(request, response, package::kSearchPrefix); });
}

/** "stop": as that of ZOVA.Core.Task, for searches. */
void StopSearch(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    package::Fenced("stop", response, [&] { package::AnswerTaskStop(request, response, package::kSearchPrefix); });
}

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "start", package::StartSearch},
    {kApi, 1, "status", SearchStatus},
    {kApi, 1, "stop", StopSearch},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
