// A package whose methods tell in which state of the process they run, and then leave it as badly as they can.

#include <webapi/APIPolling.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/Json.h>

#include <fcntl.h>
#include <signal.h>

#include <iostream>
#include <stdexcept>

#include "ProbeDownload.h"
#include "ProbeRequest.h"
#include "ProbeUpload.h"
#include "ProcessState.h"

namespace {

void Tell(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    Json::Value state = probe::ProcessState();
    state["input_at_end"] = std::cin.get() == std::char_traits<char>::eof();
    std::cout << "this text has nowhere to go" << std::flush;
    response->SetSuccess(state);
    // What a careless method leaves behind.
    if (chdir("/") != 0 || setpriority(PRIO_PROCESS, 0, 7) != 0) {
        response->SetError(1001, Json::Value());
    }
}

void Wait(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    usleep(500000);
    response->SetSuccess(Json::Value());
}

void Die(ZOVA::APIRequest*, ZOVA::APIResponse*) {
    kill(getpid(), SIGKILL);
}

/** Which process runs the call, and in whose name. */
void TellPlace(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Json::Value place = probe::ProcessState();
    place["process"] = getpid();
    place["parent"] = getppid();
    place["in_daemon"] = getenv("in_zovaapid") != nullptr;
    place["login"] = request->GetLoginUserName();
    place["admin"] = request->IsAdmin();
    place["authorized"] = request->IsAuthorized();
    char input[64] = "";
    char output[64] = "";
    place["streams"] = readlink("/proc/self/fd/0", input, sizeof(input) - 1) > 0 &&
                               readlink("/proc/self/fd/1", output, sizeof(output) - 1) > 0
                           ? std::string(input) + " " + output
                           : "";
    response->SetSuccess(place);
}

/** Makes the file "begun" and waits until the file "go" is there; both are paths. */
void Hold(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const std::string begun = Json::asString(request->GetParam("begun", ""));
    const std::string go = Json::asString(request->GetParam("go", ""));
    const int file = open(begun.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    if (file < 0) {
        response->SetError(1003, Json::Value());
        return;
    }
    close(file);
    for (int tries = 0; tries < 60000; ++tries) {
        if (access(go.c_str(), F_OK) == 0) {
            response->SetSuccess(Json::Value("held"));
            return;
        }
        usleep(1000);
    }
    response->SetError(1004, Json::Value());
}

void AnswerLarge(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetSuccess(Json::Value(std::string(300000, 'x')));
}

void Throw(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Tell(request, response);
    throw std::runtime_error("on purpose");
}

/** Writes a header, then "text" as often as "times" says, to descriptor 1, and dies if "dies" is true. */
void Write(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const std::string text = Json::asString(request->GetParam("text", ""));
    std::string all = "Content-Type: text/plain\r\n\r\n";
    for (int time = Json::asInt(request->GetParam("times", 1)); time > 0; --time) {
        all += text;
    }
    for (size_t written = 0; written < all.size();) {
        const ssize_t more = write(STDOUT_FILENO, all.data() + written, all.size() - written);
        if (more <= 0) {
            response->SetError(1003, Json::Value());
            return;
        }
        written += static_cast<size_t>(more);
    }
    if (Json::asBool(request->GetParam("dies", false))) {
        Die(request, response);
    }
    response->SetSuccess(Json::Value());
}

/** A result of "size" bytes. */
void AnswerLong(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const int size = Json::asInt(request->GetParam("size", 0));
    response->SetSuccess(std::string(static_cast<size_t>(size), 'r'));
}

void Work(ZOVA::APIRequest* request, ZOVA::APIResponse* response, void*) {
    constexpr unsigned int kLongestStaySeconds = 60;
    if (Json::asBool(request->GetParam("dies", false))) {
        Die(request, response);
    }
    response->SetSuccess("reported");
    if (Json::asBool(request->GetParam("stays", false))) {
        sleep(kLongestStaySeconds);
    }
}

/** A task for "group" that reports and, if "stays" is true, waits to be stopped; its record stays. */
void StartTask(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    ZOVA::APIPolling polling(request);
    polling.SetPrefixAttr("probe-");
    polling.SetRemoveAttr(false);
    if (!polling.SetGroupAttr(Json::asString(request->GetParam("group", "")))) {
        response->SetError(polling.GetError(), Json::Value());
        return;
    }
    polling.Start(response, Work, nullptr);
}

bool RefuseWithAnError(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetError(1002, Json::Value());
    return false;
}

bool ThrowInACheck(ZOVA::APIRequest*, ZOVA::APIResponse*) {
    throw 1;
}

constexpr const char* kAPI = "ZOVA.Test.Probe";
constexpr const char* kDaemonAPI = "ZOVA.Test.Probe.Daemon";
constexpr const char* kDownloadAPI = "ZOVA.Test.Probe.Download";
constexpr const char* kRequestAPI = "ZOVA.Test.Probe.Request";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kAPI, 1, "granted", Tell},
    {kAPI, 1, "by_user", Tell},
    {kAPI, 1, "by_default", Tell},
    {kAPI, 1, "lasting", Tell},
    {kAPI, 1, "by_user_lasting", Tell},
    {kAPI, 1, "api_user", Tell},
    {kAPI, 1, "unknown_user", Tell},
    {kAPI, 1, "throws", Throw},
    {kAPI, 1, "refused", Tell},
    {kAPI, 1, "check_throws", Tell},
    {kAPI, 1, "wait", Wait},
    {kAPI, 1, "dies", Die},
    {kAPI, 1, "write", Write},
    {kAPI, 1, "write_lasting", Write},
    {kAPI, 1, "answer_long", AnswerLong},
    {kAPI, 1, "start_task", StartTask},
    {kAPI, 1, "params", probe::TellUpload},
    {kAPI, 1, "upload", probe::TellUpload},
    {kAPI, 1, "upload_lasting", probe::TellUpload},
    {kAPI, 1, "upload_deferred", probe::TakeUpload},
    {kAPI, 1, "upload_refused", probe::TellUpload},
    {kAPI, 1, "upload_held", Hold},
    {kDaemonAPI, 1, "place", TellPlace},
    {kDaemonAPI, 1, "as_nobody", TellPlace},
    {kDaemonAPI, 1, "kept", TellPlace},
    {kDaemonAPI, 1, "hold", Hold},
    {kDaemonAPI, 1, "large", AnswerLarge},
    {kDaemonAPI, 1, "dies", Die},
    {kDownloadAPI, 1, "path", probe::SendPath},
    {kDownloadAPI, 1, "stream", probe::SendStream},
    {kDownloadAPI, 1, "pipe", probe::SendPipe},
    {kRequestAPI, 1, "agent", probe::TellAgent},
    {kRequestAPI, 1, "checks", probe::TellChecks},
    {kRequestAPI, 1, "tell", probe::TellRequest},
    {nullptr, 0, nullptr, nullptr},
};

const ZOVA::_tag_API_CHECK_TABLE kChecks[] = {
    {kAPI, 1, "refused", RefuseWithAnError, nullptr, nullptr},
    {kAPI, 1, "check_throws", ThrowInACheck, nullptr, nullptr},
    {kAPI, 1, "upload_refused", RefuseWithAnError, nullptr, nullptr},
    {nullptr, 0, nullptr, nullptr, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_CHECK_TABLE* GetAPICheckTable() {
    return kChecks;
}
