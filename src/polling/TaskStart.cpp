#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "base/Fence.h"
#include "base/Log.h"
#include "polling/APIPollingPrivate.h"
#include "taskmanager.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "webapi/Pipe.h"
#include "zovacore.h"

namespace ZOVA {

namespace {

/** How long the answer waits for the child's first report. */
constexpr int kReportSeconds = 60;

/** Calls foreign code: what it throws would otherwise unwind into the parent's side of the call. */
void RunWork(APIPolling::WorkFunc work, APIRequest* request, APIResponse* response, void* data) {
    if (const auto thrown = base::ThrownBy([&] { work(request, response, data); })) {
        POLLING_LOG("the work function threw: %s", thrown->c_str());
        response->SetError(WEBAPI_ERR_INTERNAL, Json::Value());
    }
}

}  // namespace

bool APIPollingPrivate::Start(APIResponse* response, APIPolling::WorkFunc work, void* argument) {
    if (request == nullptr) {
        POLLING_LOG("unknown request");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    if (response == nullptr || work == nullptr) {
        POLLING_LOG("bad parameters");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    const std::string prefix = Json::asString(GetData(kPollingAttributes, "task_id_prefix", ""));
    const std::string group = Json::asString(GetData(kPollingAttributes, "share_to_group", ""));
    const bool autoRemove = Json::asBool(GetData(kPollingAttributes, "auto_remove", true));
    const bool withoutParams = Json::asBool(GetData(kPollingAttributes, "auto_remove_params", false));
    std::string owner;
    if (!OwnerOfGroup(group, *response, owner)) {
        return false;
    }

    const std::string id =
        HasNul(owner) || HasNul(prefix) ? "" : ZELM::TaskUtil::getUniqueID(owner.c_str(), prefix.c_str());
    const auto task = std::make_unique<ZELM::Task>(owner.c_str(), id.c_str());
    task->beginUpdate();
    task->setProperty("info", DescribeTask(group, prefix, withoutParams));
    task->setProperty("auto_remove", autoRemove);
    if (!task->endUpdate()) {
        POLLING_LOG("Failed to set property.");
        return false;
    }

    const int child = QLIBCProcFork();
    if (child == 0) {
        RunChild(*task, owner, response, work, argument);
    }
    if (child < 0) {
        const int reason = errno;
        task->remove();
        char text[256] = "";
        POLLING_LOG("Failed to fork(). %s", strerror_r(reason, text, sizeof(text)));
        response->SetError(WEBAPI_ERR_COMPOUND_BAD_REQUEST, Json::Value());
        return false;
    }
    task->waitForDataReady("task_run", kReportSeconds);
    Json::Value answer(Json::objectValue);
    answer["task_id"] = owner + "/" + task->getTaskId();
    response->SetSuccess(answer);
    return true;
}

bool APIPollingPrivate::OwnerOfGroup(const std::string& group, APIResponse& response, std::string& owner) const {
    if (group.empty()) {
        owner = request->GetLoginUserName();
    } else if (group == "admin") {
        if (!request->IsAdmin()) {
            response.SetError(WEBAPI_ERR_NO_PERMISSION, Json::Value());
            return false;
        }
        owner = kAdministratorsOwner;
    } else if (group == "everyone") {
        owner = kUsersOwner;
    } else {
        response.SetError(WEBAPI_ERR_TASK_BAD_GROUP, Json::Value());
        return false;
    }
    return true;
}

Json::Value APIPollingPrivate::DescribeTask(const std::string& group, const std::string& prefix,
                                            bool withoutParams) const {
    Json::Value info(Json::objectValue);
    info["api"] = request->GetAPIClass();
    info["version"] = request->GetAPIVersion();
    info["method"] = request->GetAPIMethod();
    info["group"] = group;
    info["prefix"] = prefix;
    if (!withoutParams) {
        Json::Value params = request->GetParam("", Json::Value(Json::objectValue));
        if (params.type() == Json::objectValue) {
            for (const char* name : {"api", "version", "method"}) {
                params.removeMember(name);
            }
        }
        info["param"].swap(params);
    }
    return info;
}

void APIPollingPrivate::RunChild(ZELM::Task& task, const std::string& owner, APIResponse* response,
                                 APIPolling::WorkFunc work, void* argument) {
    // Whoever waits for the end of this process's pipes waits for this process, and not for the task.
    Pipe::CloseInherited();
    setsid();
    const std::string id = task.getTaskId();
    Json::Value environment(Json::objectValue);
    environment["task_id"] = id;
    environment["task_user"] = owner;
    environment["full_task_id"] = owner + "/" + id;
    request->InitEnv(environment);
    task.setCreatePid(getpid());
    RunWork(work, request, response, argument);
    task.reload();
    task.finish(task.getBoolProperty("auto_remove", false));
    exit(0);
}

}  // namespace ZOVA
