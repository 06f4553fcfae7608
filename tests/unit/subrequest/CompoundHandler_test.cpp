// Batches: parameters, the order of the entries, what each answers, and what the batch makes of it.

#include "webapi/CompoundHandler.h"

#include <cstdlib>

#include "SubrequestTest.h"
#include "webapi/Json.h"

using unit::J;
using unit::List;
using ZOVA::APIRequest;
using ZOVA::APIResponse;
using ZOVA::CompoundHandler;

namespace {

using Texts = std::vector<std::string>;

class CompoundTest : public unit::SubrequestTest {
protected:
    /** Notes that it ran, by its parameter "name". */
    void TeachNoting() {
        unit::Hooks()["note"] = [](APIRequest* request, APIResponse* response) {
            fake::FakePlatform::Required("note").Enter("ran", Json::asString(request->GetParam("name", "")), 0);
            response->SetSuccess(Json::Value());
        };
    }

    static Json::Value Named(const std::string& name) {
        Json::Value more(Json::objectValue);
        more["name"] = name;
        return more;
    }

    static Json::Value Failing(int code) {
        Json::Value more(Json::objectValue);
        more["code"] = code;
        return more;
    }

    /** The handler by itself, on a request with these parameters. */
    int ParseParams(const std::string& params) {
        Name(runner, "ZOVA.Entry.Request", 1, "request", J(params));
        CompoundHandler handler(runner.Request(), runner.Response(), &runner);
        return handler.ParseParams();
    }
};

// ---- the batch's own answer ----

TEST_F(CompoundTest, AnEmptyBatchSucceedsWithAnEmptyResult) {
    for (const char* mode : {"sequential", "parallel"}) {
        Json::Value more(Json::objectValue);
        more["mode"] = mode;
        EXPECT_JSON(Batch(Json::Value(Json::arrayValue), more),
                    R"({"success": true, "data": {"has_fail": false, "result": []}})");
    }
    EXPECT_EQ(platform.CountOf("QLIBCProcForkEx"), 0);
}

TEST_F(CompoundTest, ACompoundThatIsNoArrayAnswers110) {
    const Texts values = {"{}", R"({"0": {}})", "null", "5", "true", R"("[]")"};
    for (const std::string& compound : values) {
        EXPECT_JSON(Batch(J(compound)), R"({"success": false, "error": {"code": 110, "errors": ""}})");
        ExpectLog(LOG_ERR, "ParseParams failed", "CompoundHandler.cpp");
    }
    EXPECT_EQ(platform.CountOf("QLIBCProcForkEx") + platform.CountOf("pipe2"), 0);
}

TEST_F(CompoundTest, ResultsStandInTheOrderOfTheEntriesWithTheirNames) {
    EXPECT_JSON(Batch(List(Entry("local", "succeed", J(R"({"data": 1})")),
                           Entry("child", "succeed", J(R"({"data": 2})")), Entry("local", "fail", Failing(777)))),
                R"({"success": true, "data": {"has_fail": true, "result": [
                    {"success": true, "data": 1, "api": "ZOVA.Test.Hook", "version": 1, "method": "local"},
                    {"success": true, "data": 2, "api": "ZOVA.Test.Hook", "version": 1, "method": "child"},
                    {"success": false, "error": {"code": 777}, "api": "ZOVA.Test.Hook", "version": 1,
                     "method": "local"}]}})");
    EXPECT_EQ(runner.Response()->GetError(), 0) << "failed entries do not fail the batch";
}

TEST_F(CompoundTest, ProcessIsTrueAlsoWhereEntriesFail) {
    Name(runner, "ZOVA.Entry.Request", 1, "request", J(R"({"compound": [{}]})"));
    CompoundHandler handler(runner.Request(), runner.Response(), &runner);
    EXPECT_TRUE(handler.Process());
    EXPECT_TRUE(runner.Response()->GetBody()["data"]["has_fail"].asBool());
}

TEST_F(CompoundTest, ProcessIsFalseWhereTheBatchFails) {
    Name(runner, "ZOVA.Entry.Request", 1, "request", J(R"({"compound": {}})"));
    CompoundHandler handler(runner.Request(), runner.Response(), &runner);
    EXPECT_FALSE(handler.Process());
    ExpectLog(LOG_ERR, "ParseParams failed", "CompoundHandler.cpp");
}

TEST_F(CompoundTest, ABatchSucceedsThroughProcess) {
    Json::Value params(Json::objectValue);
    params["compound"] = List(Entry("local", "fail", Failing(5)));
    EXPECT_TRUE(Call(runner, "ZOVA.Entry.Request", 1, "request", params));
    EXPECT_EQ(runner.EntryDepth(), 0);
}

// ---- parameters ----

TEST_F(CompoundTest, ParseParamsTellsAnArrayFromAnythingElse) {
    EXPECT_EQ(ParseParams(R"({"compound": []})"), 0);
    EXPECT_EQ(ParseParams(R"({"compound": [1, null]})"), 0);
    EXPECT_EQ(ParseParams(R"({"compound": {}})"), 110);
    EXPECT_EQ(ParseParams(R"({"compound": null})"), 110);
    EXPECT_EQ(ParseParams("{}"), 110);
}

TEST_F(CompoundTest, OnlyTheExactWordSelectsTheParallelMode) {
    struct Row {
        const char* mode;
        int children;
    };
    const Row rows[] = {{R"("parallel")", 1},
                        {R"("Parallel")", 0},
                        {R"("PARALLEL")", 0},
                        {R"("sequential")", 0},
                        {R"("")", 0},
                        {R"("parallel ")", 0},
                        {"1", 0},
                        {"true", 0},
                        {"null", 0},
                        {R"(["parallel"])", 0},
                        {R"({"parallel": 1})", 0}};
    for (const Row& row : rows) {
        platform.calls.clear();
        Json::Value more(Json::objectValue);
        more["mode"] = J(row.mode);
        EXPECT_EQ(Outcomes(Batch(List(Entry("local", "succeed")), more)), (Texts{"success"})) << row.mode;
        EXPECT_EQ(platform.CountOf("QLIBCProcForkEx"), row.children) << row.mode;
    }
}

// ---- stop_when_error ----

TEST_F(CompoundTest, WithStopWhenErrorTheRestIsRefusedWith112AndItsNames) {
    const Json::Value body = Batch(List(Entry("local", "succeed"), Entry("local", "fail", Failing(777)),
                                        Entry("local", "succeed"), J("{}"), Entry("child", "succeed")),
                                   J(R"({"stop_when_error": true})"));
    EXPECT_JSON(body, R"({"success": true, "data": {"has_fail": true, "result": [
        {"success": true, "api": "ZOVA.Test.Hook", "version": 1, "method": "local"},
        {"success": false, "error": {"code": 777}, "api": "ZOVA.Test.Hook", "version": 1, "method": "local"},
        {"success": false, "error": {"code": 112}, "api": "ZOVA.Test.Hook", "version": 1, "method": "local"},
        {"success": false, "error": {"code": 112}},
        {"success": false, "error": {"code": 112}, "api": "ZOVA.Test.Hook", "version": 1, "method": "child"}]}})");
    EXPECT_EQ(platform.CountOf("QLIBCProcForkEx"), 0);
}

TEST_F(CompoundTest, WithoutStopWhenErrorTheRestRuns) {
    EXPECT_EQ(Outcomes(Batch(List(Entry("local", "fail", Failing(777)), Entry("local", "succeed")))),
              (Texts{"777", "success"}));
}

TEST_F(CompoundTest, AnyFailureStopsTheRest) {
    struct Row {
        const char* name;
        Json::Value entry;
        const char* outcome;
    };
    const Row rows[] = {
        {"a failure in a child", Entry("child", "fail", Failing(5)), "5"},
        {"a refused transfer", Entry("upload", "succeed"), "113"},
        {"no API", J("{}"), "101"},
        {"an unknown method", Entry("no_such", "succeed"), "103"},
        {"no row", Entry("not_in_table", "succeed"), "121"},
    };
    for (const Row& row : rows) {
        EXPECT_EQ(Outcomes(Batch(List(row.entry, Entry("local", "succeed")), J(R"({"stop_when_error": true})"))),
                  (Texts{row.outcome, "112"}))
            << row.name;
    }
}

TEST_F(CompoundTest, StopWhenErrorHasNoEffectInTheParallelMode) {
    const Json::Value body =
        Batch(List(Entry("upload", "succeed"), Entry("local", "fail", Failing(777)), Entry("local", "succeed")),
              J(R"({"stop_when_error": true, "mode": "parallel"})"));
    EXPECT_EQ(Outcomes(body), (Texts{"113", "777", "success"}));
}

TEST_F(CompoundTest, StopWhenErrorIsReadAsABool) {
    for (const char* text : {"false", "null", "0", R"("true")", "[]", "{}", R"("")"}) {
        Json::Value more(Json::objectValue);
        more["stop_when_error"] = J(text);
        EXPECT_EQ(Outcomes(Batch(List(J("{}"), Entry("local", "succeed")), more)), (Texts{"101", "success"})) << text;
    }
}

// ---- entries ----

TEST_F(CompoundTest, AnEntryThatMayUploadOrDownloadIsRefusedWith113) {
    for (const char* mode : {"sequential", "parallel"}) {
        Json::Value more(Json::objectValue);
        more["mode"] = mode;
        EXPECT_JSON(Batch(List(Entry("upload", "succeed"), Entry("download", "succeed")), more),
                    R"({"success": true, "data": {"has_fail": true, "result": [
            {"success": false, "error": {"code": 113}, "api": "ZOVA.Test.Hook", "version": 1, "method": "upload"},
            {"success": false, "error": {"code": 113}, "api": "ZOVA.Test.Hook", "version": 1, "method": "download"}
            ]}})");
    }
    EXPECT_EQ(platform.CountOf("QLIBCProcForkEx"), 0);
}

TEST_F(CompoundTest, AnEntryWithoutAnAPIAnswers101WithoutNames) {
    EXPECT_JSON(Batch(List(J("{}"), J(R"({"version": 1, "method": "local"})"))),
                R"({"success": true, "data": {"has_fail": true, "result": [
                    {"success": false, "error": {"code": 101}}, {"success": false, "error": {"code": 101}}]}})");
}

TEST_F(CompoundTest, AnEntryDoesNotInheritTheNamesOfTheOneBefore) {
    const Json::Value body =
        Batch(List(Entry("local", "succeed"), J(R"({"do": "succeed"})"), J(R"({"api": "ZOVA.Test.Hook"})"),
                   J(R"({"api": "ZOVA.Test.Hook", "version": 1, "do": "succeed"})")));
    EXPECT_EQ(Outcomes(body), (Texts{"success", "101", "101", "101"}));
    for (Json::ArrayIndex i : {1u, 2u, 3u}) {
        EXPECT_JSON(body["data"]["result"][i], R"({"success": false, "error": {"code": 101}})");
    }
}

TEST_F(CompoundTest, AnEntryDoesNotInheritTheBatchsNames) {
    EXPECT_JSON(Batch(List(J(R"({"compound": []})")))["data"]["result"],
                R"([{"success": false, "error": {"code": 101}}])");
}

TEST_F(CompoundTest, AnEntryDoesNotInheritTheParametersOfOthers) {
    const Json::Value body = Batch(List(Entry("local", "succeed", J(R"({"data": "of the first"})")),
                                        Entry("local", "tell_request"), Entry("child", "tell_request")),
                                   J(R"({"outer": "of the batch"})"));
    EXPECT_JSON(body["data"]["result"][1]["data"]["param"],
                R"({"api": "ZOVA.Test.Hook", "version": 1, "method": "local", "do": "tell_request"})");
    EXPECT_JSON(body["data"]["result"][2]["data"]["param"],
                R"({"api": "ZOVA.Test.Hook", "version": 1, "method": "child", "do": "tell_request"})");
}

TEST_F(CompoundTest, AnEntryIsAPostWithoutAQueryString) {
    runner.Request()->InitEnv(J(R"({"REQUEST_METHOD": "GET", "QUERY_STRING": "api=x", "REMOTE_ADDR": "192.0.2.7"})"));
    for (const char* mode : {"sequential", "parallel"}) {
        Json::Value more(Json::objectValue);
        more["mode"] = mode;
        const Json::Value data = Batch(List(Entry("local", "tell_request")), more)["data"]["result"][0]["data"];
        EXPECT_EQ(data["env"]["REQUEST_METHOD"], "POST");
        EXPECT_FALSE(data["env"].isMember("QUERY_STRING"));
        EXPECT_EQ(data["env"]["REMOTE_ADDR"], "192.0.2.7");
        EXPECT_EQ(data["requestMethod"].asInt(), 2);
    }
    EXPECT_EQ(runner.Request()->GetEnv("REQUEST_METHOD", "").asString(), "GET") << "the batch's own";
    EXPECT_EQ(runner.Request()->GetEnv("QUERY_STRING", "").asString(), "api=x");
}

TEST_F(CompoundTest, AnEntryHasTheBatchsSessionAndAttributes) {
    runner.Request()->InitSession(J(R"({"username": "alice"})"));
    runner.Request()->SetAttr("mark", 5);
    const Json::Value data = Batch(List(Entry("local", "tell_request")))["data"]["result"][0]["data"];
    EXPECT_EQ(data["user"], "alice");
    EXPECT_JSON(data["attr"], R"({"mark": 5})");
}

TEST_F(CompoundTest, EachEntryPassesAdmissionAndGate) {
    unit::Hooks()["gate"] = [this](APIRequest*, APIResponse* response) {
        response->SetSuccess(static_cast<int>(runner.asked.size()));
    };
    runner.needsPermission = true;
    const Json::Value body = Batch(List(Entry("local", "gate"), Entry("local", "gate"), Entry("child", "gate")));
    EXPECT_EQ(Outcomes(body), (Texts{"success", "success", "success"}));
    EXPECT_EQ(runner.asked, (Texts{"NeedPermission", "CheckPermission", "NeedPermission", "CheckPermission"}));
    EXPECT_EQ(body["data"]["result"][2]["data"].asInt(), 6) << "the child asks for itself";
}

TEST_F(CompoundTest, TheGatesRefusalIsTheEntrysAnswer) {
    runner.needsPermission = true;
    runner.permissionError = 105;
    EXPECT_EQ(Outcomes(Batch(List(Entry("local", "succeed"), Entry("child", "succeed")))), (Texts{"105", "105"}));
}

TEST_F(CompoundTest, EntriesRunInTheirOrder) {
    TeachNoting();
    Batch(List(Entry("local", "note", Named("first")), Entry("by_default", "note", Named("second")),
               Entry("local", "note", Named("third"))));
    EXPECT_EQ(platform.CallsOf({"ran", "QLIBCProcForkEx"}), (Texts{"ran(first)", "ran(second)", "ran(third)"}));
}

TEST_F(CompoundTest, TheProcessHasTheBatchsNameAgainAfterwards) {
    Batch(List(Entry("local", "succeed")));
    const Texts names = platform.CallsOf({"prctl"});
    ASSERT_FALSE(names.empty());
    EXPECT_EQ(names.front(), names.back());
}

// ---- nested batches ----

TEST_F(CompoundTest, AnEntryOfTheReservedAPIIsANestedBatch) {
    Json::Value inner = J(R"({"api": "ZOVA.Entry.Request", "version": 1, "method": "request"})");
    inner["compound"] = List(Entry("local", "succeed", J(R"({"data": "in"})")), Entry("local", "fail", Failing(6)));
    const Json::Value body = Batch(List(Entry("local", "succeed"), inner, Entry("local", "succeed")));
    EXPECT_JSON(body, R"({"success": true, "data": {"has_fail": false, "result": [
        {"success": true, "api": "ZOVA.Test.Hook", "version": 1, "method": "local"},
        {"success": true, "api": "ZOVA.Entry.Request", "version": 1, "method": "request",
         "data": {"has_fail": true, "result": [
            {"success": true, "data": "in", "api": "ZOVA.Test.Hook", "version": 1, "method": "local"},
            {"success": false, "error": {"code": 6}, "api": "ZOVA.Test.Hook", "version": 1, "method": "local"}]}},
        {"success": true, "api": "ZOVA.Test.Hook", "version": 1, "method": "local"}]}})");
    EXPECT_EQ(runner.EntryDepth(), 0);
}

TEST_F(CompoundTest, ANestedBatchThatFailsIsAFailedEntry) {
    const Json::Value inner = J(R"({"api": "ZOVA.Entry.Request", "version": 1, "method": "request", "compound": 5})");
    const Json::Value without = J(R"({"api": "ZOVA.Entry.Request", "version": 1, "method": "request"})");
    const Json::Value body = Batch(List(inner, without));
    EXPECT_EQ(Outcomes(body), (Texts{"110", "110"}));
    EXPECT_TRUE(body["data"]["has_fail"].asBool());
    ExpectLog(LOG_ERR, "ParseParams failed", "CompoundHandler.cpp");
}

// ---- what entries say about the whole ----

TEST_F(CompoundTest, TheLastServerErrorWordWins) {
    for (const char* mode : {"sequential", "parallel"}) {
        Json::Value more(Json::objectValue);
        more["mode"] = mode;
        Batch(List(Entry("local", "say_word", J(R"({"word": "first"})")),
                   Entry("child", "say_word", J(R"({"word": "second"})"))),
              more);
        EXPECT_EQ(runner.Response()->GetServerError(), "second") << mode;
    }
}

TEST_F(CompoundTest, WithoutAServerErrorWordTheBatchHasNone) {
    Batch(List(Entry("local", "succeed"), Entry("child", "fail", Failing(5))));
    EXPECT_FALSE(runner.Response()->HasServerError());
    EXPECT_FALSE(runner.Response()->GetHttpdRestart());
}

TEST_F(CompoundTest, AWishForARestartComesFromBothKindsOfEntry) {
    for (const char* method : {"local", "child"}) {
        unit::TestRunner other;
        Json::Value params(Json::objectValue);
        params["compound"] = List(Entry(method, "ask_restart"), Entry("child", "succeed"));
        Call(other, "ZOVA.Entry.Request", 1, "request", params);
        EXPECT_TRUE(other.Response()->GetHttpdRestart()) << method;
    }
}

TEST_F(CompoundTest, InfosDoNotReachTheClient) {
    const Json::Value body = Batch(List(Entry("child", "say_word", J(R"({"word": "secret"})"))));
    EXPECT_EQ(Json::toString(body).find("secret"), std::string::npos);
    EXPECT_EQ(Json::toString(body).find("restart"), std::string::npos);
}

// ---- no memory ----

TEST_F(CompoundTest, WithoutMemoryForTheSubRequestTheBatchAnswers117) {
    platform.Fail("new", ENOMEM, 0, 1);
    EXPECT_JSON(Batch(List(Entry("local", "succeed"))), R"({"success": false, "error": {"code": 117, "errors": ""}})");
    ExpectLog(LOG_ERR, "new APIRequest Fail", "CompoundHandler.cpp");
    ExpectLog(LOG_ERR, "PrepareNewCompReqResp failed", "CompoundHandler.cpp");
}

TEST_F(CompoundTest, WithoutMemoryForTheSubResponseTheBatchAnswers117) {
    platform.Fail("new", ENOMEM, 1, 1);
    EXPECT_JSON(Batch(List(Entry("local", "succeed"))), R"({"success": false, "error": {"code": 117, "errors": ""}})");
    ExpectLog(LOG_ERR, "new APIResponse Fail", "CompoundHandler.cpp");
    ExpectLog(LOG_ERR, "PrepareNewCompReqResp failed", "CompoundHandler.cpp");
}

}  // namespace
