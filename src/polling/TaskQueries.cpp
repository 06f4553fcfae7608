#include "base/Log.h"
#include "base/Printable.h"
#include "polling/APIPollingPrivate.h"
#include "taskmanager.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"

namespace ZOVA {

namespace {

bool TaskExists(const std::string& owner, const std::string& id) {
    return !HasNul(owner) && !HasNul(id) && ZELM::TaskUtil::checkTaskExists(owner.c_str(), id.c_str());
}

Json::Value StatusOf(const std::string& owner, const std::string& id) {
    const ZELM::Task task(owner.c_str(), id.c_str());
    Json::Value status = task.getProperty("body");
    if (status.type() != Json::objectValue) {
        status = Json::Value(Json::objectValue);
    }
    status["finish"] = task.isFinished();
    status["auto_remove"] = task.getProperty("auto_remove");
    if (task.hasProperty("info")) {
        status["info"] = task.getProperty("info");
    }
    return status;
}

}  // namespace

bool APIPollingPrivate::Status(const std::string& fullId, Json::Value& out) {
    if (request == nullptr) {
        POLLING_LOG("unknown request");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    if (fullId.empty()) {
        POLLING_LOG("bad parameters");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    std::string owner;
    std::string id;
    if (!GetUserAndTaskID(fullId, owner, id) || !CheckTaskUser(owner)) {
        POLLING_LOG("Invalid task id[%s]", base::Printable(fullId).c_str());
        return Fail(POLLING_ERR_BAD_TASK_ID);
    }
    if (!TaskExists(owner, id)) {
        POLLING_LOG("No such task id[%s]", base::Printable(fullId).c_str());
        return Fail(POLLING_ERR_NO_SUCH_TASK);
    }
    out = StatusOf(owner, id);
    return true;
}

bool APIPollingPrivate::Status(const Json::Value& fullIds, Json::Value& out) {
    if (request == nullptr) {
        POLLING_LOG("unknown request");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    if (!Json::isArray(fullIds)) {
        POLLING_LOG("bad parameters");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    Json::Value statuses(Json::objectValue);
    for (const Json::Value& element : fullIds) {
        const std::string fullId = Json::asString(element);
        std::string owner;
        std::string id;
        if (!GetUserAndTaskID(fullId, owner, id) || !CheckTaskUser(owner)) {
            POLLING_LOG("Invalid task id[%s]", base::Printable(fullId).c_str());
            continue;
        }
        statuses[fullId] = TaskExists(owner, id) ? StatusOf(owner, id) : Json::Value(Json::objectValue);
    }
    out.swap(statuses);
    return true;
}

bool APIPollingPrivate::Stop(const std::string& fullId, bool remove) {
    if (request == nullptr) {
        POLLING_LOG("unknown request");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    std::string owner;
    std::string id;
    if (!GetUserAndTaskID(fullId, owner, id)) {
        POLLING_LOG("Invalid task id[%s]", base::Printable(fullId).c_str());
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    if (!CheckTaskUser(owner)) {
        return Fail(POLLING_ERR_BAD_TASK_ID);
    }
    if (!TaskExists(owner, id)) {
        POLLING_LOG("No such task id[%s]", base::Printable(fullId).c_str());
        return Fail(POLLING_ERR_NO_SUCH_TASK);
    }
    ZELM::Task task(owner.c_str(), id.c_str());
    const int pid = task.getCreatePid();
    if (pid > 0 && !DoKill(pid)) {
        POLLING_LOG("send SIGTERM to task id[%s] fail", base::Printable(fullId).c_str());
        return Fail(POLLING_ERR_KILL_FAILED);
    }
    if (!task.finish(remove)) {
        POLLING_LOG("set task id[%s] to finish fail", base::Printable(fullId).c_str());
        return Fail(POLLING_ERR_FINISH_FAILED);
    }
    return true;
}

bool APIPollingPrivate::List(const std::string& prefix, const Json::Value& groups, Json::Value& out) {
    if (request == nullptr) {
        POLLING_LOG("unknown request");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    if (!Json::isArray(groups)) {
        POLLING_LOG("bad parameters");
        return Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    for (const Json::Value& element : groups) {
        const std::string group = Json::asString(element);
        std::string owner;
        if (group == "admin") {
            if (!request->IsAdmin()) {
                return Fail(POLLING_ERR_NO_PERMISSION);
            }
            owner = kAdministratorsOwner;
        } else if (group == "everyone") {
            owner = kUsersOwner;
        } else if (group == "user") {
            owner = request->GetLoginUserName();
        } else {
            return Fail(POLLING_ERR_BAD_TASK_ID);
        }
        Json::Value ids;
        if (!HasNul(prefix) && !HasNul(owner)) {
            ids = ZELM::TaskMgr(owner.c_str()).getAllTaskId(prefix.empty() ? nullptr : prefix.c_str());
        }
        if (Json::isObject(out)) {
            out[group] = ConverToFullTaskId(owner, ids);
        }
    }
    return true;
}

}  // namespace ZOVA
