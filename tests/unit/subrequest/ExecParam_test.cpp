// The parameters of an out-of-band call.

#include "webapi/ExecParam.h"

#include <limits>

#include "FrameworkTest.h"
#include "webapi/Json.h"

using unit::J;
using ZOVA::ExecParam;

namespace {

constexpr const char* kEmptyStore = R"({"params": {}, "env": {}, "attr": {}, "runner": {}, "output": {}})";

TEST(ExecParam, ReadsItsDefaults) {
    const ExecParam param;
    EXPECT_EQ(param.GetAPI(), "");
    EXPECT_EQ(param.GetVersion(), 0);
    EXPECT_EQ(param.GetMethod(), "");
    EXPECT_EQ(param.GetRunner(), "");
    EXPECT_EQ(param.GetOutputFd(), -1);
    EXPECT_JSON(param.GetParams(), "{}");
    EXPECT_JSON(param.GetEnv(), "{}");
    EXPECT_JSON(param.GetAttr(), "{}");
    EXPECT_JSON(param.Serialize(), kEmptyStore);
}

TEST(ExecParam, SettersChainAndStoreEachInItsPlace) {
    ExecParam param;
    param.SetParams(J(R"({"a": 1})"))
        .SetAPI("ZOVA.Test.Good")
        .SetVersion(2)
        .SetMethod("echo")
        .SetEnv(J(R"({"LANG": "C"})"))
        .SetRunner("alice")
        .SetAttr(J(R"({"mark": true})"))
        .SetOutputFd(5);
    EXPECT_JSON(param.Serialize(), R"({"params": {"a": 1, "api": "ZOVA.Test.Good", "version": 2, "method": "echo"},
        "env": {"LANG": "C"}, "attr": {"mark": true}, "runner": {"username": "alice"}, "output": {"fd": 5}})");
    EXPECT_EQ(param.GetAPI(), "ZOVA.Test.Good");
    EXPECT_EQ(param.GetVersion(), 2);
    EXPECT_EQ(param.GetMethod(), "echo");
    EXPECT_EQ(param.GetRunner(), "alice");
    EXPECT_EQ(param.GetOutputFd(), 5);
    EXPECT_JSON(param.GetEnv(), R"({"LANG": "C"})");
    EXPECT_JSON(param.GetAttr(), R"({"mark": true})");
}

TEST(ExecParam, ObjectsAreCopiedOverWhatIsThere) {
    ExecParam param;
    param.SetParams(J(R"({"a": 1, "b": 1})")).SetParams(J(R"({"b": 2, "c": null})"));
    EXPECT_JSON(param.GetParams(), R"({"a": 1, "b": 2, "c": null})");
    param.SetEnv(J(R"({"A": "1"})")).SetEnv(J(R"({"B": 2})"));
    EXPECT_JSON(param.GetEnv(), R"({"A": "1", "B": 2})");
    param.SetAttr(J(R"({"x": 1})")).SetAttr(J("{}"));
    EXPECT_JSON(param.GetAttr(), R"({"x": 1})");
}

TEST(ExecParam, AnythingButAnObjectIsIgnored) {
    for (const char* text : {"null", "5", "\"text\"", "[1]", "true"}) {
        ExecParam param;
        param.SetParams(J(text)).SetEnv(J(text)).SetAttr(J(text));
        EXPECT_JSON(param.Serialize(), kEmptyStore);
    }
}

TEST(ExecParam, TheLaterOfParamsAndNameWins) {
    ExecParam param;
    const Json::Value params = J(R"({"api": "x", "version": 9, "method": "y"})");
    param.SetParams(params).SetAPI("ZOVA.Test.Good").SetVersion(1).SetMethod("echo");
    EXPECT_JSON(param.GetParams(), R"({"api": "ZOVA.Test.Good", "version": 1, "method": "echo"})");
    param.SetParams(params);
    EXPECT_EQ(param.GetAPI() + param.GetMethod(), "xy");
    EXPECT_EQ(param.GetVersion(), 9);
}

TEST(ExecParam, NumbersHoldTheirWholeRange) {
    for (int number : {0, -1, std::numeric_limits<int>::max(), std::numeric_limits<int>::min()}) {
        ExecParam param;
        EXPECT_EQ(param.SetVersion(number).SetOutputFd(number).GetVersion(), number);
        EXPECT_EQ(param.GetOutputFd(), number);
    }
}

TEST(ExecParam, ACopyIsItsOwn) {
    ExecParam param;
    param.SetAPI("first");
    ExecParam copy(param);
    ExecParam assigned;
    assigned = param;
    param.SetAPI("second");
    EXPECT_EQ(copy.GetAPI(), "first");
    EXPECT_EQ(assigned.GetAPI(), "first");
    const ExecParam& same = assigned;
    assigned = same;
    EXPECT_EQ(assigned.GetAPI(), "first");
}

TEST(ExecParam, TakesASerialisedStoreOver) {
    ExecParam param;
    param.SetAPI("ZOVA.Test.Good").SetRunner("alice").SetOutputFd(3);
    Json::Value store = param.Serialize();
    const ExecParam taken(store);
    EXPECT_EQ(taken.Serialize(), param.Serialize());
    EXPECT_JSON(store, kEmptyStore);
}

TEST(ExecParam, AddsTheSectionsThatAStoreLacks) {
    for (const char* text : {"null", "{}", "5", "[]", "\"text\""}) {
        Json::Value store = J(text);
        ExecParam param(store);
        EXPECT_JSON(param.Serialize(), kEmptyStore);
        EXPECT_EQ(param.SetAPI("works").GetAPI(), "works") << text;
    }
    Json::Value store = J(R"({"runner": {"username": "alice"}, "other": 1})");
    const ExecParam param(store);
    EXPECT_EQ(param.GetRunner(), "alice");
    EXPECT_JSON(param.GetParams(), "{}");
}

TEST(ExecParam, SectionsAndValuesOfOtherTypesReadAsDefaults) {
    Json::Value store = J(R"({"params": 5, "env": "x", "attr": [], "runner": null, "output": true})");
    ExecParam param(store);
    EXPECT_EQ(param.GetAPI(), "");
    EXPECT_EQ(param.GetVersion(), 0);
    EXPECT_EQ(param.GetOutputFd(), -1);
    EXPECT_JSON(param.GetParams(), "{}");
    EXPECT_JSON(param.GetEnv(), "{}");
    EXPECT_EQ(param.SetAPI("refused").GetAPI(), "");
    Json::Value values = J(R"({"params": {"api": [], "version": "x", "method": {}}, "runner": {"username": null}})");
    param.Deserialize(values);
    EXPECT_EQ(param.GetAPI() + param.GetMethod() + param.GetRunner(), "");
    EXPECT_EQ(param.GetVersion(), 0);
}

TEST(ExecParam, DeserializeSwaps) {
    ExecParam param;
    param.SetAPI("old");
    Json::Value store = J(R"({"params": {"api": "new"}})");
    param.Deserialize(store);
    EXPECT_EQ(param.GetAPI(), "new");
    EXPECT_EQ(store["params"]["api"], "old");
}

}  // namespace
