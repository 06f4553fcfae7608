// Out-of-band calls: what is run, where, in whose name, and what the caller gets.

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <optional>

#include "ChildRun.h"
#include "SubrequestTest.h"
#include "webapi/APIRunner.h"
#include "webapi/ExecParam.h"
#include "webapi/Json.h"

using unit::J;
using ZOVA::APIRequest;
using ZOVA::APIResponse;
using ZOVA::APIRunner;
using ZOVA::ExecHandler;
using ZOVA::ExecParam;

namespace {

using Texts = std::vector<std::string>;

constexpr const char* kDescriptionDirectory = "/usr/zova/zovaman/webapi/";
constexpr const char* kBadRequest = R"({"success": false, "error": {"code": 101}})";
constexpr const char* kInternal = R"({"success": false, "error": {"code": 117}})";

class ExecTest : public unit::SubrequestTest {
protected:
    ExecTest() {
        unsetenv("USERNAME");
        unsetenv("ZOVA_WEBAPI_USERNAME");
        platform.redirects[kDescriptionDirectory] = described.Path() + "/";
    }

    static ExecParam Param(const std::string& method, const std::string& what, const std::string& user = "alice") {
        ExecParam param;
        Json::Value params(Json::objectValue);
        params["do"] = what;
        param.SetParams(params).SetAPI("ZOVA.Test.Hook").SetVersion(1).SetMethod(method).SetRunner(user);
        return param;
    }

    static Json::Value Run(const std::string& method, const std::string& what, const std::string& user = "alice") {
        return APIRunner::Exec(Param(method, what, user));
    }

    static std::string Directory() {
        const fake::Suspended suspended;
        char* path = getcwd(nullptr, 0);
        const std::string directory = path;
        free(path);
        return directory;
    }

    static std::string Variable(const char* name) {
        const char* value = getenv(name);
        return value == nullptr ? "(unset)" : value;
    }

    int Forks() const { return platform.CountOf("QLIBCProcForkEx"); }

    unit::TemporaryDirectory described;
};

// ---- what has to be there ----

TEST_F(ExecTest, WithoutAPIMethodOrRunnerNothingRunsAndTheAnswerIs101) {
    const Json::Value before = unit::Snapshot();
    const ExecParam rows[] = {ExecParam(), Param("local", "succeed", ""), Param("local", "succeed").SetAPI(""),
                              Param("", "succeed")};
    for (const ExecParam& param : rows) {
        platform.calls.clear();
        EXPECT_JSON(APIRunner::Exec(param), kBadRequest);
        ExpectLog(LOG_ERR, "missing parameter.", "ExecHandler.cpp");
        EXPECT_EQ(platform.CountOf("dlopen") + platform.CountOf("setenv") + Forks(), 0);
        EXPECT_EQ(unit::Snapshot(), before) << "the working directory is back";
        EXPECT_EQ(platform.CallsOf({"chdir"}),
                  (Texts{std::string("chdir(") + kDescriptionDirectory + ")", "chdir(" + Directory() + ")"}));
    }
}

TEST_F(ExecTest, ANullPointerIsAnEmptyText) {
    Json::Value result;
    APIRunner::Exec(result, nullptr, 1, "local", J("{}"), "alice");
    EXPECT_JSON(result, kBadRequest);
    APIRunner::Exec(result, "ZOVA.Test.Hook", 1, nullptr, J("{}"), J("{}"), "alice");
    EXPECT_JSON(result, kBadRequest);
    APIRunner::Exec(result, -1, "ZOVA.Test.Hook", 1, "local", J("{}"), J("{}"), nullptr);
    EXPECT_JSON(result, kBadRequest);
    for (int i = 0; i < 3; ++i) {
        ExpectLog(LOG_ERR, "missing parameter.", "ExecHandler.cpp");
    }
}

TEST_F(ExecTest, ItsStepsCalledOneByOneGiveTheSameResultWithoutAFork) {
    const ExecParam bad;
    ExecHandler refused(bad);
    EXPECT_TRUE(refused.GetResult().isNull()) << "before anything has run";
    EXPECT_FALSE(refused.CheckParams());
    EXPECT_JSON(refused.GetResult(), kBadRequest);
    ExpectLog(LOG_ERR, "missing parameter.", "ExecHandler.cpp");

    const ExecParam good = Param("local", "succeed");
    ExecHandler handler(good);
    ASSERT_TRUE(handler.CheckParams());
    handler.PrepareReq();
    handler.Run(true);
    EXPECT_JSON(handler.GetResult(), R"({"success": true, "httpd_restart": false})");
    EXPECT_EQ(Forks(), 0);
}

// ---- where it runs ----

TEST_F(ExecTest, AMethodThatGivesItsIdentityBackRunsInThisProcess) {
    for (const char* method : {"local", "by_default"}) {
        const Json::Value before = unit::Snapshot();
        EXPECT_JSON(Run(method, "succeed"), R"({"success": true, "httpd_restart": false})") << method;
        EXPECT_EQ(Forks() + platform.CountOf("pipe2"), 0) << method;
        EXPECT_EQ(unit::Snapshot(), before) << method;
    }
}

TEST_F(ExecTest, AMethodWithNeitherAttributeRunsInAChildAndLeavesTheCallersIdentity) {
    const Json::Value before = unit::Snapshot();
    const Json::Value result = Run("child", "tell_ids");
    EXPECT_JSON(result["data"]["user"], "[500, 500, 500]");
    EXPECT_EQ(platform.CallsOf({"QLIBCProcForkEx"}), (Texts{"QLIBCProcForkEx(65)"}));
    EXPECT_EQ(unit::Snapshot(), before);
    const std::vector<fake::ForkedChild> children = TakeChildren();
    ASSERT_EQ(children.size(), 1u);
    EXPECT_EQ(children[0].end, "status 0");
    EXPECT_EQ(children[0].calls.back(), "_exit(0)");
}

TEST_F(ExecTest, AnUnknownMethodTakesTheDefaultsAndAnswers103) {
    EXPECT_EQ(Run("no_such", "succeed")["error"]["code"].asInt(), 103);
    EXPECT_EQ(Forks(), 0) << "\"grantable\" in the defaults";
    platform.files[std::string(kDescriptionDirectory) + "lib.def"] = R"({"methods": {}})";
    EXPECT_EQ(Run("no_such", "succeed")["error"]["code"].asInt(), 103);
    EXPECT_EQ(Forks(), 1);
}

TEST_F(ExecTest, AnUnknownAPIAnswers102) {
    EXPECT_EQ(APIRunner::Exec(Param("local", "succeed").SetAPI("ZOVA.Nobody.Knows"))["error"]["code"].asInt(), 102);
    for (int i = 0; i < 2; ++i) {
        ExpectLog(LOG_ERR, "WebAPI ZOVA.Nobody.Knows is not valid", "Descriptions.cpp");
    }
}

TEST_F(ExecTest, RunsInTheDirectoryOfTheDescriptionsAndGivesTheCallersBack) {
    unit::Hooks()["tell_directory"] = [](APIRequest*, APIResponse* response) { response->SetSuccess(Directory()); };
    const std::string before = Directory();
    for (const char* method : {"local", "child"}) {
        EXPECT_EQ(Run(method, "tell_directory")["data"], described.Path()) << method;
        EXPECT_EQ(Directory(), before) << method;
    }
}

TEST_F(ExecTest, GivesTheDirectoryBackAlsoAfterAFailure) {
    const std::string before = Directory();
    platform.Fail("QLIBCProcForkEx", EAGAIN);
    EXPECT_JSON(Run("child", "succeed"), kInternal);
    EXPECT_EQ(Directory(), before);
    ExpectLog(LOG_ERR, "fork failed", "ExecHandler.cpp");
}

TEST_F(ExecTest, AWorkingDirectoryThatCannotBeNamedIsNotGoneBackTo) {
    platform.Fail("getcwd", ENOENT);
    const std::string before = Directory();
    EXPECT_TRUE(Run("local", "succeed")["success"].asBool());
    EXPECT_EQ(platform.CallsOf({"chdir"}), (Texts{std::string("chdir(") + kDescriptionDirectory + ")"}));
    ASSERT_EQ(chdir(before.c_str()), 0);
}

TEST_F(ExecTest, WithoutTheDescriptionDirectoryItGoesOnWhereItStands) {
    platform.Fail("chdir", ENOENT, 0, 1);
    const std::string before = Directory();
    EXPECT_TRUE(Run("local", "succeed")["success"].asBool());
    EXPECT_EQ(Directory(), before);
}

// ---- in whose name ----

TEST_F(ExecTest, ACallIsAuthorisedAsItsRunner) {
    const Json::Value data = Run("local", "tell_request")["data"];
    EXPECT_EQ(data["user"], "alice");
    EXPECT_FALSE(data["admin"].asBool());
    EXPECT_FALSE(data["timeout"].asBool());
    EXPECT_TRUE(Run("local", "tell_request", "admin")["data"]["admin"].asBool());
    EXPECT_EQ(platform.CallsOf({"QLIBGroupIsAdminGroupMem"}),
              (Texts{"QLIBGroupIsAdminGroupMem(alice, 0)", "QLIBGroupIsAdminGroupMem(admin, 0)"}));
}

TEST_F(ExecTest, NoGateIsAskedForTheUser) {
    HookAPI()["authLevel"] = 2;
    HookAPI()["allowUser"] = J(R"(["admin.local"])");
    Install();
    EXPECT_TRUE(Run("local", "succeed")["success"].asBool());
}

TEST_F(ExecTest, AMethodThatRunsAsItsUserIsTheRunner) {
    HookAPI()["methods"]["1"].append(J(R"({"gated": {"grantByUser": true}})"));
    HookAPI()["methods"]["1"].removeIndex(5, nullptr);
    Install();
    EXPECT_JSON(Run("gated", "tell_ids")["data"],
                R"({"user": [1000, 1000, 1000], "group": [100, 100, 100], "groups": [100, 200]})");
    EXPECT_EQ(Run("gated", "tell_ids", "nobody-knows")["error"]["code"].asInt(), 117);
    ExpectLog(LOG_ERR, "grantByUser failed. [No such file or directory]", "Invocation.cpp");
}

// ---- what it is handed ----

TEST_F(ExecTest, ParametersEnvironmentAndAttributesArrive) {
    setenv("UNIT_VARIABLE", "process", 1);
    ExecParam param = Param("local", "tell_request");
    param.SetEnv(J(R"({"UNIT_VARIABLE": "call", "REQUEST_METHOD": "GET"})")).SetAttr(J(R"({"mark": [1]})"));
    const Json::Value data = APIRunner::Exec(param)["data"];
    EXPECT_JSON(data["param"], R"({"do": "tell_request", "api": "ZOVA.Test.Hook", "version": 1, "method": "local"})");
    EXPECT_EQ(data["env"]["UNIT_VARIABLE"], "call");
    EXPECT_EQ(data["env"]["REQUEST_METHOD"], "POST") << "whatever the caller set";
    EXPECT_EQ(data["requestMethod"].asInt(), 2);
    EXPECT_JSON(data["attr"], R"({"mark": [1]})");
}

TEST_F(ExecTest, TheShortFormsLetTheNamesWinOverMembersOfParams) {
    const Json::Value params =
        J(R"({"api": "ZOVA.Test.Good", "version": 2, "method": "nothing", "do": "tell_request"})");
    Json::Value result;
    APIRunner::Exec(result, "ZOVA.Test.Hook", 1, "local", params, "alice");
    EXPECT_JSON(result["data"]["param"],
                R"({"do": "tell_request", "api": "ZOVA.Test.Hook", "version": 1, "method": "local"})");
    EXPECT_JSON(result["data"]["attr"], "{}");
    APIRunner::Exec(result, "ZOVA.Test.Hook", 1, "child", params, J(R"({"mark": 1})"), "alice");
    EXPECT_JSON(result["data"]["attr"], R"({"mark": 1})");
    EXPECT_EQ(result["data"]["param"]["method"], "child");
}

TEST_F(ExecTest, ParametersThatAreNoObjectAreLeftOut) {
    for (const char* params : {"null", "5", "[1]", "\"text\""}) {
        Json::Value result;
        APIRunner::Exec(result, "ZOVA.Test.Good", 1, "echo", J(params), J(params), "alice");
        EXPECT_JSON(result["data"], R"({"api": "ZOVA.Test.Good", "version": 1, "method": "echo"})");
    }
}

TEST_F(ExecTest, TheResultIsTheBodyWithTheRestartFlag) {
    EXPECT_JSON(Run("local", "fail"), R"({"success": false, "error": {"code": 1}, "httpd_restart": false})");
    EXPECT_JSON(Run("child", "fail"), R"({"success": false, "error": {"code": 1}, "httpd_restart": false})");
    EXPECT_TRUE(Run("local", "ask_restart")["httpd_restart"].asBool());
    EXPECT_TRUE(Run("child", "ask_restart")["httpd_restart"].asBool());
}

// ---- the two variables ----

TEST_F(ExecTest, BothVariablesNameTheRunnerMeanwhile) {
    unit::Hooks()["tell_variables"] = [](APIRequest*, APIResponse* response) {
        response->SetSuccess(Variable("USERNAME") + " " + Variable("ZOVA_WEBAPI_USERNAME"));
    };
    setenv("USERNAME", "caller", 1);
    setenv("ZOVA_WEBAPI_USERNAME", "outer", 1);
    EXPECT_EQ(Run("local", "tell_variables")["data"], "alice alice");
    EXPECT_EQ(Run("child", "tell_variables")["data"], "alice alice");
}

struct VariableRow {
    const char* name;
    const char* method;
    std::optional<std::string> user;
    std::optional<std::string> webUser;
    const char* userAfter;
    const char* webUserAfter;
};

TEST_F(ExecTest, TheVariablesAfterTheCall) {
    const VariableRow rows[] = {
        {"both set", "local", "caller", "outer", "outer", "outer"},
        {"only the general one set", "local", "caller", std::nullopt, "alice", "alice"},
        {"only the web user's set", "local", std::nullopt, "outer", "outer", "outer"},
        {"none set", "local", std::nullopt, std::nullopt, "alice", "alice"},
        {"an empty one counts as set", "local", "caller", "", "", ""},
        {"a child's are its own", "child", "caller", "outer", "caller", "outer"},
        {"a child's where none was set", "child", std::nullopt, std::nullopt, "(unset)", "(unset)"},
    };
    for (const VariableRow& row : rows) {
        const unit::EnvironmentScope scope;
        if (row.user) {
            setenv("USERNAME", row.user->c_str(), 1);
        }
        if (row.webUser) {
            setenv("ZOVA_WEBAPI_USERNAME", row.webUser->c_str(), 1);
        }
        EXPECT_TRUE(Run(row.method, "succeed")["success"].asBool()) << row.name;
        EXPECT_EQ(Variable("USERNAME"), row.userAfter) << row.name;
        EXPECT_EQ(Variable("ZOVA_WEBAPI_USERNAME"), row.webUserAfter) << row.name;
    }
}

TEST_F(ExecTest, AChildDoesNotRestoreTheVariables) {
    setenv("USERNAME", "caller", 1);
    setenv("ZOVA_WEBAPI_USERNAME", "outer", 1);
    Run("child", "succeed");
    const Texts calls = TakeChildren().at(0).calls;
    EXPECT_EQ(std::count(calls.begin(), calls.end(), "setenv(USERNAME, alice)"), 1);
    EXPECT_EQ(std::count(calls.begin(), calls.end(), "setenv(USERNAME, outer)"), 0);
}

// ---- a call in a call ----

TEST_F(ExecTest, AMethodMayRunAnotherCall) {
    unit::Hooks()["nest"] = [](APIRequest*, APIResponse* response) {
        Json::Value data(Json::objectValue);
        data["local"] = Run("local", "tell_ids", "admin");
        data["child"] = Run("child", "tell_ids", "admin");
        data["user"] = Variable("ZOVA_WEBAPI_USERNAME");
        response->SetSuccess(data);
    };
    const std::string directory = Directory();
    const Json::Value data = Run("by_default", "nest")["data"];
    EXPECT_TRUE(data["local"]["success"].asBool());
    EXPECT_JSON(data["child"]["data"]["user"], "[500, 500, 500]");
    EXPECT_EQ(data["user"], "alice");
    EXPECT_EQ(Directory(), directory);
}

// ---- a handler by itself ----

TEST_F(ExecTest, AHandlersRunnerLeadsASessionAndClosesItsLibraries) {
    const ExecParam param = Param("local", "succeed");
    platform.calls.clear();
    {
        ExecHandler handler(param);
        EXPECT_EQ(platform.CallsOf({"setsid", "ReadJsonFile"}).size(), 2u);
        EXPECT_TRUE(handler.CheckParams());
        handler.Process();
    }
    EXPECT_EQ(platform.CountOf("dlopen"), 1);
    EXPECT_EQ(platform.CountOf("dlclose"), 1);
}

// ---- children that fail ----

TEST_F(ExecTest, ARefusedForkAnswers117) {
    platform.Fail("QLIBCProcForkEx", EAGAIN);
    const std::vector<int> before = unit::OpenDescriptorNumbers();
    EXPECT_JSON(Run("child", "succeed"), kInternal);
    ExpectLog(LOG_ERR, "fork failed", "ExecHandler.cpp");
    EXPECT_EQ(unit::OpenDescriptorNumbers(), before);
}

TEST_F(ExecTest, AChildThatDiesOrLeavesAnswers117) {
    for (const char* what : {"die", "leave"}) {
        EXPECT_JSON(Run("child", what), kInternal);
        ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
        ExpectLog(LOG_ERR, "read json failed", "ExecHandler.cpp");
    }
    TakeChildren();
}

TEST_F(ExecTest, ARefusedPipeAnswers117) {
    platform.Fail("pipe2", EMFILE);
    EXPECT_JSON(Run("child", "succeed"), kInternal);
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
    ExpectLog(LOG_ERR, "read json failed", "ExecHandler.cpp");
}

TEST_F(ExecTest, AResultLongerThanOneReadDeliversAnswers117) {
    const std::vector<int> before = unit::OpenDescriptorNumbers();
    ExecParam param = Param("child", "answer_long");
    param.SetParams(J(R"({"size": 500000})"));
    EXPECT_JSON(APIRunner::Exec(param), kInternal);
    EXPECT_EQ(unit::OpenDescriptorNumbers(), before);
    TakeChildren();
    std::vector<fake::LogLine>& log = platform.process.log;
    ASSERT_FALSE(log.empty());
    EXPECT_EQ(log.front().text.rfind("read json 500048 failed, got ", 0), 0u) << log.front().text;
    log.erase(log.begin());
    ExpectLog(LOG_ERR, "read json failed", "ExecHandler.cpp");
}

}  // namespace
