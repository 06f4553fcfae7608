#include "SubrequestTest.h"

#include <dirent.h>
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>

#include "webapi/Json.h"

using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace unit {

namespace {

constexpr unsigned int kTestSeconds = 120;

Json::Value Ids(const fake::Ids& ids) {
    return List(ids.real, ids.effective, ids.saved);
}

/** What the test library can always do. */
void Teach(std::map<std::string, Hook>& hooks) {
    hooks.clear();
    hooks["succeed"] = [](APIRequest* request, APIResponse* response) {
        response->SetSuccess(request->GetParam("data", Json::Value()));
    };
    hooks["fail"] = [](APIRequest* request, APIResponse* response) {
        response->SetError(Json::asInt(request->GetParam("code", 1)), Json::Value());
    };
    hooks["say_word"] = [](APIRequest* request, APIResponse* response) {
        response->SetServerError(Json::asString(request->GetParam("word", "")));
        response->SetSuccess(Json::Value());
    };
    hooks["ask_restart"] = [](APIRequest*, APIResponse* response) {
        response->SetHttpdRestart(true);
        response->SetSuccess(Json::Value());
    };
    hooks["tell_ids"] = [](APIRequest*, APIResponse* response) {
        const fake::FakeProcess& process = fake::FakePlatform::Required("tell_ids").process;
        Json::Value data(Json::objectValue);
        data["user"] = Ids(process.user);
        data["group"] = Ids(process.group);
        data["groups"] = Json::Value(Json::arrayValue);
        for (gid_t group : process.groups) {
            data["groups"].append(group);
        }
        response->SetSuccess(data);
    };
    hooks["tell_request"] = [](APIRequest* request, APIResponse* response) {
        Json::Value data(Json::objectValue);
        data["env"] = request->GetEnv("", Json::Value());
        data["param"] = request->GetParam("", Json::Value());
        data["attr"] = request->GetAttr("", Json::Value());
        data["user"] = request->GetLoginUserName();
        data["admin"] = request->IsAdmin();
        data["timeout"] = request->IsTimeout();
        data["authorized"] = request->IsAuthorized();
        data["requestMethod"] = request->GetRequestMethod();
        response->SetSuccess(data);
    };
    hooks["answer_long"] = [](APIRequest* request, APIResponse* response) {
        response->SetSuccess(std::string(static_cast<std::size_t>(Json::asInt(request->GetParam("size", 0))), 'x'));
    };
    hooks["die"] = [](APIRequest*, APIResponse*) { raise(SIGKILL); };
    hooks["leave"] = [](APIRequest*, APIResponse*) { _exit(7); };
}

}  // namespace

SubrequestTest::SubrequestTest() {
    Teach(Hooks());
    alarm(kTestSeconds);
    Json::Value& hook = HookAPI();
    hook = descriptions["ZOVA.Test.Other"];
    hook["lib"] = LibraryPath("hook");
    hook["methods"]["1"] = J(R"([
        {"local": {"grantable": true}}, {"by_default": {"grantByDefault": true}}, {"child": {}},
        {"upload": {"grantable": true, "allowUpload": true}},
        {"download": {"grantable": true, "allowDownload": true}}, {"gated": {"grantable": true}},
        {"not_in_table": {}}])");
    Install();
    Json::Value entry(Json::objectValue);
    entry["ZOVA.Entry.Request"] = Good();
    entry["ZOVA.Entry.Request"]["methods"]["1"] = J(R"([{"request": {"grantable": true}}, "other"])");
    platform.files["ZOVA.Entry.lib"] = Json::toString(entry);
}

SubrequestTest::~SubrequestTest() {
    alarm(0);
    Hooks().clear();
}

Json::Value SubrequestTest::Entry(const std::string& method, const std::string& what, const Json::Value& more) {
    Json::Value entry = more.isNull() ? Json::Value(Json::objectValue) : more;
    entry["api"] = "ZOVA.Test.Hook";
    entry["version"] = 1;
    entry["method"] = method;
    entry["do"] = what;
    return entry;
}

Json::Value SubrequestTest::Batch(const Json::Value& compound, const Json::Value& more) {
    Json::Value params = more.isNull() ? Json::Value(Json::objectValue) : more;
    params["compound"] = compound;
    Call(runner, "ZOVA.Entry.Request", 1, "request", params);
    return runner.Response()->GetBody();
}

std::vector<std::string> SubrequestTest::Outcomes(const Json::Value& body) {
    std::vector<std::string> outcomes;
    for (const Json::Value& result : Json::member(Json::member(body, "data"), "result")) {
        if (result.isNull()) {
            outcomes.push_back("null");
        } else if (Json::asBool(Json::member(result, "success"))) {
            outcomes.push_back("success");
        } else {
            outcomes.push_back(Json::asString(Json::member(Json::member(result, "error"), "code")));
        }
    }
    return outcomes;
}

std::vector<int> OpenDescriptorNumbers() {
    const fake::Suspended suspended;
    std::vector<int> numbers;
    DIR* directory = opendir("/proc/self/fd");
    while (const dirent* entry = readdir(directory)) {
        if (entry->d_name[0] != '.' && atoi(entry->d_name) != dirfd(directory)) {
            numbers.push_back(atoi(entry->d_name));
        }
    }
    closedir(directory);
    std::sort(numbers.begin(), numbers.end());
    return numbers;
}

}  // namespace unit
