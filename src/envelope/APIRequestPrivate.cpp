#include "envelope/APIRequestPrivate.h"

#include "webapi/Json.h"

namespace ZOVA {

APIRequestPrivate::APIRequestPrivate(APIRequest* requestOwner)
    : owner(requestOwner), sharingUrlType(sharing::SHARING_URL_UNKNOWN) {
    for (const char* section :
         {"environ", "cookie", "reqLib", "session", "param", "attr", "url", "userAgent", "private"}) {
        data[section] = Json::Value(Json::objectValue);
    }
    data["private"]["requestMethod"] = 0;
}

APIRequestPrivate::APIRequestPrivate(const APIRequestPrivate& other, APIRequest* requestOwner)
    : APIBase(other),
      owner(requestOwner),
      spare(other.spare),
      sharingId(other.sharingId),
      sharingSid(other.sharingSid),
      sharingEntry(other.sharingEntry),
      sharingSession(other.sharingSession),
      sharingToken(other.sharingToken),
      sharingUrlType(other.sharingUrlType) {}

APIRequestPrivate::~APIRequestPrivate() = default;

Json::Value APIRequestPrivate::PrivateValue(const char* key) {
    Json::Value* section = Section("private");
    return section == nullptr ? Json::Value() : (*section)[key];
}

void APIRequestPrivate::SetPrivateValue(const char* key, const Json::Value& value) {
    if (Json::Value* section = Section("private")) {
        (*section)[key] = value;
    }
}

void APIRequestPrivate::SetAPIDesc(const Json::Value& params) {
    if (Json::hasMember(params, "api")) {
        SetPrivateValue("api", Json::asString(params["api"]));
    }
    if (Json::hasMember(params, "version")) {
        SetPrivateValue("version", Json::asInt(params["version"]));
    }
    if (Json::hasMember(params, "method")) {
        SetPrivateValue("method", Json::asString(params["method"]));
    }
}

void APIRequestPrivate::SetCallName(const CallName& call) {
    SetPrivateValue("api", call.api);
    SetPrivateValue("version", call.version);
    SetPrivateValue("method", call.method);
}

}  // namespace ZOVA
