#include "zovacgi/Session.h"

#include "common/ControlBytes.h"
#include "common/DeviceInformation.h"
#include "common/JsonText.h"
#include "zovacgi/SessionId.h"

namespace reference {

namespace {

/** A member that has to be a text without control bytes. */
bool TakeText(const Json::Value& object, const char* name, std::string& out) {
    if (!object.isMember(name) || !object[name].isString()) {
        return false;
    }
    out = object[name].asString();
    return !HasControlByte(out);
}

bool TakeNumber(const Json::Value& object, const char* name, int64_t highest, int64_t& out) {
    if (!object.isMember(name) || !object[name].isInt64()) {
        return false;
    }
    out = object[name].asInt64();
    return out >= 0 && out <= highest;
}

bool TakeOptions(const Json::Value& options, Session& session) {
    int64_t timeout = 0;
    if (!options.isObject() || !TakeText(options, "app", session.app) || !TakeText(options, "webapi", session.webapi) ||
        !TakeNumber(options, "timeout", kLongestIdleMinutes, timeout)) {
        return false;
    }
    session.timeout = static_cast<int>(timeout);
    if (options.isMember("skipCheckIP")) {
        if (!options["skipCheckIP"].isBool()) {
            return false;
        }
        session.skipCheckIp = options["skipCheckIP"].asBool();
    }
    return true;
}

}  // namespace

bool ParseSession(std::string_view text, Session& session) {
    constexpr int64_t kHighestUid = 0xfffffffe;
    Json::Value value;
    if (!ParseJson(text, value) || !value.isObject()) {
        return false;
    }
    Session read;
    int64_t uid = 0;
    if (!TakeText(value, "user", read.user) || read.user.empty() || read.user.size() > kLongestUserName ||
        !TakeNumber(value, "uid", kHighestUid, uid) || !TakeText(value, "address", read.address) ||
        !TakeNumber(value, "created", INT64_MAX, read.created) || !TakeText(value, "token", read.token) ||
        (!read.token.empty() && !IsSessionId(read.token)) || !value.isMember("options") ||
        !TakeOptions(value["options"], read)) {
        return false;
    }
    read.uid = static_cast<uid_t>(uid);
    session = read;
    return true;
}

std::string WriteSession(const Session& session) {
    Json::Value options(Json::objectValue);
    options["app"] = session.app;
    options["webapi"] = session.webapi;
    options["timeout"] = session.timeout;
    if (session.skipCheckIp) {
        options["skipCheckIP"] = *session.skipCheckIp;
    }
    Json::Value value(Json::objectValue);
    value["user"] = session.user;
    value["uid"] = Json::UInt(session.uid);
    value["address"] = session.address;
    value["created"] = Json::Int64(session.created);
    value["token"] = session.token;
    value["options"] = options;
    return WriteJson(value);
}

}  // namespace reference
