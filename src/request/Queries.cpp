#include <cstdlib>

#include "envelope/APIRequestPrivate.h"
#include "webapi/Json.h"
#include "zovacgi.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr unsigned int kNoUser = 4294967295U;
constexpr int kDirectorySize = 1024;

struct AllowedUserBit {
    const char* tag;
    int bit;
};

constexpr AllowedUserBit kAllowedUserBits[] = {
    {"admin.local", 1},  {"admin.domain", 2},   {"admin.ldap", 4},
    {"normal.local", 8}, {"normal.domain", 16}, {"normal.ldap", 32},
};

int AllowedUserBitOf(const std::string& tag) {
    for (const AllowedUserBit& row : kAllowedUserBits) {
        if (tag == row.tag) {
            return row.bit;
        }
    }
    return 0;
}

std::string PreferenceDirectory(int (*query)(const char*, char*, int), const std::string& name) {
    char directory[kDirectorySize] = "";
    return query(name.c_str(), directory, kDirectorySize) < 0 ? "/tmp" : directory;
}

}  // namespace

// ---- plain reads of the session ----

std::string APIRequest::GetLoginUserName() const {
    return Json::asString(d->GetData("session", "username", ""));
}

void APIRequest::SetLoginUserName(const std::string& name) {
    d->SetData("session", "username", name, true);
}

bool APIRequest::IsAdmin() const {
    return Json::asBool(d->GetData("session", "isAdmin", ""));
}

bool APIRequest::IsSkipCheckIP() const {
    return Json::asBool(d->GetData("session", "isSkipCheckIP", true));
}

bool APIRequest::IsTimeout() const {
    return Json::asBool(d->GetData("session", "isTimeout", true));
}

int APIRequest::GetTimeoutDuration() const {
    return Json::asInt(d->GetData("session", "timeout", 0));
}

bool APIRequest::IsAuthorized() const {
    return Json::asBool(d->GetData("session", "isAuthorized", false));
}

std::string APIRequest::GetApplication() const {
    return Json::asString(d->GetData("session", "app", ""));
}

std::string APIRequest::GetWebAPIPriv() const {
    return Json::asString(d->GetData("session", "webapi", ""));
}

std::string APIRequest::GetSessionFilePath() const {
    return Json::asString(d->GetData("session", "sessFile", ""));
}

std::string APIRequest::GetSessionID() const {
    return GetCookie("id", "");
}

std::string APIRequest::GetRemoteIP() const {
    return Json::asString(d->GetData("environ", "ZOVA_REMOTE_IP", ""));
}

std::string APIRequest::GetUILanguage() const {
    return Json::asString(d->GetData("session", "uiLang", "enu"));
}

bool APIRequest::IsTokenEnable() const {
    return Json::asBool(d->GetData("session", "tokenEnable", false));
}

bool APIRequest::IsDemoMode() const {
    return false;
}

void APIRequest::SetAuthResult(_tag_authorized_result_ result) {
    d->SetData("session", "authResult", static_cast<int>(result), false);
}

_tag_authorized_result_ APIRequest::GetAuthResult() const {
    return static_cast<_tag_authorized_result_>(
        Json::asInt(d->GetData("session", "authResult", static_cast<int>(AUTHORIZED_RESULT_INVALID))));
}

bool APIRequest::HasAppPriv(const std::string& app) const {
    return d->GetData("session", "appPriv", "") == app;
}

// ---- questions to the system, asked once ----

unsigned int APIRequestPrivate::GetLoginUID() {
    if (HasData("session", "uid")) {
        return static_cast<unsigned int>(Json::asUInt64(GetData("session", "uid", kNoUser)));
    }
    if (Json::asString(GetData("session", "username", "")).empty()) {
        return kNoUser;
    }
    const std::string sid = Json::asString(GetData("cookie", "id", ""));
    const unsigned int uid = ZovaCgiUIDGet(sid.c_str());
    SetData("session", "uid", uid, false);
    return uid;
}

unsigned int APIRequest::GetLoginUID() {
    return d->GetLoginUID();
}

int APIRequest::GetAllowUser() {
    const int known = Json::asInt(d->GetData("session", "allowUser", 0));
    if (known != 0) {
        return known;
    }
    const Json::Value list = GetAPIInfo("allowUser", Json::Value(Json::arrayValue));
    if (!Json::isArray(list) || list.empty()) {
        return 0;
    }
    int mask = 0;
    for (const Json::Value& tag : list) {
        if (tag.isString()) {
            mask |= AllowedUserBitOf(Json::asString(tag));
        }
    }
    d->SetData("session", "allowUser", mask, false);
    return mask;
}

const char* APIRequest::GetZovaAccessTokenID() const {
    const std::string token = Json::asString(GetEnv("zovaAccessToken", ""));
    if (token.empty()) {
        return nullptr;
    }
    // The environment is where the text outlives this call without an owner.
    setenv("zovaAccessToken", token.c_str(), 1);
    return getenv("zovaAccessToken");
}

std::string APIRequest::GetPreferenceDir() const {
    return PreferenceDirectory(ZOVAUserPreferenceDirGet, GetLoginUserName());
}

std::string APIRequest::GetGroupPreferenceDir(const std::string& group) const {
    return PreferenceDirectory(ZOVAGroupPreferenceDirGet, group);
}

}  // namespace ZOVA
