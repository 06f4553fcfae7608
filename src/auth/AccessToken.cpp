#include "auth/ScopeFilter.h"
#include "base/Log.h"
#include "base/Printable.h"
#include "dispatcher/StreamScope.h"
#include "dispatcher/VariableScope.h"
#include "webapi/APIAuth.h"
#include "webapi/APIRequest.h"
#include "webapi/APIUtils.h"
#include "webapi/Json.h"

namespace ZOVA {

namespace {

constexpr const char* kServerList = R"({"params": {"api": "ZOVA.Core.OAuth.Server", "method": "get", "version": 1}})";
constexpr const char* kScopeList = R"({"params": {"api": "ZOVA.Core.OAuth.Scope", "method": "get", "version": 1}})";
constexpr const char* kUserLookUp = R"({"params": {"api": "ZOVA.Core.User", "method": "get", "version": 1}})";

constexpr const char* kScheme = "Bearer ";
constexpr const char* kPlace = "{access_token}";

Json::Value Query(const char* text) {
    Json::Value query;
    Json::fromString(query, text);
    return query;
}

/** Whether the query was answered by a success with data. `answer` keeps what came, null if nothing did. */
bool Ask(const Json::Value& query, Json::Value& answer) {
    return APIUtils::QueryFastWebapi(query, answer) && Json::asBool(Json::member(answer, "success")) &&
           Json::hasMember(answer, "data");
}

/** A text member, "" for anything else. */
std::string TextMember(const Json::Value& object, const char* name) {
    const Json::Value& value = Json::member(object, name);
    return value.isString() ? Json::asString(value) : "";
}

/** The JSON text for a log line, without the token, which a server may repeat in its answer. */
std::string Shown(const Json::Value& value, const std::string& token) {
    std::string text = Json::toString(value);
    if (token.empty()) {
        return base::Printable(text);
    }
    const std::string quoted = Json::toString(token);
    const std::string secret = quoted.substr(1, quoted.size() - 2);
    for (std::size_t at = text.find(secret); at != std::string::npos; at = text.find(secret, at)) {
        text.replace(at, secret.size(), "***");
        at += 3;
    }
    return base::Printable(text);
}

bool HasUserAndScope(const Json::Value& identity) {
    return Json::member(identity, "userName").isString() && Json::member(identity, "scope").isString();
}

/** What a name is taken for must not depend on who reads it: a C text ends at a NUL byte. */
bool IsName(const std::string& text) {
    return !text.empty() && text.find('\0') == std::string::npos;
}

bool IsKnownUser(const std::string& user) {
    Json::Value query = Query(kUserLookUp);
    query["params"]["name"] = user;
    Json::Value answer;
    if (!Ask(query, answer)) {
        WEBAPI_LOG(LOG_ERR, "Can not find user (%s). %s", base::Printable(user).c_str(), "");
        return false;
    }
    return true;
}

_tag_authorized_result_ Judge(const std::string& token, APIRequest& request) {
    Json::Value answer;
    if (!Ask(Query(kScopeList), answer) || Json::member(answer["data"], "scope").empty()) {
        WEBAPI_LOG(LOG_ERR, "Can not find scope (%s).", Shown(answer, token).c_str());
        return AUTHORIZED_RESULT_TOKEN_UNAVAILABLE;
    }
    const Json::Value scopes = Json::member(answer["data"], "scope");
    Json::Value identity;
    if (!APIAuth::ExchangeAccessToken(token, identity)) {
        return AUTHORIZED_RESULT_TOKEN_UNAVAILABLE;
    }
    const std::string user = TextMember(identity, "userName");
    const std::string granted = TextMember(identity, "scope");
    if (!IsName(user) || granted.empty()) {
        WEBAPI_LOG(LOG_ERR, "FATAL: response invalid. %s", Shown(identity, token).c_str());
        return AUTHORIZED_RESULT_INVALID;
    }
    if (!IsKnownUser(user) || !ScopesCover(scopes, granted, request)) {
        return AUTHORIZED_RESULT_REFUSED;
    }
    request.SetLoginUserName(user);
    return AUTHORIZED_RESULT_OK;
}

}  // namespace

std::string APIAuth::GetBearerToken(APIRequest* request) {
    const std::string header = Json::asString(request->GetEnv("HTTP_AUTHORIZATION", ""));
    const std::size_t scheme = header.find(kScheme);
    std::string token =
        scheme == std::string::npos ? "" : header.substr(scheme + std::char_traits<char>::length(kScheme));
    if (token.empty()) {
        const Json::Value& parameter = request->GetParamRef("_oat", Json::Value::nullSingleton());
        token = parameter.isString() ? Json::asString(parameter) : "";
    }
    return token;
}

bool APIAuth::ExchangeAccessToken(const std::string& token, Json::Value& out) {
    Json::Value answer;
    if (!Ask(Query(kServerList), answer) || answer["data"].type() != Json::arrayValue) {
        WEBAPI_LOG(LOG_ERR, "Can not get oauth server information.");
        return false;
    }
    for (const Json::Value& server : answer["data"]) {
        // User and scope come from one server: what a refusing one gave is no part of the next one's answer.
        Json::Value identity;
        if (ExchangeAccessTokenByServer(server, token, identity)) {
            out = identity;
            return true;
        }
    }
    return false;
}

bool APIAuth::ExchangeAccessTokenByServer(const Json::Value& server, const std::string& token, Json::Value& out) {
    const Json::Value& enabled = Json::member(server, "enabled");
    if (!enabled.isBool() || !enabled.asBool()) {
        return false;
    }
    const Json::Value& given = Json::member(server, "params");
    std::string params = given.type() == Json::objectValue ? Json::toString(given) : TextMember(server, "params");
    std::string headers = TextMember(server, "header");
    const std::string endpoint = TextMember(server, "endpoint");
    if (!Json::hasMember(server, "expect")) {
        WEBAPI_LOG(LOG_ERR, "ZOVA.Core.OAuth.Server must provide expect");
        return false;
    }
    const std::size_t place = params.find(kPlace);
    if (place == std::string::npos) {
        WEBAPI_LOG(LOG_ERR, "ZOVA.Core.OAuth.Server must provide {access_token}");
        return false;
    }
    // Without an endpoint the params are a call that runs as the administrator: the client must not add to it.
    if (endpoint.empty() && token.find('&') != std::string::npos) {
        WEBAPI_LOG(LOG_ERR, "the token is no single value");
        return false;
    }
    params.replace(place, std::char_traits<char>::length(kPlace), token);
    if (!APIUtils::QueryWebapi(endpoint, headers, params)) {
        return false;
    }
    Json::Value answer;
    if (!Json::fromString(answer, params)) {
        WEBAPI_LOG(LOG_ERR, "Can not read response from %s", base::Printable(endpoint).c_str());
        return false;
    }
    out = Json::Value(Json::objectValue);
    APIUtils::ResolveJson(answer, server["expect"], out);
    if (!HasUserAndScope(out)) {
        WEBAPI_LOG(LOG_ERR, "Resolve %s with %s failed. Can not found userName or scope", Shown(answer, token).c_str(),
                   Shown(server["expect"], token).c_str());
        return false;
    }
    return true;
}

bool APIAuth::CheckAccessToken(APIRequest* request) {
    const std::string token = GetBearerToken(request);
    if (token.empty()) {
        return false;
    }
    // A query says on standard output that an answer is too long: that must not begin the client's own answer.
    const StreamScope silence(true, false);
    // A server's local API runs as the administrator, which must not stay behind as the name of whoever calls.
    const VariableScope user("USERNAME");
    const VariableScope webUser("ZOVA_WEBAPI_USERNAME");
    request->SetAuthResult(Judge(token, *request));
    return true;
}

}  // namespace ZOVA
