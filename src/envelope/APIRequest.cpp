#include "webapi/APIRequest.h"

#include <strings.h>

#include "envelope/APIRequestPrivate.h"
#include "webapi/Json.h"

namespace ZOVA {

// ---- construction and filling ----

APIRequest::APIRequest(const Json::Value& init) : d(new APIRequestPrivate(this)) {
    if (Json::hasMember(init, "environ")) {
        InitEnv(init["environ"]);
    }
    if (Json::hasMember(init, "getParam") || Json::hasMember(init, "postParam")) {
        InitParam(init, false);
    }
    if (Json::hasMember(init, "reqLib")) {
        InitAPIInfo(init["reqLib"]);
    }
    if (Json::hasMember(init, "session")) {
        InitSession(init["session"]);
    }
}

APIRequest::APIRequest(const APIRequest& other) : d(new APIRequestPrivate(*other.d, this)) {}

APIRequest::~APIRequest() {
    delete d;
}

void APIRequest::InitEnv(const Json::Value& env) {
    d->SetData("environ", env, true);
    d->InitCookie();
    d->InitRequestMethod();
    d->InitSharing();
}

void APIRequest::InitParam(const Json::Value& init, bool clear) {
    if (clear) {
        d->ClearData("param", "");
    }
    for (const char* source : {"getParam", "postParam"}) {
        if (Json::hasMember(init, source)) {
            Json::Value params = init[source];
            d->DecryptParam(params);
            d->SetData("param", params, false);
            d->SetAPIDesc(params);
        }
    }
}

void APIRequest::InitAPIInfo(const Json::Value& info) {
    d->ClearData("reqLib", "");
    d->SetData("reqLib", info, false);
}

void APIRequest::InitSession(const Json::Value& session) {
    d->ClearData("session", "");
    d->SetData("session", session, false);
}

const Json::Value& APIRequest::Serialize() const {
    return d->Serialize();
}

void APIRequest::Deserialize(Json::Value& in) {
    d->Deserialize(in);
    d->InitSharing();
}

// ---- accessors ----

std::string APIRequest::GetAPIClass() {
    return Json::asString(d->PrivateValue("api"));
}

int APIRequest::GetAPIVersion() {
    return Json::asInt(d->PrivateValue("version"));
}

std::string APIRequest::GetAPIMethod() {
    return Json::asString(d->PrivateValue("method"));
}

int APIRequest::GetRequestMethod() {
    return Json::asInt(d->PrivateValue("requestMethod"));
}

Json::Value APIRequest::GetAPIInfo(const std::string& key, const Json::Value& fallback) const {
    return d->GetData("reqLib", key, fallback);
}

bool APIRequest::HasEnv(const std::string& key) const {
    return d->HasData("environ", key);
}

Json::Value APIRequest::GetEnv(const std::string& key, const Json::Value& fallback) const {
    return d->GetData("environ", key, fallback);
}

bool APIRequest::HasParam(const std::string& key) const {
    return d->HasData("param", key);
}

Json::Value APIRequest::GetParam(const std::string& key, const Json::Value& fallback) const {
    return d->GetData("param", key, fallback);
}

const Json::Value& APIRequest::GetParamRef(const std::string& key, const Json::Value& fallback) const {
    return d->GetData("param", key, fallback);
}

bool APIRequest::HasCookie(const std::string& key) const {
    return d->HasData("cookie", key);
}

std::string APIRequest::GetCookie(const std::string& key, const std::string& fallback) const {
    // The store reads an empty key as the whole section, yet "=v" is a cookie of the empty name.
    const Json::Value none;
    const Json::Value& value = d->GetData("cookie", key, none);
    return value.isString() ? Json::asString(value) : fallback;
}

bool APIRequest::SetCookie(const std::string& key, const std::string& value) {
    return d->SetData("cookie", key, value, true);
}

bool APIRequest::HasAttr(const std::string& key) const {
    return d->HasData("attr", key);
}

Json::Value APIRequest::GetAttr(const std::string& key, const Json::Value& fallback) const {
    return d->GetData("attr", key, fallback);
}

void APIRequest::SetAttr(const std::string& key, const Json::Value& value) {
    d->SetData("attr", key, value, false);
}

// ---- kind of request ----

bool APIRequest::IsSliceUploadRequest() const {
    const std::string type = Json::asString(GetEnv("HTTP_X_TYPE_NAME", Json::Value()));
    return strcasecmp(type.c_str(), "SLICEUPLOAD") == 0;
}

bool APIRequest::IsUploadRequest() const {
    const std::string type = Json::asString(GetEnv("CONTENT_TYPE", ""));
    return type.find("multipart/form-data") != std::string::npos || IsSliceUploadRequest();
}

bool APIRequest::IsPollingTask() const {
    return HasEnv("task_id") && HasEnv("task_user");
}

std::string APIRequest::GetPollingTaskId() const {
    return Json::asString(GetEnv("full_task_id", ""));
}

// ---- sharing links ----

bool APIRequest::IsSharing() const {
    return !d->sharingId.empty();
}

std::string APIRequest::GetSharingID() const {
    return d->sharingId;
}

std::string APIRequest::GetSharingSID() const {
    return d->sharingSid;
}

sharing::record::Entry APIRequest::GetSharingEntry() const {
    return d->sharingEntry;
}

sharing::record::Session APIRequest::GetSharingSession() const {
    return d->sharingSession;
}

sharing::record::Token APIRequest::GetSharingToken() const {
    return d->sharingToken;
}

}  // namespace ZOVA
