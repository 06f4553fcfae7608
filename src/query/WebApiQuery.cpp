#include <strings.h>

#include <cstring>

#include "base/Log.h"
#include "base/Printable.h"
#include "query/CurlLibrary.h"
#include "query/HttpQuery.h"
#include "webapi/APIRunner.h"
#include "webapi/APIUtils.h"
#include "webapi/ExecParam.h"
#include "webapi/Json.h"
#include "webapiutil.h"
#include "zovadaemon.h"
#include "zovaw3.h"

#define LOG_QUERY(text, ...) WEBAPI_LOG_AS("APIUtils", LOG_ERR, text __VA_OPT__(, ) __VA_ARGS__)

namespace ZOVA::APIUtils {

namespace {

constexpr const char* kFastApiSocket = "/run/zovascgi-fastapi.sock";
constexpr const char* kAdministrator = "admin";

bool HasScheme(const std::string& endpoint, const char* scheme) {
    return strncasecmp(endpoint.c_str(), scheme, strlen(scheme)) == 0;
}

std::string LocalUrl(const std::string& path) {
    zovaw3::ZELM server(zovaw3::Engine::CreatePrivate());
    return "https://127.0.0.1:" + std::to_string(server.GetHttpsPort()) + "/" + path;
}

bool QueryHttp(const std::string& url, std::string& headers, std::string& body) {
    static CurlLibrary library;
    return HttpQuery(library, url, headers, body);
}

/** The body's call, in this process and as the administrator. */
bool QueryInProcess(std::string& body) {
    Json::Value params(Json::objectValue);
    WebAPIUtil::strPairToJsonObj(body, params, true, false);
    const std::string api = Json::asString(Json::member(params, "api"));
    const std::string method = Json::asString(Json::member(params, "method"));
    const int version = Json::asInt(Json::member(params, "version"));
    if (api.empty() || version <= 0 || method.empty()) {
        LOG_QUERY("body must be api=xxx&method=xxx&version=1 when endpoint is empty.");
        return false;
    }
    for (const char* name : {"api", "method", "version"}) {
        params.removeMember(name);
    }
    ExecParam call;
    call.SetRunner(kAdministrator).SetParams(params).SetAPI(api).SetVersion(version).SetMethod(method);
    body = Json::toString(APIRunner::Exec(call));
    return true;
}

/** Names the administrator where nobody is named. False for a description that has no place for a name. */
bool NameRunner(Json::Value& description) {
    if (!Json::isObject(description) || !Json::isObject(Json::member(description, "runner"))) {
        return false;
    }
    Json::Value& runner = description["runner"];
    if (!runner.isMember("username")) {
        runner["username"] = kAdministrator;
    }
    return true;
}

}  // namespace

bool QueryFastWebapi(const Json::Value& description, std::string& answer) {
    Json::Value query = description;
    if (!NameRunner(query)) {
        LOG_QUERY("the run description or its runner is no object");
        return false;
    }
    const std::string text = Json::toString(query);
    zovadaemon::DomainSockConnection connection(kFastApiSocket);
    if (!connection.Connect()) {
        LOG_QUERY("Can not access zovascgi-fastapi.sock. %s", base::Printable(text).c_str());
        return false;
    }
    if (!connection.Send(text)) {
        LOG_QUERY("Can not send zovascgi-fastapi.sock. %s", base::Printable(text).c_str());
        return false;
    }
    if (!connection.Recv(answer)) {
        LOG_QUERY("Can not recv zovascgi-fastapi.sock. %s", base::Printable(text).c_str());
        return false;
    }
    return true;
}

bool QueryFastWebapi(const Json::Value& description, Json::Value& answer) {
    std::string text;
    return QueryFastWebapi(description, text) && Json::fromString(answer, text);
}

bool QueryWebapi(const std::string& endpoint, std::string& headers, std::string& body) {
    if (HasScheme(endpoint, "http://")) {
        LOG_QUERY("Not support http schema");
        return false;
    }
    if (HasScheme(endpoint, "https://")) {
        return QueryHttp(endpoint, headers, body);
    }
    if (endpoint.find("://") != std::string::npos) {
        LOG_QUERY("FATAL: endpoint support http(s) url or path only. %s", base::Printable(endpoint).c_str());
        return false;
    }
    if (!endpoint.empty()) {
        return QueryHttp(LocalUrl(endpoint), headers, body);
    }
    if (body.empty()) {
        LOG_QUERY("Both endpoint and body are empty");
        return false;
    }
    return QueryInProcess(body);
}

}  // namespace ZOVA::APIUtils
