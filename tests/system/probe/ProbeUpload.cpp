#include "ProbeUpload.h"

#include <sys/stat.h>
#include <unistd.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APIUpload.h>
#include <webapi/Json.h>

#include <algorithm>
#include <cstdio>
#include <fstream>

namespace {

constexpr size_t kShown = 4096;

/** "VmHWM" of this process in KiB. */
int GreatestMemory() {
    std::ifstream status("/proc/self/status");
    std::string line;
    int memory = 0;
    while (std::getline(status, line) && std::sscanf(line.c_str(), "VmHWM: %d", &memory) != 1) {
    }
    return memory;
}

/** Path, owner, mode, length and beginning of a file, as this identity finds it. */
Json::Value FileState(const std::string& path) {
    Json::Value file(Json::objectValue);
    struct stat status {};
    std::ifstream content(path, std::ios::binary);
    file["path"] = path;
    file["opens"] = content.is_open();
    if (lstat(path.c_str(), &status) == 0) {
        file["uid"] = status.st_uid;
        file["mode"] = status.st_mode;
        file["size"] = static_cast<Json::Int64>(status.st_size);
        std::string text(std::min<size_t>(kShown, static_cast<size_t>(status.st_size)), '\0');
        content.read(text.data(), static_cast<std::streamsize>(text.size()));
        file["text"] = text;
    }
    return file;
}

unsigned long long lastRead;
unsigned long long lastTotal;

}  // namespace

namespace probe {

void TellUpload(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Json::Value told(Json::objectValue);
    told["params"] = request->GetParam("", Json::Value());
    const Json::Value files = request->GetAttr("upload_files", Json::Value(Json::objectValue));
    told["files"] = Json::Value(Json::objectValue);
    for (const std::string& name : files.getMemberNames()) {
        told["files"][name] = FileState(Json::asString(files[name]));
    }
    const std::string keep = Json::asString(request->GetParam("keep", ""));
    if (!keep.empty()) {
        told["moved"] = rename(Json::asString(files["file"]).c_str(), keep.c_str()) == 0;
    }
    told["memory"] = GreatestMemory();
    response->SetSuccess(told);
}

void TakeUpload(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    ZOVA::APIUpload upload(request);
    upload.SetUploadCallback([](unsigned long long read, unsigned long long total) {
        lastRead = read;
        lastTotal = total;
    });
    Json::Value told(Json::objectValue);
    told["too_early"] = upload.GetUploadFile(told);
    Json::Value& steps = told["steps"] = Json::Value(Json::arrayValue);
    for (int status = 0; status == 0;) {
        Json::Value step(Json::objectValue);
        status = upload.GetUploadParam(step["fields"]);
        step["status"] = status;
        if (status == 0) {
            const std::string skip = Json::asString(Json::member(step["fields"], "skip"));
            Json::Value stored(Json::objectValue);
            status = skip.empty() ? upload.GetUploadFile(stored) : 0;
            for (const std::string& name : stored.getMemberNames()) {
                step["file"] = FileState(Json::asString(stored[name]));
            }
        }
        steps.append(step);
        if (Json::asBool(request->GetParam("stops", false))) {
            break;
        }
    }
    told["read"] = static_cast<Json::UInt64>(lastRead);
    told["total"] = static_cast<Json::UInt64>(lastTotal);
    told["memory"] = GreatestMemory();
    response->SetSuccess(told);
}

}  // namespace probe
