#include <unistd.h>

#include "base/Log.h"
#include "dispatcher/IdentityPlan.h"
#include "dispatcher/MethodAttributes.h"
#include "envelope/APIRequestPrivate.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIUpload.h"
#include "webapi/Json.h"
#include "webapi/WebEntry.h"
#include "webapiutil.h"
#include "zovacgi.h"
#include "zovacore.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr int kHashSize = 256;
constexpr int kNamingFields = 3;
constexpr int kBoundarySize = 256;
constexpr const char* kFilesAttribute = "upload_files";

/**
 * Gives the part files to the user that the method will run as, so that it can read, move and remove them. A user that
 * there is none of gets nothing: the identity cannot be taken later on, and the method will not run.
 */
bool HandOver(const Json::Value& paths, const std::string& user) {
    uid_t uid = 0;
    gid_t gid = 0;
    if (paths.empty() || user.empty() || ZOVAUserGetUGID(user.c_str(), &uid, &gid) != 0 || uid == 0) {
        return true;
    }
    for (const Json::Value& path : paths) {
        if (lchown(Json::asString(path).c_str(), uid, gid) != 0) {
            WEBAPI_LOG(LOG_ERR, "a file of the upload cannot be handed over [%m]");
            return false;
        }
    }
    return true;
}

/** The parameters that are paths of part files: a form field may claim to be one. */
Json::Value FilesAmong(const Json::Value& params, const Json::Value& paths) {
    Json::Value files(Json::objectValue);
    for (const std::string& name : params.getMemberNames()) {
        for (const Json::Value& path : paths) {
            if (params[name] == path) {
                files[name] = path;
            }
        }
    }
    return files;
}

}  // namespace

bool WebEntry::LoadUploadAPIDesc(Json::Value& out) {
    if (cgi->params == nullptr) {
        cgi->params = QLIBCSzHashAlloc(kHashSize);
    }
    if (cgi->params == nullptr) {
        return false;
    }
    QLIBCHashRemoveAll(cgi->params);
    ZovaCgiUploadState state{};
    char boundary[kBoundarySize] = "";
    if (ZovaCgiLoadUploadNumParams(cgi, kNamingFields, nullptr, &state, boundary, kBoundarySize) < 0) {
        return false;
    }
    // From here on it says what is left of the body.
    const unsigned long long left = state.totalBytes > state.readBytes ? state.totalBytes - state.readBytes : 0;
    Json::Value env(Json::objectValue);
    env["CONTENT_LENGTH"] = std::to_string(left);
    request->InitEnv(env);
    return WebAPIUtil::SzHashToJsonObj(cgi->params, out);
}

bool WebEntry::HandleUpload(APIRequest* call, APIResponse* answer) {
    APIUpload upload(call);
    const Json::Value attributes =
        MethodAttributes(*this, {call->GetAPIClass(), call->GetAPIVersion(), call->GetAPIMethod()});
    if (Json::asBool(Json::member(attributes, "deferUpload"))) {
        return true;
    }
    Json::Value params(Json::objectValue);
    Json::Value& fields = params["postParam"] = Json::Value(Json::objectValue);
    int status = upload.GetUploadAll(fields, &tempUploadFiles);
    if (status == ZOVA_UPLOAD_COMPLETE && !HandOver(tempUploadFiles, IdentityPlan::Of(*call, attributes).User())) {
        status = ZOVA_UPLOAD_NO_FILE;
    }
    if (status != ZOVA_UPLOAD_COMPLETE) {
        Json::Value extra(Json::objectValue);
        extra["upload_err"] = status;
        answer->SetError(WEBAPI_ERR_UPLOAD_FAILED, extra);
        return false;
    }
    call->SetAttr(kFilesAttribute, FilesAmong(fields, tempUploadFiles));
    call->InitParam(params, false);
    return true;
}

}  // namespace ZOVA
