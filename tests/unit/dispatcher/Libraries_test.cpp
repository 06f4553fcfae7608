#include "DeviceTest.h"
#include "webapi/APITable.h"
#include "webapi/Json.h"

using unit::TestRunner;

namespace {

class LibrariesTest : public unit::DeviceTest {
protected:
    static void Describe(TestRunner& runner, const std::string& library) {
        Json::Value info(Json::objectValue);
        info["lib"] = library;
        runner.Request()->InitAPIInfo(info);
    }

    ZOVA::_tag_API_TABLE* table = nullptr;
    ZOVA::_tag_API_CHECK_TABLE* checkTable = nullptr;
};

TEST_F(LibrariesTest, ASecondCallToTheSameLibraryOpensNothing) {
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_TRUE(CallGood(runner, "echo"));
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Other", 1, "success"));
    EXPECT_EQ(platform.CountOf("dlopen"), 1);
    EXPECT_EQ(runner.OpenLibraryCount(), 1U);
    // The table is asked for anew at each call.
    EXPECT_EQ(platform.CallsOf({"mark"}).size(), 6U);
}

TEST_F(LibrariesTest, ARequestWithoutDescriptionHasAnEmptyLibraryPathAndAnswers111) {
    TestRunner runner;
    Name(runner, "ZOVA.Test.Good", 1, "success");
    EXPECT_FALSE(runner.ProcessLib(runner.Request(), runner.Response()));
    ExpectLog(LOG_ERR, "library path empty", "Libraries.cpp");
    EXPECT_EQ(runner.Response()->GetError(), 111);
}

TEST_F(LibrariesTest, ALibraryWithoutCheckTableRunsNormallyAndLogsNothing) {
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    for (const fake::LogLine& line : platform.process.log) {
        EXPECT_EQ(line.facility, LOG_AUTH) << line.whole;
    }
}

TEST_F(LibrariesTest, ALibraryWhoseCheckTableIsNullLogsItAndRunsWithoutChecks) {
    TestRunner runner;
    EXPECT_TRUE(Call(runner, "ZOVA.Test.NullCheck", 1, "success"));
    ExpectLog(LOG_ERR, "cannot get api check table", "Libraries.cpp");
    EXPECT_EQ(runner.Response()->GetError(), 0);
}

TEST_F(LibrariesTest, ALibraryWithoutTableAnswers111) {
    TestRunner runner;
    EXPECT_FALSE(Call(runner, "ZOVA.Test.NoTable", 1, "get"));
    ExpectLog(LOG_ERR, "Get API Table Fail", "Libraries.cpp");
    EXPECT_EQ(runner.Response()->GetError(), 111);
    bool debugLine = false;
    for (const fake::LogLine& line : platform.process.log) {
        debugLine = debugLine || (line.priority == LOG_DEBUG && line.text.find("cannot load table: ") == 0);
    }
    EXPECT_TRUE(debugLine);
}

TEST_F(LibrariesTest, ALibraryWhoseTableIsNullAnswers111) {
    TestRunner runner;
    EXPECT_FALSE(Call(runner, "ZOVA.Test.NullTable", 1, "get"));
    ExpectLog(LOG_ERR, "cannot get api table", "Libraries.cpp");
    ExpectLog(LOG_ERR, "Get API Table Fail", "Libraries.cpp");
    EXPECT_EQ(runner.Response()->GetError(), 111);
}

TEST_F(LibrariesTest, ALibraryThatCannotBeOpenedAnswers111AndIsTriedAgainAtTheNextCall) {
    TestRunner runner;
    for (int i = 0; i < 2; ++i) {
        EXPECT_FALSE(Call(runner, "ZOVA.Test.Missing", 1, "get"));
        const std::string path = unit::LibraryPath("there_is_none");
        ExpectLog(LOG_ERR,
                  "cannot open library: " + path + ". error = " + path +
                      ": cannot open shared object file: No such file or directory",
                  "Libraries.cpp");
        EXPECT_EQ(runner.Response()->GetError(), 111);
        EXPECT_EQ(Json::toString(runner.Response()->GetBody()), R"({"error":{"code":111},"success":false})");
    }
    EXPECT_EQ(platform.CountOf("dlopen"), 2);
}

TEST_F(LibrariesTest, OfTwoRowsWithTheSameKeyTheFirstServes) {
    TestRunner runner;
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Twice", 1, "get"));
    EXPECT_EQ(runner.Response()->GetBody()["data"].asString(), "first");
}

TEST_F(LibrariesTest, ATableHoldsRowsOfSeveralAPIsAndVersions) {
    TestRunner runner;
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Twice", 2, "get"));
    EXPECT_EQ(runner.Response()->GetBody()["data"].asString(), "version 2");
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Twin", 1, "get"));
    EXPECT_EQ(runner.Response()->GetBody()["data"].asString(), "other");
}

TEST_F(LibrariesTest, OpenLibRefusesANullRequestAndANullTable) {
    TestRunner runner;
    EXPECT_FALSE(runner.OpenLib(nullptr, &table, &checkTable));
    ExpectLog(LOG_ERR, "Bad parameters", "Libraries.cpp");
    EXPECT_FALSE(runner.OpenLib(runner.Request(), nullptr, &checkTable));
    ExpectLog(LOG_ERR, "Bad parameters", "Libraries.cpp");
}

TEST_F(LibrariesTest, OpenLibTakesNoCheckTable) {
    TestRunner runner;
    Describe(runner, unit::LibraryPath("checked"));
    EXPECT_TRUE(runner.OpenLib(runner.Request(), &table, nullptr));
    EXPECT_NE(table, nullptr);
}

TEST_F(LibrariesTest, OpenLibLeavesTheCheckTableAloneWhereTheLibraryHasNone) {
    TestRunner runner;
    Describe(runner, unit::LibraryPath("good"));
    EXPECT_TRUE(runner.OpenLib(runner.Request(), &table, &checkTable));
    EXPECT_EQ(checkTable, nullptr);
}

TEST_F(LibrariesTest, TableFunctionsRefuseNullArguments) {
    TestRunner runner;
    EXPECT_FALSE(runner.GetTableFunc(nullptr, &table));
    EXPECT_FALSE(runner.GetTableFunc(&runner, nullptr));
    EXPECT_FALSE(runner.GetCheckTableFunc(nullptr, &checkTable));
    EXPECT_FALSE(runner.GetCheckTableFunc(&runner, nullptr));
}

TEST_F(LibrariesTest, AMethodSymbolThatCannotBeLookedUpAnswers111) {
    platform.Fail("dlsym", ENOENT, 1);
    TestRunner runner;
    EXPECT_FALSE(CallGood(runner, "success"));
    ExpectLog(LOG_ERR, "Get API Table Fail", "Libraries.cpp");
    EXPECT_EQ(runner.Response()->GetError(), 111);
}

TEST_F(LibrariesTest, TheRunnerClosesEveryLibraryOnce) {
    {
        TestRunner runner;
        EXPECT_TRUE(CallGood(runner, "success"));
        EXPECT_TRUE(Call(runner, "ZOVA.Test.Twice", 1, "get"));
        EXPECT_EQ(runner.OpenLibraryCount(), 2U);
        runner.CloseLib();
        EXPECT_EQ(runner.OpenLibraryCount(), 0U);
        EXPECT_EQ(platform.CountOf("dlclose"), 2);
        EXPECT_TRUE(CallGood(runner, "success"));
    }
    EXPECT_EQ(platform.CountOf("dlclose"), 3);
}

}  // namespace
