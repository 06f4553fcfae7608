#include "DeviceTest.h"

#include "webapi/Json.h"

namespace unit {

namespace {

constexpr const char* kGoodMethods = R"([
    "success", "echo", "nothing", "throw", "throw_int", "mess", "throw_mess", "read_input", "write_output", "probe",
    "session", "header", "restart", "silent", "nest", "null_function", "not_in_table",
    {"granted": {"grantable": true}},
    {"by_default": {"grantByDefault": true}},
    {"by_user": {"grantByUser": true, "grantable": true}},
    {"by_user_lasting": {"grantByUser": true}},
    {"lasting": {}},
    {"keep_input": {"grantable": true, "allowUpload": true}},
    {"upload": {"grantable": true, "allowUpload": true}},
    {"upload_lasting": {"grantByUser": true, "allowUpload": true}},
    {"upload_silent": {"grantable": true, "allowUpload": true}},
    {"upload_as_root": {"grantByDefault": true, "allowUpload": true}},
    {"upload_deferred": {"grantable": true, "allowUpload": true, "deferUpload": true}},
    {"keep_output": {"grantable": true, "allowDownload": true}}
])";

Json::Value Description(const std::string& library, const Json::Value& methods) {
    Json::Value description(Json::objectValue);
    description["lib"] = LibraryPath(library);
    description["minVersion"] = 1;
    description["maxVersion"] = 2;
    description["authLevel"] = 0;
    description["runAs"] = "service";
    description["methods"]["1"] = methods;
    return description;
}

}  // namespace

std::string LibraryPath(const std::string& name) {
    return std::string(UNIT_LIBRARY_DIR) + "/" + name + ".so";
}

DeviceTest::DeviceTest() : descriptions(Json::objectValue) {
    platform.users["admin"] = {1024, 101, {101, 110}, true};
    platform.users["alice"] = {1000, 100, {100, 200}, false};
    platform.users["service"] = {500, 50, {50}, false};
    platform.sessions["alice-sid"] = {"alice", 1, 1000, {}};
    platform.sessions["admin-sid"] = {"admin", 1, 1024, {}};

    platform.files["/usr/zova/zovaman/webapi/lib.def"] = R"({
        "authLevel": 1, "allowUser": ["admin.local", "normal.local"], "priority": 0,
        "methods": {"grantable": true}})";
    Good() = Description("good", J(kGoodMethods));
    Good()["priority"] = 5;
    Good()["methods"]["2"] = J(R"(["success"])");
    descriptions["ZOVA.Test.Other"] = Description("good", J(R"(["success"])"));
    descriptions["ZOVA.Test.Checked"] = Description("checked", J(R"(["passes", "refused_with_error",
        "refused_silently", "throws", "renames", "notes_error", "notes_error_silently", "null_check", "no_row"])"));
    descriptions["ZOVA.Test.NoTable"] = Description("no_table", J(R"(["get"])"));
    descriptions["ZOVA.Test.NullTable"] = Description("null_table", J(R"(["get"])"));
    descriptions["ZOVA.Test.NullCheck"] = Description("null_check_table", J(R"(["success"])"));
    descriptions["ZOVA.Test.Twice"] = Description("duplicates", J(R"(["get"])"));
    descriptions["ZOVA.Test.Twice"]["methods"]["2"] = J(R"(["get"])");
    descriptions["ZOVA.Test.Twin"] = Description("duplicates", J(R"(["get"])"));
    descriptions["ZOVA.Test.Missing"] = Description("there_is_none", J(R"(["get"])"));
    Install();
}

void DeviceTest::Install() {
    platform.files["ZOVA.Test.lib"] = Json::toString(descriptions);
}

void DeviceTest::Name(TestRunner& runner, const std::string& api, int version, const std::string& method,
                      const Json::Value& params) {
    Json::Value init(Json::objectValue);
    init["postParam"] = params.isNull() ? Json::Value(Json::objectValue) : params;
    init["postParam"]["api"] = api;
    init["postParam"]["version"] = version;
    init["postParam"]["method"] = method;
    runner.Request()->InitParam(init, true);
}

bool DeviceTest::Call(TestRunner& runner, const std::string& api, int version, const std::string& method,
                      const Json::Value& params) {
    Name(runner, api, version, method, params);
    return runner.Process(runner.Request(), runner.Response());
}

bool DeviceTest::CallGood(TestRunner& runner, const std::string& method) {
    return Call(runner, "ZOVA.Test.Good", 1, method);
}

void DeviceTest::ExpectServiceTraces() {
    ExpectAuthLog(LOG_INFO, "WARNING: setresuid(-1, 0, -1)");
    ExpectAuthLog(LOG_INFO, "WARNING: setresgid(-1, 0, -1)");
    ExpectAuthLog(LOG_INFO, "WARNING: setresuid(-1, 0, -1)");
    ExpectAuthLog(LOG_INFO, "WARNING: setresgid(0, 0, 0)");
    ExpectAuthLog(LOG_INFO, "WARNING: setresuid(0, 0, 0)");
}

}  // namespace unit
