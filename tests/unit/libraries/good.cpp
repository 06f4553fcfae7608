// The well-behaved library, and the methods that are not.

#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <iostream>
#include <iterator>
#include <stdexcept>

#include "Marks.h"
#include "probe.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/APITable.h"
#include "webapi/Json.h"

using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

void Callback(void*) {
    UnitMark("callback");
}

void Succeed(APIRequest*, APIResponse* response) {
    UnitMark("success");
    response->SetSuccess(Json::Value());
}

void Echo(APIRequest* request, APIResponse* response) {
    UnitMark("echo");
    response->SetSuccess(request->GetParam("", Json::Value()));
}

void DoNothing(APIRequest*, APIResponse*) {
    UnitMark("nothing");
}

void Throw(APIRequest*, APIResponse* response) {
    UnitMark("throw");
    response->SetSuccess("half done");
    throw std::runtime_error("made up\nforged line");
}

void ThrowInt(APIRequest*, APIResponse*) {
    UnitMark("throw_int");
    throw 42;
}

/** Leaves behind whatever a method can leave behind. */
void MakeMess(APIRequest*, APIResponse* response) {
    UnitMark("mess");
    response->SetSuccess(Probe());
    if (chdir("/tmp") != 0) {
        response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, "chdir");
    }
    setpriority(PRIO_PROCESS, 0, 7);
    std::cin.setstate(std::ios::failbit);
    std::cout.setstate(std::ios::badbit);
    errno = ENOTTY;
}

void ThrowFromMess(APIRequest* request, APIResponse* response) {
    MakeMess(request, response);
    throw std::logic_error("out of the mess");
}

void ReadInput(APIRequest*, APIResponse* response) {
    const std::string text((std::istreambuf_iterator<char>(std::cin)), std::istreambuf_iterator<char>());
    Json::Value data(Json::objectValue);
    data["text"] = text;
    response->SetSuccess(data);
}

void WriteOutput(APIRequest*, APIResponse* response) {
    std::cout << "written by the method" << std::flush;
    Json::Value data(Json::objectValue);
    data["good"] = std::cout.good();
    response->SetSuccess(data);
}

void TellProbe(APIRequest*, APIResponse* response) {
    UnitMark("probe");
    response->SetSuccess(Probe());
}

void TellSession(APIRequest* request, APIResponse* response) {
    Json::Value data(Json::objectValue);
    data["error"] = response->GetError();
    data["user"] = request->GetLoginUserName();
    data["authResult"] = request->GetAuthResult();
    response->SetSuccess(data);
}

void SetHeaders(APIRequest* request, APIResponse* response) {
    response->SetHeader(Json::asString(request->GetParam("name", "")), Json::asString(request->GetParam("value", "")));
    response->AddCookie("c", "v", Json::asString(request->GetParam("path", "/")), 0, "", false, false);
    response->SetSuccess(Json::Value());
}

void AskForRestart(APIRequest*, APIResponse* response) {
    response->SetHttpdRestart(true);
    response->SetSuccess(Json::Value());
}

void AnswerItself(APIRequest*, APIResponse* response) {
    response->SetEnableOutput(false);
    response->SetCallbackFunc(Callback, nullptr);
    response->SetSuccess(Json::Value());
}

/** Runs another call inside this one, as `Exec` would in its child. */
void Nest(APIRequest* request, APIResponse* response) {
    Json::Value data(Json::objectValue);
    data["outer"] = Probe();
    ZOVA::APIRunner runner;
    Json::Value description(Json::objectValue);
    description["postParam"] = request->GetParam("inner", Json::Value());
    runner.Run(description);
    data["inner"] = runner.GetResponse();
    data["again"] = Probe();
    response->SetSuccess(data);
}

const ZOVA::_tag_API_TABLE table[] = {
    {"ZOVA.Test.Good", 1, "success", Succeed},
    {"ZOVA.Test.Good", 1, "echo", Echo},
    {"ZOVA.Test.Good", 1, "nothing", DoNothing},
    {"ZOVA.Test.Good", 1, "throw", Throw},
    {"ZOVA.Test.Good", 1, "throw_int", ThrowInt},
    {"ZOVA.Test.Good", 1, "mess", MakeMess},
    {"ZOVA.Test.Good", 1, "throw_mess", ThrowFromMess},
    {"ZOVA.Test.Good", 1, "read_input", ReadInput},
    {"ZOVA.Test.Good", 1, "keep_input", ReadInput},
    {"ZOVA.Test.Good", 1, "upload", Echo},
    {"ZOVA.Test.Good", 1, "upload_lasting", Echo},
    {"ZOVA.Test.Good", 1, "upload_as_root", Echo},
    {"ZOVA.Test.Good", 1, "upload_deferred", Echo},
    {"ZOVA.Test.Good", 1, "write_output", WriteOutput},
    {"ZOVA.Test.Good", 1, "keep_output", WriteOutput},
    {"ZOVA.Test.Good", 1, "probe", TellProbe},
    {"ZOVA.Test.Good", 1, "granted", TellProbe},
    {"ZOVA.Test.Good", 1, "by_default", TellProbe},
    {"ZOVA.Test.Good", 1, "by_user", TellProbe},
    {"ZOVA.Test.Good", 1, "by_user_lasting", TellProbe},
    {"ZOVA.Test.Good", 1, "lasting", TellProbe},
    {"ZOVA.Test.Good", 1, "session", TellSession},
    {"ZOVA.Test.Good", 1, "header", SetHeaders},
    {"ZOVA.Test.Good", 1, "restart", AskForRestart},
    {"ZOVA.Test.Good", 1, "silent", AnswerItself},
    {"ZOVA.Test.Good", 1, "upload_silent", AnswerItself},
    {"ZOVA.Test.Good", 1, "nest", Nest},
    {"ZOVA.Test.Good", 2, "success", Echo},
    {"ZOVA.Test.Other", 1, "success", Echo},
    {"ZOVA.Test.Good", 1, "null_function", nullptr},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    UnitMark("GetAPITable");
    return table;
}
