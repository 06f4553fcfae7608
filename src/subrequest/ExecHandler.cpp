#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <optional>
#include <string>

#include "base/Log.h"
#include "base/UniqueFd.h"
#include "dispatcher/DirectoryScope.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/ExecParam.h"
#include "webapi/Json.h"
#include "webapi/Pipe.h"
#include "zovacore.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr const char* kDescriptionDirectory = "/usr/zova/zovaman/webapi/";
constexpr const char* kUserVariable = "USERNAME";
constexpr const char* kWebUserVariable = "ZOVA_WEBAPI_USERNAME";
constexpr int kForkFlags = 65;
constexpr int kChunkSize = 4096;
constexpr const char* kHeaderEnd = "\r\n\r\n";

void SetUserVariables(const std::string& user) {
    setenv(kUserVariable, user.c_str(), 1);
    setenv(kWebUserVariable, user.c_str(), 1);
}

/** The reader's signal is the end of the pipe: nothing of this process may hold its other end any longer. */
void CloseOutput(Pipe& output) {
    output.Close();
    const base::UniqueFd null(open("/dev/null", O_WRONLY | O_CLOEXEC));
    if (null.IsOpen()) {
        dup2(null.Get(), STDOUT_FILENO);
    } else {
        close(STDOUT_FILENO);
    }
}

/** Passes on what follows the header. Its end counts only where it stands whole in one chunk. */
void PumpBody(Pipe& output, int target) {
    char chunk[kChunkSize];
    bool inBody = false;
    for (ssize_t got = output.Read(chunk, kChunkSize - 1); got > 0; got = output.Read(chunk, kChunkSize - 1)) {
        const char* begin = chunk;
        if (!inBody) {
            chunk[got] = '\0';
            const char* end = strstr(chunk, kHeaderEnd);
            if (end == nullptr) {
                continue;
            }
            begin = end + strlen(kHeaderEnd);
            inBody = true;
        }
        [[maybe_unused]] const ssize_t written = write(target, begin, static_cast<std::size_t>(chunk + got - begin));
    }
}

Json::Value Failure(int code) {
    Json::Value result(Json::objectValue);
    result["success"] = false;
    result["error"]["code"] = code;
    return result;
}

}  // namespace

ExecHandler::ExecHandler(const ExecParam& execParam) : param(&execParam) {}

ExecHandler::~ExecHandler() = default;

Json::Value ExecHandler::Process() {
    DirectoryScope directory;
    directory.Save();
    // Where the description files are missing the call answers 102.
    [[maybe_unused]] const int result = chdir(kDescriptionDirectory);
    if (!CheckParams()) {
        return execResult;
    }
    PrepareReq();
    if (param->GetOutputFd() >= 0) {
        RunForkForStdout();
        return execResult;
    }
    APIRequest call(runDescription);
    if (runner.GetMethodAttr(&call, "grantable") || runner.GetMethodAttr(&call, "grantByDefault")) {
        Run(false);
    } else {
        RunFork();
    }
    return execResult;
}

bool ExecHandler::CheckParams() {
    if (param->GetAPI().empty() || param->GetMethod().empty() || param->GetRunner().empty()) {
        execResult = Failure(WEBAPI_ERR_BAD_REQUEST);
        WEBAPI_LOG(LOG_ERR, "missing parameter.");
        return false;
    }
    return true;
}

void ExecHandler::PrepareReq() {
    const std::string user = param->GetRunner();
    Json::Value session(Json::objectValue);
    session["username"] = user;
    session["isAdmin"] = QLIBGroupIsAdminGroupMem(user.c_str(), 0) == 1;
    session["isTimeout"] = false;
    session["isAuthorized"] = true;
    Json::Value environment = param->GetEnv();
    environment["REQUEST_METHOD"] = "POST";
    Json::Value params = param->GetParams();
    params["api"] = param->GetAPI();
    params["method"] = param->GetMethod();
    params["version"] = param->GetVersion();
    runDescription = Json::Value(Json::objectValue);
    runDescription["session"] = session;
    runDescription["environ"] = environment;
    runDescription["postParam"] = params;
    runDescription["attr"] = param->GetAttr();
}

void ExecHandler::Run(bool inChild) {
    std::optional<std::string> kept;
    if (const char* user = getenv(kWebUserVariable); !inChild && user != nullptr) {
        kept = user;
    }
    SetUserVariables(param->GetRunner());
    runner.APIRunner::Run(runDescription);
    execResult = runner.GetResponse();
    if (kept) {
        SetUserVariables(*kept);
    }
}

void ExecHandler::RunFork() {
    Pipe pipe;
    pipe.Init();
    const int child = QLIBCProcForkEx(kForkFlags);
    if (child == -1) {
        execResult = Failure(WEBAPI_ERR_INTERNAL);
        WEBAPI_LOG(LOG_ERR, "fork failed");
        return;
    }
    if (child == 0) {
        pipe.WriteOnly(-1);
        Run(true);
        pipe.WriteJson(execResult);
        _exit(0);
    }
    pipe.ReadOnly(-1);
    if (!pipe.ReadJson(execResult)) {
        execResult = Failure(WEBAPI_ERR_INTERNAL);
        WEBAPI_LOG(LOG_ERR, "read json failed");
    }
}

void ExecHandler::RunForkForStdout() {
    Pipe result;
    Pipe output;
    result.Init();
    output.Init();
    // What this process has yet to write would otherwise come out of the child too.
    fflush(stdout);
    std::cout.flush();
    const int child = QLIBCProcForkEx(kForkFlags);
    if (child == -1) {
        execResult = Failure(WEBAPI_ERR_INTERNAL);
        WEBAPI_LOG(LOG_ERR, "fork failed");
        return;
    }
    if (child == 0) {
        result.WriteOnly(-1);
        output.WriteOnly(STDOUT_FILENO);
        Run(true);
        fflush(stdout);
        std::cout.flush();
        CloseOutput(output);
        result.WriteJson(execResult);
        _exit(0);
    }
    result.ReadOnly(-1);
    output.ReadOnly(-1);
    PumpBody(output, param->GetOutputFd());
    if (!result.ReadJson(execResult)) {
        execResult = Failure(WEBAPI_ERR_INTERNAL);
        WEBAPI_LOG(LOG_ERR, "read json failed");
    }
}

const Json::Value& ExecHandler::GetResult() const {
    return execResult;
}

// ---- the short ways, without a runner of the caller's own ----

Json::Value APIRunner::Exec(const ExecParam& param) {
    ExecHandler handler(param);
    return handler.Process();
}

void APIRunner::Exec(Json::Value& result, int fd, const char* api, int version, const char* method,
                     const Json::Value& params, const Json::Value& attr, const char* runner) {
    const auto text = [](const char* pointer) { return std::string(pointer == nullptr ? "" : pointer); };
    ExecParam param;
    param.SetParams(params).SetAPI(text(api)).SetVersion(version).SetMethod(text(method)).SetAttr(attr);
    param.SetRunner(text(runner)).SetOutputFd(fd);
    result = Exec(param);
}

void APIRunner::Exec(Json::Value& result, const char* api, int version, const char* method, const Json::Value& params,
                     const Json::Value& attr, const char* runner) {
    Exec(result, -1, api, version, method, params, attr, runner);
}

void APIRunner::Exec(Json::Value& result, const char* api, int version, const char* method, const Json::Value& params,
                     const char* runner) {
    Exec(result, -1, api, version, method, params, Json::Value(), runner);
}

}  // namespace ZOVA
