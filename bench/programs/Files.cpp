// The package of the transfers and of the sharing check, apart from the small one, whose call must not grow with them.
// It is the check library of its links' project as well.

#include <webapi/APIDownload.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/Json.h>

#include <sys/stat.h>

namespace {

constexpr char kFile[] = "/var/tmp/zova-bench-transfers/file";
constexpr int kFileMissing = 400;

// The part file stays where the upload put it, and goes with the call.
void Take(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const std::string path = Json::asString(request->GetParam("file", ""));
    struct stat status {};
    if (stat(path.c_str(), &status) != 0) {
        response->SetError(kFileMissing, Json::Value());
        return;
    }
    Json::Value data(Json::objectValue);
    data["folder"] = path.substr(0, path.rfind('/'));
    data["size"] = static_cast<Json::Int64>(status.st_size);
    response->SetSuccess(data);
}

void Send(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    ZOVA::APIDownload download(response);
    response->SetEnableOutput(false);
    download.SetHeader("Content-type", "application/octet-stream");
    download.Output(kFile);
}

void Hello(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    Json::Value data(Json::objectValue);
    data["greeting"] = "Hello, world";
    response->SetSuccess(data);
}

bool Allow(ZOVA::APIRequest*, ZOVA::APIResponse*) {
    return true;
}

const ZOVA::_tag_API_TABLE kTable[] = {
    {"ZOVA.Bench.Files", 1, "take", Take},
    {"ZOVA.Bench.Files", 1, "send", Send},
    {"ZOVA.Bench.Files.Shared", 1, "hello", Hello},
    {nullptr, 0, nullptr, nullptr},
};

const ZOVA::_tag_API_SHARING_CHECK_TABLE kSharingTable[] = {
    {"^ZOVA[.]Bench[.]Files[.]Shared$", 1, "^hello$", Allow},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
    return kSharingTable;
}
