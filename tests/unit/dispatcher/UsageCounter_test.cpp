#include "dispatcher/UsageCounter.h"

#include <sys/stat.h>

#include "ChildRun.h"
#include "DeviceTest.h"
#include "webapi/Json.h"

using unit::J;
using unit::TestRunner;

namespace {

class UsageCounterTest : public unit::DeviceTest {
protected:
    UsageCounterTest() { platform.clock = 1700000000; }

    bool Count(const std::string& api = "ZOVA.A", const std::string& method = "get", int version = 1) {
        return ZOVA::CountUsage(counters.Path(), api, method, version);
    }

    Json::Value Counters(const std::string& file) const {
        Json::Value value;
        Json::fromString(value, counters.Read(file).value_or(""));
        return value;
    }

    /** The one-time flags are a process's own: each test counts in a child. */
    static Json::Value InChild(const std::function<Json::Value()>& body) {
        const unit::ChildResult result = unit::RunInChild("", body);
        EXPECT_TRUE(result.orderly) << result.end;
        return result.report;
    }

    unit::TemporaryDirectory counters;
};

TEST_F(UsageCounterTest, TheFirstCallIsCountedAsOneWithItsTimeAndALaterOneAddsUp) {
    InChild([&] {
        Count();
        platform.clock += 60;
        return Json::Value(Count());
    });
    EXPECT_JSON(Counters("ZOVA.A.json"), R"({"ZOVA.A_1_get": {"count": 2, "ctime": 1700000000}})");
}

TEST_F(UsageCounterTest, TwoVersionsOfAMethodHaveSeparateKeysInOneFile) {
    InChild([&] { return Json::Value(Count("ZOVA.A", "get", 1) && Count("ZOVA.A", "get", 2)); });
    EXPECT_EQ(Counters("ZOVA.A.json").getMemberNames(), (std::vector<std::string>{"ZOVA.A_1_get", "ZOVA.A_2_get"}));
}

TEST_F(UsageCounterTest, TheGroupIsTheNameUpToItsFourthDot) {
    InChild([&] {
        return Json::Value(Count("ZOVA.A.B.C.D.E") && Count("ZOVA.A.B.C.X") && Count("ZOVA.A.B.C") && Count("ZOVA") &&
                           Count("ZOVA.A"));
    });
    EXPECT_EQ(counters.List(), (std::vector<std::string>{"ZOVA.A.B.C.json", "ZOVA.A.json", "ZOVA.json"}));
    EXPECT_EQ(Counters("ZOVA.A.B.C.json").getMemberNames(),
              (std::vector<std::string>{"ZOVA.A.B.C.D.E_1_get", "ZOVA.A.B.C.X_1_get", "ZOVA.A.B.C_1_get"}));
}

TEST_F(UsageCounterTest, DirectoryAndTimeStampAreMadeOncePerProcess) {
    const Json::Value calls = InChild([&] {
        Count();
        Count();
        return unit::CallsToJson();
    });
    int made = 0;
    int touched = 0;
    for (const Json::Value& call : calls) {
        made += call == "ZOVAFSMkdirP(" + counters.Path() + ", 0, 0, -1, -1, 384)" ? 1 : 0;
        touched += call == "QLIBCFileTouch(" + counters.Path() + "/.timestamp)" ? 1 : 0;
    }
    EXPECT_EQ(made, 1);
    EXPECT_EQ(touched, 1);
}

TEST_F(UsageCounterTest, ADirectoryThatCannotBeMadeIsTriedAgainAtTheNextCall) {
    const Json::Value report = InChild([&] {
        platform.Fail("ZOVAFSMkdirP", EACCES, 0, 1);
        Json::Value counted(Json::arrayValue);
        counted.append(Count());
        counted.append(Count());
        return counted;
    });
    EXPECT_JSON(report, "[false, true]");
    EXPECT_EQ(Counters("ZOVA.A.json")["ZOVA.A_1_get"]["count"].asInt(), 1);
}

TEST_F(UsageCounterTest, CountsUnderALockFileAndGivesItBack) {
    const Json::Value report = InChild([&] {
        Count();
        Json::Value calls(Json::arrayValue);
        for (const std::string& call :
             platform.CallsOf({"QLIBCFileLockTimeByFile", "rename", "QLIBCFileUnlockByFile"})) {
            calls.append(call.substr(0, call.find('(')));
        }
        calls.append(platform.CallsOf({"QLIBCFileLockTimeByFile"})[0]);
        return calls;
    });
    EXPECT_EQ(report[0].asString(), "QLIBCFileLockTimeByFile");
    EXPECT_EQ(report[1].asString(), "rename");
    EXPECT_EQ(report[2].asString(), "QLIBCFileUnlockByFile");
    EXPECT_EQ(report[3].asString(), "QLIBCFileLockTimeByFile(" + counters.Path() + "/ZOVA.A.json.lock, 1, 2, -1)");
}

TEST_F(UsageCounterTest, ACallThatFindsTheLockTakenIsNotCounted) {
    platform.lockedFiles.insert(counters.Path() + "/ZOVA.A.json.lock");
    EXPECT_JSON(InChild([&] { return Json::Value(Count()); }), "false");
    EXPECT_FALSE(counters.Read("ZOVA.A.json").has_value());
}

struct CounterFileCase {
    const char* name;
    const char* content;
    const char* counted;
};

class CounterFile : public UsageCounterTest, public ::testing::WithParamInterface<CounterFileCase> {};

TEST_P(CounterFile, IsTakenAsItIsOrStartedAnew) {
    counters.Write("ZOVA.A.json", GetParam().content);
    EXPECT_JSON(InChild([&] { return Json::Value(Count()); }), "true");
    EXPECT_JSON(Counters("ZOVA.A.json"), GetParam().counted);
}

constexpr const char* kAnew = R"({"ZOVA.A_1_get": {"count": 1, "ctime": 1700000000}})";

INSTANTIATE_TEST_SUITE_P(
    Rows, CounterFile,
    ::testing::Values(CounterFileCase{"Corrupt", "{\"ZOVA.A_1_get\"", kAnew}, CounterFileCase{"Empty", "", kAnew},
                      CounterFileCase{"Array", "[1]", kAnew}, CounterFileCase{"Null", "null", kAnew},
                      CounterFileCase{"EntryIsANumber", R"({"ZOVA.A_1_get": 7})", kAnew},
                      CounterFileCase{"EntryIsNull", R"({"ZOVA.A_1_get": null})", kAnew},
                      CounterFileCase{"EntryIsAnArray", R"({"ZOVA.A_1_get": [7]})", kAnew},
                      CounterFileCase{"CountIsAText", R"({"ZOVA.A_1_get": {"count": "x", "ctime": 5}})",
                                      R"({"ZOVA.A_1_get": {"count": 1, "ctime": 5}})"},
                      CounterFileCase{"CountBeyond32Bits", R"({"ZOVA.A_1_get": {"count": 4294967296, "ctime": 5}})",
                                      R"({"ZOVA.A_1_get": {"count": 4294967297, "ctime": 5}})"},
                      CounterFileCase{"CountAtItsLargest",
                                      R"({"ZOVA.A_1_get": {"count": 9223372036854775806, "ctime": 5}})",
                                      R"({"ZOVA.A_1_get": {"count": 9223372036854775807, "ctime": 5}})"},
                      CounterFileCase{"OtherKeysStay", R"({"ZOVA.B_1_get": {"count": 3, "ctime": 5}})",
                                      R"({"ZOVA.A_1_get": {"count": 1, "ctime": 1700000000},
                                          "ZOVA.B_1_get": {"count": 3, "ctime": 5}})"}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(UsageCounterTest, ACountThatCannotGrowDoesNotOverflow) {
    counters.Write("ZOVA.A.json", R"({"ZOVA.A_1_get": {"count": 9223372036854775807, "ctime": 5}})");
    EXPECT_JSON(InChild([&] { return Json::Value(Count()); }), "true");
    EXPECT_TRUE(Counters("ZOVA.A.json")["ZOVA.A_1_get"]["count"].isIntegral());
}

TEST_F(UsageCounterTest, AFailedWriteLeavesTheFileAsItWasAndGivesTheLockBack) {
    const std::string content = R"({"ZOVA.A_1_get":{"count":1,"ctime":5}})";
    for (const char* call : {"open", "fchmod", "write", "rename"}) {
        counters.Write("ZOVA.A.json", content);
        const Json::Value report = InChild([&] {
            // The first file that is opened is the one that is read.
            platform.Fail(call, ENOSPC, std::string(call) == "open" ? 1 : 0);
            const bool counted = Count();
            return Json::Value(!counted && platform.CountOf("QLIBCFileUnlockByFile") == 1);
        });
        EXPECT_JSON(report, "true") << call;
        EXPECT_EQ(counters.Read("ZOVA.A.json"), content) << call;
        EXPECT_EQ(counters.List().size(), 1U) << call;
    }
}

// ---- IncreaseCounter ----

TEST_F(UsageCounterTest, CountsOnlyWhereTheDeviceCollectsAndAsksOncePerProcess) {
    for (const char* setting : {"yes", "no", "YES", ""}) {
        platform.keyValueFiles["/etc/zovainfo.conf"]["enable_data_collect"] = setting;
        platform.redirects["/var/spool/webapi"] = counters.Path();
        const Json::Value report = InChild([&] {
            TestRunner runner;
            Name(runner, "ZOVA.A.B", 2, "get");
            runner.IncreaseCounter(runner.Request());
            runner.IncreaseCounter(runner.Request());
            Json::Value counts(Json::arrayValue);
            for (const char* call :
                 {"QLIBCFileCheckKeyValue", "ZOVAFSMkdirP", "QLIBCFileTouch", "QLIBCFileLockTimeByFile"}) {
                counts.append(platform.CountOf(call));
            }
            counts.append(platform.CallsOf({"QLIBCFileCheckKeyValue"})[0]);
            return counts;
        });
        const bool collects = std::string(setting) == "yes";
        EXPECT_JSON(report, std::string(collects ? "[1,1,1,2," : "[1,0,0,0,") +
                                R"j("QLIBCFileCheckKeyValue(/etc/zovainfo.conf, enable_data_collect, yes, 0)"])j")
            << setting;
    }
    EXPECT_EQ(Counters("ZOVA.A.B.json")["ZOVA.A.B_2_get"]["count"].asInt(), 2);
}

}  // namespace
