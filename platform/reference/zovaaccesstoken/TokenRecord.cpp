#include "zovaaccesstoken/TokenRecord.h"

#include <algorithm>

#include "common/ControlBytes.h"
#include "common/JsonText.h"
#include "zovacgi/Session.h"

namespace reference {

namespace {

constexpr size_t kMostScopes = 64;
constexpr size_t kMostMethods = 64;
constexpr size_t kLongestApi = 128;
constexpr size_t kLongestMethod = 64;
/** How far the clock may be put back without an effect on tokens, in seconds. */
constexpr int64_t kClockCorrection = 300;

constexpr const char* kNeverGranted[] = {"ZOVA.Core.Session", "ZOVA.Core.Token", "ZOVA.Entry.Request"};

bool IsName(std::string_view text, size_t longest) {
    constexpr const char* kNameBytes = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_-.";
    return !text.empty() && text.size() <= longest && text.find_first_not_of(kNameBytes) == std::string_view::npos;
}

bool IsGrantable(std::string_view api) {
    return IsName(api, kLongestApi) &&
           std::find(std::begin(kNeverGranted), std::end(kNeverGranted), api) == std::end(kNeverGranted);
}

bool TakeMethods(const Json::Value& methods, std::vector<std::string>& out) {
    if (methods.isString()) {
        return methods.asString() == "*";
    }
    if (!methods.isArray() || methods.empty() || methods.size() > kMostMethods) {
        return false;
    }
    for (const Json::Value& method : methods) {
        if (!method.isString() || !IsName(method.asString(), kLongestMethod)) {
            return false;
        }
        out.push_back(method.asString());
    }
    return true;
}

bool TakeScope(const Json::Value& value, TokenScope& scope) {
    if (!value.isObject() || value.size() != 2 || !value.isMember("api") || !value["api"].isString() ||
        !value.isMember("methods")) {
        return false;
    }
    scope.api = value["api"].asString();
    return IsGrantable(scope.api) && TakeMethods(value["methods"], scope.methods);
}

bool TakeText(const Json::Value& object, const char* name, std::string& out) {
    if (!object.isMember(name) || !object[name].isString()) {
        return false;
    }
    out = object[name].asString();
    return true;
}

bool TakeNumber(const Json::Value& object, const char* name, int64_t& out) {
    if (!object.isMember(name) || !object[name].isInt64()) {
        return false;
    }
    out = object[name].asInt64();
    return out >= 0;
}

bool TakeOwner(const Json::Value& value, TokenRecord& record) {
    constexpr int64_t kHighestUid = 0xfffffffe;
    int64_t uid = 0;
    if (!TakeText(value, "user", record.user) || record.user.empty() || record.user.size() > kLongestUserName ||
        HasControlByte(record.user) || !TakeNumber(value, "uid", uid) || uid > kHighestUid) {
        return false;
    }
    record.uid = static_cast<uid_t>(uid);
    return true;
}

bool TakeTimes(const Json::Value& value, TokenRecord& record) {
    return TakeNumber(value, "created", record.created) && TakeNumber(value, "expires", record.expires) &&
           record.expires >= record.created && record.expires - record.created <= kLongestTokenTime;
}

}  // namespace

bool TokenRecord::IsInForce(int64_t now) const {
    return now < expires && created <= now + kClockCorrection;
}

bool TokenRecord::Covers(std::string_view api, std::string_view method) const {
    return std::any_of(apis.begin(), apis.end(), [&](const TokenScope& scope) {
        return scope.api == api && (scope.methods.empty() || std::find(scope.methods.begin(), scope.methods.end(),
                                                                       method) != scope.methods.end());
    });
}

bool IsTokenId(std::string_view text) {
    return text.size() == kTokenIdDigits && text.find_first_not_of("0123456789abcdef") == std::string_view::npos;
}

bool IsTokenLabel(std::string_view text) {
    return text.size() <= kLongestTokenLabel && !HasControlByte(text);
}

bool ParseTokenScopes(const Json::Value& apis, std::vector<TokenScope>& scopes) {
    if (!apis.isArray() || apis.empty() || apis.size() > kMostScopes) {
        return false;
    }
    std::vector<TokenScope> read;
    for (const Json::Value& value : apis) {
        if (!TakeScope(value, read.emplace_back())) {
            return false;
        }
    }
    scopes.swap(read);
    return true;
}

Json::Value TokenScopesJson(const std::vector<TokenScope>& scopes) {
    Json::Value apis(Json::arrayValue);
    for (const TokenScope& scope : scopes) {
        Json::Value& value = apis.append(Json::Value(Json::objectValue));
        value["api"] = scope.api;
        value["methods"] = scope.methods.empty() ? Json::Value("*") : Json::Value(Json::arrayValue);
        for (const std::string& method : scope.methods) {
            value["methods"].append(method);
        }
    }
    return apis;
}

bool ParseTokenRecord(std::string_view text, TokenRecord& record) {
    Json::Value value;
    TokenRecord read;
    if (text.size() > kLargestTokenRecord || !ParseJson(text, value) || !value.isObject() ||
        !TakeText(value, "id", read.id) || !IsTokenId(read.id) || !TakeOwner(value, read) ||
        !TakeText(value, "label", read.label) || !IsTokenLabel(read.label) || !TakeTimes(value, read) ||
        !value.isMember("apis") || !ParseTokenScopes(value["apis"], read.apis)) {
        return false;
    }
    std::swap(record, read);
    return true;
}

std::string WriteTokenRecord(const TokenRecord& record) {
    Json::Value value(Json::objectValue);
    value["id"] = record.id;
    value["user"] = record.user;
    value["uid"] = Json::UInt(record.uid);
    value["label"] = record.label;
    value["created"] = Json::Int64(record.created);
    value["expires"] = Json::Int64(record.expires);
    value["apis"] = TokenScopesJson(record.apis);
    return WriteJson(value);
}

}  // namespace reference
