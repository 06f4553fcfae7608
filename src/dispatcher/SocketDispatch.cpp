#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <string>

#include "base/Log.h"
#include "dispatcher/MethodAttributes.h"
#include "dispatcher/PermissionFrame.h"
#include "dispatcher/UploadFrame.h"
#include "envelope/APIRequestPrivate.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"
#include "zovadaemon.h"

namespace ZOVA {

namespace {

std::string SocketOf(const APIRequest& request) {
    return Json::asString(request.GetAPIInfo("socket", ""));
}

bool Allows(const Json::Value& attributes, const char* what) {
    return Json::asBool(Json::member(attributes, what));
}

bool IsSocket(const std::string& path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 && S_ISSOCK(status.st_mode);
}

/** Tells of a failure at the socket, and of its reason if there is one, which is then forgotten. */
void LogFailure(const char* what, const std::string& path) {
    const int process = static_cast<int>(getpid());
    if (errno == 0) {
        WEBAPI_LOG(LOG_ERR, "(%d) %s: %s", process, what, path.c_str());
        return;
    }
    WEBAPI_LOG(LOG_ERR, "(%d) %s: %s [err: %m]", process, what, path.c_str());
    errno = 0;
}

/** Request and response to the daemon, and its response back; false if it gave none. Logs. */
bool Forward(const std::string& path, const APIRequest& request, const APIResponse& response, Json::Value& answer) {
    zovadaemon::DomainSockConnection connection(path);
    if (!connection.Connect()) {
        LogFailure("Failed to connect domain socket", path);
        return false;
    }
    Json::Value message(Json::objectValue);
    message["req"] = request.Serialize();
    message["resp"] = response.Serialize();
    if (!connection.Send(Json::toString(message))) {
        LogFailure("Failed to send data from socket", path);
        return false;
    }
    std::string text;
    if (!connection.Recv(text)) {
        LogFailure("Failed to recv data from socket", path);
        return false;
    }
    // Anything but an object is no response, and would leave this one without a body.
    if (!Json::fromString(answer, text) || answer.type() != Json::objectValue) {
        LogFailure("Failed to parse response from socket", path);
        return false;
    }
    return true;
}

}  // namespace

bool APIRunner::CanProcessSocket(APIRequest* call) {
    // The daemon itself must not forward to itself.
    if (call == nullptr || getenv("in_zovaapid") != nullptr) {
        return false;
    }
    const std::string path = SocketOf(*call);
    if (path.empty() || Json::asBool(call->GetAPIInfo("disableSocket", false))) {
        return false;
    }
    if (!IsSocket(path)) {
        LogFailure("socket is not ready", path);
        return false;
    }
    const Json::Value& attributes =
        MethodAttributes(*this, {call->GetAPIClass(), call->GetAPIVersion(), call->GetAPIMethod()});
    // Only this process holds an upload that the method takes itself, and the output that a download writes.
    if ((Allows(attributes, "allowUpload") && Allows(attributes, "deferUpload")) ||
        Allows(attributes, "allowDownload")) {
        return false;
    }
    return !Allows(attributes, "disableSocket");
}

bool APIRunner::ProcessSocket(APIRequest* call, APIResponse* answer) {
    // What the daemon runs is what was admitted, as in `ProcessLib`.
    const CallName name{call->GetAPIClass(), call->GetAPIVersion(), call->GetAPIMethod()};
    if (!PassesGate(*this, call, answer)) {
        return false;
    }
    const Json::Value attributes = MethodAttributes(*this, name);
    if (!TakesUpload(*this, name, attributes, call, answer)) {
        return false;
    }
    // Stands as the answer unless the daemon's replaces it.
    answer->SetError(WEBAPI_ERR_INTERNAL, Json::Value());
    Json::Value reply;
    if (!Forward(SocketOf(*call), *call, *answer, reply)) {
        return false;
    }
    answer->Deserialize(reply);
    return true;
}

}  // namespace ZOVA
