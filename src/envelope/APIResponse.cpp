#include "webapi/APIResponse.h"

#include <cstdlib>

#include "base/Log.h"
#include "envelope/APIResponsePrivate.h"
#include "webapi/Json.h"

namespace ZOVA {

APIResponse::APIResponse(APIRequest* request) : d(new APIResponsePrivate(request, this)) {}

APIResponse::~APIResponse() {
    delete d;
}

void APIResponse::SetError(int code, const Json::Value& extra) {
    d->SetOutcome(code, extra);
}

void APIResponse::SetSuccess(const Json::Value& data) {
    SetError(WEBAPI_ERR_NONE, data);
}

int APIResponse::GetError() const {
    return Json::asInt(Json::member(d->Serialize(), "code"));
}

Json::Value APIResponse::GetBody() const {
    return Json::hasMember(d->Serialize(), "body") ? d->Serialize()["body"] : Json::Value(Json::objectValue);
}

bool APIResponse::IsEnableOutput() const {
    return Json::asBool(d->GetData("option", "isDownload", true));
}

void APIResponse::SetEnableOutput(bool enable) {
    d->SetData("option", "isDownload", enable, false);
}

bool APIResponse::GetHttpdRestart() const {
    return Json::asBool(d->GetData("option", "restart_httpd", false));
}

void APIResponse::SetHttpdRestart(bool restart) {
    d->SetData("option", "restart_httpd", restart, false);
}

std::string APIResponse::GetServerError() const {
    return Json::asString(d->GetData("headers", "x-request-error", ""));
}

void APIResponse::SetServerError(const std::string& word) {
    d->SetData("headers", "x-request-error", word, true);
}

bool APIResponse::HasServerError() const {
    return d->HasData("headers", "x-request-error");
}

void* APIResponse::GetCallbackFuncs() {
    return &d->callbacks;
}

void APIResponse::SetCallbackFunc(CallbackFunc function, void* argument) {
    if (getenv("in_zovaapid") != nullptr) {
        WEBAPI_LOG_AS("APIResponse", LOG_ERR, "cannot use callback function in zovaapid");
        return;
    }
    if (function == nullptr) {
        return;
    }
    for (const ResponseCallback& callback : d->callbacks) {
        if (callback.function == function && callback.argument == argument) {
            return;
        }
    }
    d->callbacks.push_back({function, argument});
}

void APIResponse::SetCallbackFuncs(void* list) {
    if (list == nullptr) {
        return;
    }
    for (const ResponseCallback& callback : *static_cast<ResponseCallbackList*>(list)) {
        SetCallbackFunc(callback.function, callback.argument);
    }
}

const Json::Value& APIResponse::Serialize() const {
    return d->Serialize();
}

void APIResponse::Deserialize(Json::Value& in) {
    d->Deserialize(in);
}

}  // namespace ZOVA
