#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"

namespace ZOVA {

namespace {

/** Whether the list names the method, as a text or as a member of an object at any place. */
bool ListsMethod(const Json::Value& entries, const std::string& method) {
    for (const Json::Value& entry : entries) {
        if (entry.isString() ? Json::asString(entry) == method : Json::hasMember(entry, method)) {
            return true;
        }
    }
    return false;
}

bool Refuse(APIResponse* response, int code) {
    response->SetError(code, Json::Value());
    return false;
}

}  // namespace

bool APIRunner::CheckRequestParam(APIRequest* call, APIResponse* answer) {
    const std::string api = call->GetAPIClass();
    const int version = call->GetAPIVersion();
    const std::string method = call->GetAPIMethod();
    if (version < 1 || api.empty() || method.empty()) {
        return Refuse(answer, WEBAPI_ERR_BAD_REQUEST);
    }
    if (!InitLibDesc(libDesc, call) || !Json::hasMember(libDesc, api)) {
        return Refuse(answer, WEBAPI_ERR_NO_SUCH_API);
    }
    const Json::Value& description = libDesc[api];
    if (version > Json::asInt(Json::member(description, "maxVersion")) ||
        version < Json::asInt(Json::member(description, "minVersion"))) {
        return Refuse(answer, WEBAPI_ERR_VERSION_NOT_SUPPORTED);
    }
    const Json::Value& entries = Json::member(Json::member(description, "methods"), std::to_string(version));
    if (entries.type() != Json::arrayValue || !ListsMethod(entries, method)) {
        return Refuse(answer, WEBAPI_ERR_NO_SUCH_METHOD);
    }
    const Json::Value& attributes = GetMethod(api, version, method);
    if (!Json::asBool(Json::member(attributes, "allowUpload")) && call->IsUploadRequest()) {
        return Refuse(answer, WEBAPI_ERR_UPLOAD_NOT_ALLOWED);
    }
    if (!Json::asBool(Json::member(attributes, "allowDemo")) && call->IsDemoMode()) {
        return Refuse(answer, WEBAPI_ERR_DEMO_NOT_ALLOWED);
    }
    return true;
}

bool APIRunner::AddAPIInfo(APIRequest* call) {
    if (call == nullptr) {
        return false;
    }
    const std::string api = call->GetAPIClass();
    if (!Json::hasMember(libDesc, api)) {
        return false;
    }
    call->InitAPIInfo(libDesc[api]);
    return true;
}

}  // namespace ZOVA
