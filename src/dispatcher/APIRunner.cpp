#include "webapi/APIRunner.h"

#include <unistd.h>

#include <cstdlib>
#include <cstring>

#include "base/Fence.h"
#include "base/Log.h"
#include "dispatcher/APIRunnerPrivate.h"
#include "dispatcher/HatScope.h"
#include "envelope/APIResponsePrivate.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "webapi/Pipe.h"
#include "webapiutil.h"
#include "zovacore.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr const char* kDefaultsPath = "/usr/zova/zovaman/webapi/lib.def";
constexpr const char* kEntryAPI = "ZOVA.Entry.Request";
constexpr const char* kEntryMethod = "request";

}  // namespace

// ---- life ----

APIRunner::APIRunner()
    : libDefault(Json::objectValue),
      libDesc(Json::objectValue),
      request(new APIRequest(Json::Value())),
      response(new APIResponse(request)),
      entryDepth(0),
      d(new APIRunnerPrivate(this)) {
    setsid();
    WebAPIUtil::ReadJsonFile(libDefault, kDefaultsPath);
}

APIRunner::~APIRunner() {
    CloseLib();
    delete request;
    delete response;
    d->RestoreName();
    delete d;
}

// ---- hooks of the bare runner, which lets everything through ----

bool APIRunner::CheckSharingPermission(APIRequest*, APIResponse*) {
    return true;
}

bool APIRunner::NeedPermission(APIRequest*) {
    return false;
}

bool APIRunner::CheckPermission(APIRequest*, APIResponse*) {
    return true;
}

bool APIRunner::HandleUpload(APIRequest*, APIResponse*) {
    return true;
}

bool APIRunner::SkipPermission(APIRequest*) {
    return true;
}

// ---- the frame ----

void APIRunner::Run(const Json::Value& description) {
    if (description.isNull()) {
        response->SetError(WEBAPI_ERR_BAD_REQUEST, Json::Value());
        return;
    }
    if (!Initialize(description) || !SetProcessName(request, response)) {
        return;
    }
    if (request->HasParam("relay_zn")) {
        response->SetError(WEBAPI_ERR_BAD_REQUEST, Json::Value());
        return;
    }
    Process(request, response);
}

bool APIRunner::InitEnv(Json::Value& env) {
    if (env.type() != Json::objectValue) {
        response->SetError(WEBAPI_ERR_BAD_REQUEST, Json::Value());
        return false;
    }
    for (char** entry = environ; entry != nullptr && *entry != nullptr; ++entry) {
        const char* text = *entry;
        if (const char* equals = strchr(text, '=')) {
            env[std::string(text, equals)] = equals + 1;
        }
    }
    return true;
}

bool APIRunner::Initialize(const Json::Value& description) {
    Json::Value env(Json::objectValue);
    if (!InitEnv(env)) {
        return false;
    }
    request->InitEnv(env);
    if (Json::hasMember(description, "environ")) {
        request->InitEnv(description["environ"]);
    }
    if (Json::hasMember(description, "session")) {
        request->InitSession(description["session"]);
    }
    const Json::Value& attributes = Json::member(description, "attr");
    if (attributes.type() == Json::objectValue) {
        for (auto attribute = attributes.begin(); attribute != attributes.end(); ++attribute) {
            request->SetAttr(attribute.name(), *attribute);
        }
    }
    if (description.type() != Json::objectValue || description.empty()) {
        response->SetError(WEBAPI_ERR_BAD_REQUEST, Json::Value());
        return false;
    }
    request->InitParam(description, false);
    return true;
}

Json::Value APIRunner::GetResponse() const {
    if (response == nullptr) {
        return Json::Value();
    }
    Json::Value body = response->GetBody();
    if (Json::isObject(body)) {
        body["httpd_restart"] = response->GetHttpdRestart();
    }
    return body;
}

bool APIRunner::Process(APIRequest* call, APIResponse* answer) {
    if (!SetProcessName(call, answer) || !CheckRequestParam(call, answer)) {
        return false;
    }
    const std::string api = call->GetAPIClass();
    const int version = call->GetAPIVersion();
    const std::string method = call->GetAPIMethod();
    if (!AddAPIInfo(call)) {
        return false;
    }
    if (call->HasParam("relay_zn")) {
        answer->SetError(WEBAPI_ERR_RELAY_FAILED, Json::Value());
        return false;
    }
    bool result = false;
    if (api == kEntryAPI) {
        result = ProcessEntry(call, answer);
    } else if (CanProcessSocket(call)) {
        result = ProcessSocket(call, answer);
    } else {
        result = ProcessLib(call, answer);
    }
    // A batch has named the process after its entries. A refusal is logged, and must not replace the answer.
    d->SetCallName(api, version, method);
    return result;
}

bool APIRunner::ProcessEntry(APIRequest* call, APIResponse* answer) {
    if (call->GetAPIMethod() != kEntryMethod) {
        return false;
    }
    if (!call->HasParam("compound")) {
        answer->SetError(WEBAPI_ERR_COMPOUND_BAD_REQUEST, Json::Value());
        return false;
    }
    ++entryDepth;
    const bool result = HandleCompound(call, answer);
    --entryDepth;
    return result;
}

// ---- the name of the process ----

void APIRunner::SetArgs(int argc, char** argv) {
    d->SetArgs(argc, argv);
}

bool APIRunner::SetProcessName(APIRequest* call, APIResponse* answer) {
    const std::string api = call->GetAPIClass();
    if (api.empty()) {
        answer->SetError(WEBAPI_ERR_BAD_REQUEST, Json::Value());
        return false;
    }
    if (!d->SetCallName(api, call->GetAPIVersion(), call->GetAPIMethod())) {
        answer->SetError(WEBAPI_ERR_PROCESS_NAME_FAILED, Json::Value());
        return false;
    }
    return true;
}

// ---- work after the answer ----

void APIRunner::HandleCallback(APIResponse* answer) {
    if (answer == nullptr) {
        return;
    }
    const auto* callbacks = static_cast<const ResponseCallbackList*>(answer->GetCallbackFuncs());
    if (callbacks == nullptr || callbacks->empty() || QLIBCProcFork() != 0) {
        return;
    }
    Pipe::CloseInherited();
    setsid();
    sleep(1);
    const bool restricted = ZOVA_aa_has_profile_restricted() != 0;
    if (restricted && ChangeHat("DefaultHat", hatToken) == -1) {
        WEBAPI_LOG(LOG_ERR, "AppArmor: chagehat failed [%m]");
    }
    for (const ResponseCallback& callback : *callbacks) {
        if (callback.function != nullptr) {
            // One that throws would unwind the child's copy of the call, and take the others with it.
            if (const auto thrown = base::ThrownBy([&] { callback.function(callback.argument); })) {
                WEBAPI_LOG(LOG_ERR, "a callback threw: %s", thrown->c_str());
            }
        }
    }
    if (restricted && ChangeHat(nullptr, hatToken) < 0) {
        WEBAPI_LOG(LOG_ERR, "AppArmor: chagehat Original Hat failed [%m]");
    }
    exit(0);
}

}  // namespace ZOVA
