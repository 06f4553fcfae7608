#include "webapi/APIResponse.h"
#include "webapi/WebEntry.h"

namespace ZOVA {

// Uploads are not taken yet: neither the form fields that name the API nor the files can be read.

bool WebEntry::LoadUploadAPIDesc(Json::Value&) {
    return false;
}

bool WebEntry::HandleUpload(APIRequest*, APIResponse* answer) {
    Json::Value extra(Json::objectValue);
    extra["upload_err"] = 0;
    answer->SetError(WEBAPI_ERR_UPLOAD_FAILED, extra);
    return false;
}

}  // namespace ZOVA
