#include "webapi/CompoundHandler.h"

#include <signal.h>
#include <unistd.h>

#include <cerrno>
#include <new>

#include "base/Log.h"
#include "envelope/APIRequestPrivate.h"
#include "envelope/APIResponsePrivate.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"
#include "webapi/Pipe.h"
#include "zovacore.h"

namespace ZOVA {

namespace {

constexpr int kForkFlags = 65;
constexpr useconds_t kParentPollMicroseconds = 200000;
constexpr const char* kStopped = "compound stop when error.";
constexpr const char* kTransferRefused = "not allow upload or download API.";

ResponseCallbackList& Callbacks(APIResponse& response) {
    return *static_cast<ResponseCallbackList*>(response.GetCallbackFuncs());
}

/** Also when the child has become a user who may not signal it. */
bool IsAlive(int process) {
    return kill(process, 0) == 0 || errno == EPERM;
}

bool AllowsTransfer(APIRunner& runner, APIRequest& call) {
    const Json::Value& attributes = runner.GetMethod(call.GetAPIClass(), call.GetAPIVersion(), call.GetAPIMethod());
    return Json::asBool(Json::member(attributes, "allowUpload")) ||
           Json::asBool(Json::member(attributes, "allowDownload"));
}

}  // namespace

CompoundHandler::CompoundHandler(APIRequest* outerRequest, APIResponse* outerResponse, APIRunner* outerRunner)
    : request(outerRequest),
      response(outerResponse),
      runner(outerRunner),
      subRequest(nullptr),
      subResponse(nullptr),
      stopWhenError(false),
      parallelMode(false),
      hasFail(false),
      compoundList(nullptr),
      compoundResult(Json::objectValue),
      compoundInfo(Json::arrayValue) {}

CompoundHandler::~CompoundHandler() {
    delete subResponse;
    delete subRequest;
    for (const auto& pair : pipeList) {
        delete pair.first;
    }
}

// ---- the batch ----

bool CompoundHandler::Process() {
    int code = ParseParams();
    if (code != WEBAPI_ERR_NONE) {
        WEBAPI_LOG(LOG_ERR, "ParseParams failed");
    } else if ((code = PrepareNewCompReqResp()) != WEBAPI_ERR_NONE) {
        WEBAPI_LOG(LOG_ERR, "PrepareNewCompReqResp failed");
    } else if ((code = CompoundProcess()) != WEBAPI_ERR_NONE) {
        WEBAPI_LOG(LOG_ERR, "CompoundProcess failed");
    }
    Output(static_cast<_tag_WEBAPI_ERR>(code));
    if (subResponse != nullptr) {
        response->SetCallbackFuncs(subResponse->GetCallbackFuncs());
    }
    return code == WEBAPI_ERR_NONE;
}

int CompoundHandler::ParseParams() {
    parallelMode = Json::asString(request->GetParamRef("mode", "sequential")) == "parallel";
    stopWhenError = !parallelMode && Json::asBool(request->GetParamRef("stop_when_error", false));
    compoundList = &Json::member(request->GetParamRef("", Json::Value::nullSingleton()), "compound");
    return compoundList->type() == Json::arrayValue ? WEBAPI_ERR_NONE : WEBAPI_ERR_COMPOUND_BAD_REQUEST;
}

int CompoundHandler::PrepareNewCompReqResp() {
    subRequest = new (std::nothrow) APIRequest(*request);
    if (subRequest == nullptr) {
        WEBAPI_LOG(LOG_ERR, "new APIRequest Fail");
        return WEBAPI_ERR_INTERNAL;
    }
    APIRequestPrivate::Of(*subRequest).ClearData("environ", "QUERY_STRING");
    Json::Value environment = request->GetEnv("", Json::Value(Json::objectValue));
    environment.removeMember("QUERY_STRING");
    environment["REQUEST_METHOD"] = "POST";
    subRequest->InitEnv(environment);
    Json::Value params(Json::objectValue);
    params["postParam"] = Json::Value(Json::objectValue);
    subRequest->InitParam(params, false);
    subResponse = new (std::nothrow) APIResponse(subRequest);
    if (subResponse == nullptr) {
        WEBAPI_LOG(LOG_ERR, "new APIResponse Fail");
        return WEBAPI_ERR_INTERNAL;
    }
    return WEBAPI_ERR_NONE;
}

int CompoundHandler::CompoundProcess() {
    compoundResult["result"] = Json::Value(Json::arrayValue);
    for (Json::ArrayIndex index = 0; index < compoundList->size(); ++index) {
        if (CompoundProcessEntry((*compoundList)[index], index) != WEBAPI_ERR_NONE) {
            hasFail = true;
        }
    }
    if (parallelMode) {
        for (auto& pair : pipeList) {
            // One that was refused its pipe or child has its answer already.
            if (pair.first->IsReadable()) {
                PrepareCompundResponseFromChild(pair);
            }
        }
    }
    HandleCompoundInfo();
    return WEBAPI_ERR_NONE;
}

// ---- one entry ----

int CompoundHandler::CompoundProcessEntry(const Json::Value& entry, unsigned int index) {
    APIRequestPrivate::Of(*subRequest).SetCallName(CallName());
    Json::Value params(Json::objectValue);
    params["postParam"] = entry;
    subRequest->InitParam(params, true);

    int code = WEBAPI_ERR_NONE;
    if (stopWhenError && hasFail) {
        errorMessage = kStopped;
        code = WEBAPI_ERR_COMPOUND_STOPPED;
    } else if (AllowsTransfer(*runner, *subRequest)) {
        errorMessage = kTransferRefused;
        code = WEBAPI_ERR_COMPOUND_TRANSFER_REFUSED;
    } else if (parallelMode || !(runner->GetMethodAttr(subRequest, "grantable") ||
                                 runner->GetMethodAttr(subRequest, "grantByDefault"))) {
        bool finished = false;
        code = RunInChild(index, finished);
        if (finished) {
            return WEBAPI_ERR_NONE;
        }
    } else if (!runner->Process(subRequest, subResponse) || subResponse->GetError() != WEBAPI_ERR_NONE) {
        hasFail = true;
    }
    if (code != WEBAPI_ERR_NONE) {
        subResponse->SetError(code, Json::Value());
    }
    PrepareCompundResponse(index);
    return code;
}

/** Starts the entry's child; in sequential mode also takes its answer, which finishes the entry. */
int CompoundHandler::RunInChild(unsigned int index, bool& finished) {
    std::pair<Pipe*, unsigned int> pair(nullptr, 0);
    if (!InitNewPipe(pair, index)) {
        WEBAPI_LOG(LOG_ERR, "pipe init Fail");
        return WEBAPI_ERR_INTERNAL;
    }
    if (!ProcessFork(pair)) {
        WEBAPI_LOG(LOG_ERR, "fork Fail");
        pair.first->Close();
        return WEBAPI_ERR_INTERNAL;
    }
    if (!parallelMode) {
        PrepareCompundResponseFromChild(pair);
        finished = true;
    }
    return WEBAPI_ERR_NONE;
}

// ---- children ----

bool CompoundHandler::InitNewPipe(std::pair<Pipe*, unsigned int>& pair, unsigned int index) {
    pair.second = index;
    pair.first = new Pipe();
    pipeList.push_back(pair);
    if (!pair.first->Init()) {
        WEBAPI_LOG(LOG_ERR, "Pipe init failed");
        return false;
    }
    return true;
}

bool CompoundHandler::ProcessFork(std::pair<Pipe*, unsigned int>& pair) {
    const int parent = getpid();
    const int child = QLIBCProcForkEx(kForkFlags);
    if (child == -1) {
        return false;
    }
    if (child == 0) {
        RunChild(*pair.first, parent);
    }
    pair.first->ReadOnly(-1);
    return true;
}

void CompoundHandler::RunChild(Pipe& pipe, int parent) {
    pipe.WriteOnly(-1);
    // An end that a sibling holds would keep a writer waiting whose reader has gone.
    for (const auto& pair : pipeList) {
        if (pair.first != &pipe) {
            pair.first->Close();
        }
    }
    // Those of earlier entries are the parent's to run.
    Callbacks(*subResponse).clear();
    runner->Process(subRequest, subResponse);
    Json::Value message(Json::objectValue);
    PrepareCompundResponse(message["result"], message["info"]);
    if (!pipe.WriteJson(message)) {
        WEBAPI_LOG(LOG_ERR, "write json failed");
    }
    pipe.Close();
    if (!Callbacks(*subResponse).empty()) {
        while (IsAlive(parent)) {
            usleep(kParentPollMicroseconds);
        }
        runner->HandleCallback(subResponse);
    }
    _exit(0);
}

// ---- answers ----

void CompoundHandler::PrepareCompundResponse(Json::Value& result, Json::Value& info) {
    result = subResponse->GetBody();
    info = Json::Value(Json::objectValue);
    const std::string api = subRequest->GetAPIClass();
    const int version = subRequest->GetAPIVersion();
    const std::string method = subRequest->GetAPIMethod();
    if (version >= 1 && !api.empty() && !method.empty() && Json::isObject(result)) {
        result["api"] = api;
        result["version"] = version;
        result["method"] = method;
    }
    info["error"] = subResponse->GetError();
    if (subResponse->HasServerError()) {
        info["x-request-error"] = subResponse->GetServerError();
    }
    info["restart_httpd"] = subResponse->GetHttpdRestart();
}

void CompoundHandler::PrepareCompundResponse(unsigned int index) {
    PrepareCompundResponse(compoundResult["result"][index], compoundInfo[index]);
}

void CompoundHandler::PrepareCompundResponseFromChild(std::pair<Pipe*, unsigned int>& pair) {
    Json::Value message;
    if (pair.first->ReadJson(message)) {
        const Json::Value& info = Json::member(message, "info");
        compoundResult["result"][pair.second] = Json::member(message, "result");
        compoundInfo[pair.second] = info;
        if (Json::asInt(Json::member(info, "error")) != WEBAPI_ERR_NONE) {
            hasFail = true;
        }
    } else {
        WEBAPI_LOG(LOG_ERR, "read compound json failed");
        // The slot exists all the same, so that the results stay in step with the entries.
        static_cast<void>(compoundResult["result"][pair.second]);
    }
    pair.first->Close();
}

void CompoundHandler::HandleCompoundInfo() {
    for (const Json::Value& info : compoundInfo) {
        if (info.type() != Json::objectValue) {
            continue;
        }
        if (Json::asInt(Json::member(info, "error")) != WEBAPI_ERR_NONE) {
            hasFail = true;
        }
        if (Json::hasMember(info, "x-request-error")) {
            response->SetServerError(Json::asString(info["x-request-error"]));
        }
        if (Json::asBool(Json::member(info, "restart_httpd"))) {
            response->SetHttpdRestart(true);
        }
    }
}

void CompoundHandler::Output(_tag_WEBAPI_ERR code) {
    compoundResult["has_fail"] = hasFail;
    if (code == WEBAPI_ERR_NONE) {
        response->SetSuccess(compoundResult);
    } else {
        response->SetError(code, errorMessage);
    }
}

bool APIRunner::HandleCompound(APIRequest* call, APIResponse* answer) {
    CompoundHandler handler(call, answer, this);
    return handler.Process();
}

}  // namespace ZOVA
