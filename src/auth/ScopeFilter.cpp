#include "auth/ScopeFilter.h"

#include "webapi/APIRequest.h"
#include "webapi/Json.h"
#include "webapiutil.h"

namespace ZOVA {

namespace {

/** The elements of an array; of anything else, none. */
const Json::Value& Elements(const Json::Value& value) {
    return value.type() == Json::arrayValue ? value : Json::Value::nullSingleton();
}

bool IsGranted(const Json::Value& scope, const std::string& granted) {
    const std::string id = Json::asString(Json::member(scope, "id"));
    // Without a name it could only match a blank too many.
    return !id.empty() && (" " + granted + " ").find(" " + id + " ") != std::string::npos;
}

/** An endpoint says that the record is for somebody else. */
bool IsForThisDevice(const Json::Value& record) {
    const Json::Value& endpoint = Json::member(record, "endpoint");
    return endpoint.isNull() || (endpoint.isString() && Json::asString(endpoint).empty());
}

bool HasEqualParam(const std::string& name, const Json::Value& value, const APIRequest& request) {
    // A value that holds nothing asks only that the parameter is there.
    return request.HasParam(name) &&
           (value.empty() || request.GetParamRef(name, Json::Value::nullSingleton()) == value);
}

bool Passes(const std::string& name, const Json::Value& value, APIRequest& request) {
    if (name == "version") {
        return value.isInt() && value.asInt() == request.GetAPIVersion();
    }
    if (name == "method") {
        return value.isString() && Json::asString(value) == request.GetAPIMethod();
    }
    if (name == "api") {
        return value.isString() && request.GetAPIClass().starts_with(Json::asString(value));
    }
    return HasEqualParam(name, value, request);
}

/** Every member of the line "name=value&name=value" has to pass; a line without any opens nothing. */
bool LineCovers(const Json::Value& line, APIRequest& request) {
    Json::Value filter(Json::objectValue);
    if (!line.isString() || !WebAPIUtil::strPairToJsonObj(Json::asString(line), filter, true, false) ||
        filter.type() != Json::objectValue || filter.empty()) {
        return false;
    }
    for (auto member = filter.begin(); member != filter.end(); ++member) {
        if (!Passes(member.name(), *member, request)) {
            return false;
        }
    }
    return true;
}

}  // namespace

bool ScopesCover(const Json::Value& scopes, const std::string& granted, APIRequest& request) {
    for (const Json::Value& scope : Elements(scopes)) {
        if (!IsGranted(scope, granted)) {
            continue;
        }
        for (const Json::Value& record : Elements(Json::member(scope, "apis"))) {
            if (!IsForThisDevice(record)) {
                continue;
            }
            for (const Json::Value& line : Elements(Json::member(record, "params"))) {
                if (LineCovers(line, request)) {
                    return true;
                }
            }
        }
    }
    return false;
}

}  // namespace ZOVA
