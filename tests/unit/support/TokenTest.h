#pragma once

#include <map>
#include <string>
#include <vector>

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"

namespace unit {

/** A fast API service that answers by the API's name, and what it was asked. */
class FastApi {
public:
    explicit FastApi(fake::FakePlatform& platform) {
        platform.services["/run/zovascgi-fastapi.sock"] = [this](const std::string& text) {
            queries.push_back(J(text));
            return answers[queries.back()["params"]["api"].asString()];
        };
    }
    FastApi(const FastApi&) = delete;
    FastApi& operator=(const FastApi&) = delete;

    /** Texts of the answers by API; "" where none is set. */
    std::map<std::string, std::string> answers;
    std::vector<Json::Value> queries;
};

constexpr const char* kServerAPI = "ZOVA.Core.OAuth.Server";
constexpr const char* kScopeAPI = "ZOVA.Core.OAuth.Scope";
constexpr const char* kUserAPI = "ZOVA.Core.User";

/** A device with one token server, which answers for every token as alice with the scope "read". */
struct TokenDevice {
    explicit TokenDevice(fake::FakePlatform& owner) : platform(owner), service(owner) {
        SetServers(R"([{"enabled": true, "endpoint": "https://one.example/", "header": "X-A: 1",
            "params": "token={access_token}&kind=bearer", "expect": {"user": "{userName}", "scope": "{scope}"}}])");
        SetScopes(R"([{"id": "read", "apis": [{"params": ["api=ZOVA.Test."]}]}])");
        service.answers[kUserAPI] = R"({"success": true, "data": {"name": "alice"}})";
        ServerAnswers("https://one.example/", R"({"user": "alice", "scope": "read"})");
    }

    void SetServers(const std::string& list) { SetData(kServerAPI, list); }
    void SetScopes(const std::string& list) { SetData(kScopeAPI, R"({"scope": )" + list + "}"); }
    void SetData(const std::string& api, const std::string& data) {
        service.answers[api] = R"({"success": true, "data": )" + data + "}";
    }
    void ServerAnswers(const std::string& url, const std::string& text) { platform.httpServers[url] = {{}, {text}}; }

    fake::FakePlatform& platform;
    FastApi service;
};

}  // namespace unit
