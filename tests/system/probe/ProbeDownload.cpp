#include "ProbeDownload.h"

#include <webapi/APIDownload.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/Json.h>

#include <cstdio>

namespace probe {

namespace {

void Prepare(ZOVA::APIRequest* request, ZOVA::APIResponse* response, ZOVA::APIDownload& download) {
    if (!Json::asBool(request->GetParam("fast", true))) {
        ZOVA::APIDownload::SetXSendFileDisabled();
    }
    const std::string type = Json::asString(request->GetParam("type", ""));
    if (!type.empty()) {
        download.SetMimeType(type);
        download.SetHeader("Content-type", type);
    }
    response->AddCookie("probe", "cookie", "/", 0, "", false, false);
    download.SetHeader("X-Probe", "header");
    response->SetEnableOutput(false);
    response->SetSuccess(Json::Value());
}

}  // namespace

void SendPath(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    ZOVA::APIDownload download(response);
    Prepare(request, response, download);
    download.Output(Json::asString(request->GetParam("path", "")));
}

void SendStream(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    FILE* stream = fopen(Json::asString(request->GetParam("path", "")).c_str(), "re");
    if (stream == nullptr) {
        response->SetError(1005, Json::Value());
        return;
    }
    ZOVA::APIDownload download(response);
    Prepare(request, response, download);
    download.Output(stream);
    fclose(stream);
}

void SendPipe(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    // Where nobody reads any more it would complain, as it is started with SIGPIPE ignored.
    const std::string command = "seq 1 " + std::to_string(Json::asInt(request->GetParam("last", 0))) + " 2>/dev/null";
    FILE* stream = popen(command.c_str(), "re");
    if (stream == nullptr) {
        response->SetError(1005, Json::Value());
        return;
    }
    ZOVA::APIDownload download(response);
    Prepare(request, response, download);
    download.Output(stream);
    pclose(stream);
}

}  // namespace probe
