#include "TaskMethods.h"

#include <webapi/APIPolling.h>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/TaskCalls.h"

namespace package {
namespace {

constexpr char kPrefix[] = "prefix";
constexpr char kGroups[] = "groups";
/** Each group is one look through the store. */
constexpr Json::ArrayIndex kMostGroups = 3;

void AnswerList(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const auto prefix = request->GetAndCheckString(kPrefix, ZOVA::APIRequest::PARAM_OPTIONAL);
    if (prefix.IsInvalid() || prefix.IsReset()) {
        RefuseParameter(response, kPrefix);
        return;
    }
    Json::Value groups(Json::arrayValue);
    groups.append("user");
    groups = request->GetParam(kGroups, groups);
    if (groups.type() != Json::arrayValue || groups.size() > kMostGroups) {
        RefuseParameter(response, kGroups);
        return;
    }
    ZOVA::APIPolling polling(request);
    Json::Value tasks(Json::objectValue);
    if (polling.List(prefix.Get(), groups, tasks)) {
        response->SetSuccess(tasks);
    } else {
        response->SetError(polling.GetError(), Json::Value());
    }
}

}  // namespace

void TaskStatus(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("status", response, [&] { AnswerTaskStatus(request, response, ""); });
}

void StopTask(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("stop", response, [&] { AnswerTaskStop(request, response, ""); });
}

void ListTasks(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("list", response, [&] { AnswerList(request, response); });
}

}  // namespace package
