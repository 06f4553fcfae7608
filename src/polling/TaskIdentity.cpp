#include <signal.h>

#include <cerrno>
#include <cstring>

#include "base/Log.h"
#include "polling/APIPollingPrivate.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"

namespace ZOVA {

// ---- the public object ----

APIPolling::APIPolling() : APIPolling(nullptr) {}

APIPolling::APIPolling(APIRequest* request) : d(new APIPollingPrivate(this, request)) {}

APIPolling::~APIPolling() {
    delete d;
}

void APIPolling::SetRequest(APIRequest* request) {
    d->request = request;
}

bool APIPolling::SetPrefixAttr(const std::string& prefix) {
    return d->SetData(kPollingAttributes, "task_id_prefix", prefix, true);
}

bool APIPolling::SetRemoveAttr(bool remove) {
    return d->SetData(kPollingAttributes, "auto_remove", remove, false);
}

bool APIPolling::SetRemoveParam(bool remove) {
    return d->SetData(kPollingAttributes, "auto_remove_params", remove, false);
}

bool APIPolling::SetGroupAttr(const std::string& group) {
    if (!group.empty() && group != "admin" && group != "everyone") {
        POLLING_LOG("bad parameters");
        return d->Fail(POLLING_ERR_BAD_PARAMETERS);
    }
    if (group == "admin" && (d->request == nullptr || !d->request->IsAdmin())) {
        POLLING_LOG("No permission");
        return d->Fail(POLLING_ERR_NO_PERMISSION);
    }
    return d->SetData(kPollingAttributes, "share_to_group", group, true);
}

bool APIPolling::Start(APIResponse* response, WorkFunc work, void* data) {
    return d->Start(response, work, data);
}

bool APIPolling::Status(const std::string& fullId, Json::Value& out) {
    return d->Status(fullId, out);
}

bool APIPolling::Status(const char* fullId, Json::Value& out) {
    return d->Status(std::string(fullId == nullptr ? "" : fullId), out);
}

bool APIPolling::Status(const Json::Value& fullIds, Json::Value& out) {
    return d->Status(fullIds, out);
}

bool APIPolling::Stop(const std::string& fullId, bool remove) {
    return d->Stop(fullId, remove);
}

bool APIPolling::List(const std::string& prefix, const Json::Value& groups, Json::Value& out) {
    return d->List(prefix, groups, out);
}

void APIPolling::SetError(int error) {
    d->SetError(error);
}

int APIPolling::GetError() const {
    return d->GetError();
}

// ---- the private one ----

APIPollingPrivate::APIPollingPrivate(APIPolling* owner, APIRequest* call)
    : polling(owner), request(call), error(POLLING_ERR_UNKNOWN) {
    InitField(kPollingAttributes);
}

APIPollingPrivate::~APIPollingPrivate() = default;

bool APIPollingPrivate::Fail(int code) {
    SetError(code);
    return false;
}

// ---- whose task it is ----

bool APIPollingPrivate::GetUserAndTaskID(const std::string& fullId, std::string& owner, std::string& id) {
    const std::size_t slash = fullId.find('/');
    if (slash == std::string::npos) {
        return false;
    }
    owner = fullId.substr(0, slash);
    id = fullId.substr(slash + 1);
    return true;
}

bool APIPollingPrivate::CheckTaskUser(const std::string& owner) const {
    if (owner != request->GetLoginUserName() && owner != kUsersOwner && owner != kAdministratorsOwner) {
        POLLING_LOG("Invalid task id");
        return false;
    }
    if (owner == kAdministratorsOwner && !request->IsAdmin()) {
        POLLING_LOG("Permission denied");
        return false;
    }
    return true;
}

Json::Value APIPollingPrivate::ConverToFullTaskId(const std::string& owner, const Json::Value& ids) {
    const auto full = [&owner](const Json::Value& id) { return owner + "/" + Json::asString(id); };
    Json::Value result;
    if (owner.empty()) {
        return result;
    }
    if (ids.isString()) {
        return full(ids);
    }
    if (ids.type() == Json::objectValue) {
        for (auto id = ids.begin(); id != ids.end(); ++id) {
            result[id.name()] = full(*id);
        }
    } else if (ids.type() == Json::arrayValue) {
        for (const Json::Value& id : ids) {
            result.append(full(id));
        }
    }
    return result;
}

bool APIPollingPrivate::DoKill(int pid) {
    if (pid < 1) {
        POLLING_LOG("invalid process id");
        return false;
    }
    if (kill(pid, SIGTERM) == 0 || errno == ESRCH) {
        return true;
    }
    const int reason = errno;
    char text[256] = "";
    POLLING_LOG("Failed to kill %d, reason=%s(%d)", pid, strerror_r(reason, text, sizeof(text)), reason);
    return false;
}

}  // namespace ZOVA
