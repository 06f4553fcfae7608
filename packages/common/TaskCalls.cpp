#include "TaskCalls.h"

#include <webapi/APIPolling.h>
#include <webapi/Json.h>

#include "Parameters.h"

namespace package {
namespace {

constexpr char kTaskId[] = "task_id";
constexpr char kRemove[] = "remove";

/** Whether the id of a full task id begins with the prefix. */
bool HasPrefix(const std::string& fullId, const std::string& prefix) {
    const std::size_t slash = fullId.find('/');
    return prefix.empty() || (slash != std::string::npos && fullId.compare(slash + 1, prefix.size(), prefix) == 0);
}

/** Whether the id may be passed on. One of another kind is answered as one that does not exist. */
bool IsOfThisKind(ZOVA::APIResponse* response, const std::string& fullId, const std::string& prefix) {
    // Without a slash it is no id at all, which the framework tells.
    if (fullId.find('/') == std::string::npos || HasPrefix(fullId, prefix)) {
        return true;
    }
    response->SetError(ZOVA::POLLING_ERR_NO_SUCH_TASK, Json::Value());
    return false;
}

Json::Value OnlyOfThisKind(const Json::Value& fullIds, const std::string& prefix) {
    Json::Value known(Json::arrayValue);
    for (const Json::Value& id : fullIds) {
        if (HasPrefix(Json::asString(id), prefix)) {
            known.append(id);
        }
    }
    return known;
}

}  // namespace

void AnswerTaskStatus(ZOVA::APIRequest* request, ZOVA::APIResponse* response, const std::string& prefix) {
    const Json::Value id = request->GetParam(kTaskId, Json::Value());
    ZOVA::APIPolling polling(request);
    Json::Value status;
    bool found = false;
    if (id.isString()) {
        const std::string fullId = Json::asString(id);
        if (!IsOfThisKind(response, fullId, prefix)) {
            return;
        }
        found = polling.Status(fullId, status);
    } else if (id.type() == Json::arrayValue && id.size() <= kMostTaskIds) {
        found = polling.Status(OnlyOfThisKind(id, prefix), status);
    } else {
        RefuseParameter(response, kTaskId);
        return;
    }
    if (found) {
        response->SetSuccess(status);
    } else {
        response->SetError(polling.GetError(), Json::Value());
    }
}

void AnswerTaskStop(ZOVA::APIRequest* request, ZOVA::APIResponse* response, const std::string& prefix) {
    const auto id = request->GetAndCheckString(kTaskId, ZOVA::APIRequest::PARAM_REQUIRED);
    if (id.IsInvalid() || id.IsReset()) {
        RefuseParameter(response, kTaskId);
        return;
    }
    const auto remove = request->GetAndCheckBool(kRemove, ZOVA::APIRequest::PARAM_OPTIONAL);
    if (remove.IsInvalid() || remove.IsReset()) {
        RefuseParameter(response, kRemove);
        return;
    }
    if (!IsOfThisKind(response, id.Get(), prefix)) {
        return;
    }
    ZOVA::APIPolling polling(request);
    if (polling.Stop(id.Get(), remove.Get(true))) {
        response->SetSuccess(Json::Value());
    } else {
        response->SetError(polling.GetError(), Json::Value());
    }
}

}  // namespace package
