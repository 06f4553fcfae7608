#include <cerrno>

#include "DeviceTest.h"
#include "webapi/Json.h"

using unit::J;
using unit::TestRunner;

namespace {

class DescriptionsTest : public unit::DeviceTest {
protected:
    static Json::Value Minimal() { return J(R"({"lib": "x.so", "minVersion": 1, "maxVersion": 2, "methods": {}})"); }

    void Describe(const std::string& file, const std::string& api, const std::string& library) {
        Json::Value content(Json::objectValue);
        content[api] = Minimal();
        content[api]["lib"] = library;
        platform.files[file] = Json::toString(content);
    }
};

// ---- CheckLibDescription ----

struct DescriptionCase {
    const char* name;
    const char* text;
    bool good;
};

class LibDescription : public DescriptionsTest, public ::testing::WithParamInterface<DescriptionCase> {};

TEST_P(LibDescription, IsChecked) {
    Json::Value description = J(GetParam().text);
    EXPECT_EQ(TestRunner().CheckLibDescription(description), GetParam().good);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, LibDescription,
    ::testing::Values(
        DescriptionCase{"Minimal", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":{}})", true},
        DescriptionCase{"MinimumAboveMaximum", R"({"lib":"x","minVersion":3,"maxVersion":2,"methods":{}})", true},
        DescriptionCase{"Priority10", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":{},"priority":10})", true},
        DescriptionCase{"PriorityMinus10", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":{},"priority":-10})",
                        true},
        DescriptionCase{"Priority11", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":{},"priority":11})", false},
        DescriptionCase{"PriorityMinus11", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":{},"priority":-11})",
                        false},
        DescriptionCase{"PriorityReal", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":{},"priority":1.5})",
                        false},
        DescriptionCase{"PriorityText", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":{},"priority":"1"})",
                        false},
        DescriptionCase{"PriorityNull", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":{},"priority":null})",
                        false},
        DescriptionCase{"LibEmpty", R"({"lib":"","minVersion":1,"maxVersion":2,"methods":{}})", false},
        DescriptionCase{"LibMissing", R"({"minVersion":1,"maxVersion":2,"methods":{}})", false},
        DescriptionCase{"LibNumber", R"({"lib":5,"minVersion":1,"maxVersion":2,"methods":{}})", false},
        DescriptionCase{"LibNull", R"({"lib":null,"minVersion":1,"maxVersion":2,"methods":{}})", false},
        DescriptionCase{"MinVersionText", R"({"lib":"x","minVersion":"1","maxVersion":2,"methods":{}})", false},
        DescriptionCase{"MinVersionMissing", R"({"lib":"x","maxVersion":2,"methods":{}})", false},
        DescriptionCase{"MaxVersionReal", R"({"lib":"x","minVersion":1,"maxVersion":2.5,"methods":{}})", false},
        DescriptionCase{"MaxVersionMissing", R"({"lib":"x","minVersion":1,"methods":{}})", false},
        DescriptionCase{"MethodsMissing", R"({"lib":"x","minVersion":1,"maxVersion":2})", false},
        DescriptionCase{"MethodsArray", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":[]})", false},
        DescriptionCase{"MethodsNull", R"({"lib":"x","minVersion":1,"maxVersion":2,"methods":null})", false},
        DescriptionCase{"Null", "null", false}, DescriptionCase{"Array", "[]", false},
        DescriptionCase{"Text", "\"x\"", false}, DescriptionCase{"Number", "7", false}),
    [](const auto& row) { return std::string(row.param.name); });

// ---- ApplyLibDef ----

TEST_F(DescriptionsTest, DefaultsCompleteADescription) {
    platform.files["/usr/zova/zovaman/webapi/lib.def"] =
        R"({"authLevel": 1, "allowUser": ["admin.local", "normal.local"], "priority": 4})";
    TestRunner runner;
    Json::Value description = Minimal();
    EXPECT_EQ(&runner.ApplyLibDef(description), &description);
    EXPECT_EQ(description["authLevel"].asInt(), 1);
    EXPECT_JSON(description["allowUser"], R"(["admin.local", "normal.local"])");
    EXPECT_EQ(description["requestFormat"].asString(), "JSON");
    EXPECT_EQ(description["priority"].asInt(), 4);
    EXPECT_FALSE(description.isMember("appPriv"));
}

TEST_F(DescriptionsTest, DefaultsReplaceNothingThatIsThere) {
    TestRunner runner;
    Json::Value description = Minimal();
    description["authLevel"] = 2;
    description["allowUser"] = Json::Value();
    description["requestFormat"] = "XML";
    description["priority"] = -3;
    const Json::Value before = description;
    EXPECT_EQ(runner.ApplyLibDef(description), before);
}

TEST_F(DescriptionsTest, UnreadableDefaultsLeaveNullsBehind) {
    platform.files.erase("/usr/zova/zovaman/webapi/lib.def");
    TestRunner runner;
    EXPECT_JSON(runner.Defaults(), "{}");
    Json::Value description = Minimal();
    runner.ApplyLibDef(description);
    for (const char* key : {"authLevel", "allowUser", "priority"}) {
        EXPECT_TRUE(description.isMember(key) && description[key].isNull()) << key;
    }
}

// ---- the search ----

TEST_F(DescriptionsTest, AtMostFourPrefixesAreTried) {
    TestRunner runner;
    Json::Value out(Json::objectValue);
    EXPECT_FALSE(runner.InitLibDesc(out, "ZOVA.A.B.C.D.E"));
    ExpectLog(LOG_ERR, "WebAPI ZOVA.A.B.C.D.E is not valid", "Descriptions.cpp");
    EXPECT_EQ(platform.CallsOf({"QLIBCFileExist"}),
              (std::vector<std::string>{"QLIBCFileExist(ZOVA.A.lib)", "QLIBCFileExist(ZOVA.A.B.lib)",
                                        "QLIBCFileExist(ZOVA.A.B.C.lib)", "QLIBCFileExist(ZOVA.A.B.C.D.lib)"}));
}

TEST_F(DescriptionsTest, AShortNameTriesItsPrefixesOfTwoComponentsOrMore) {
    TestRunner runner;
    Json::Value out(Json::objectValue);
    EXPECT_FALSE(runner.InitLibDesc(out, "ZOVA.A.B"));
    ExpectLog(LOG_ERR, "WebAPI ZOVA.A.B is not valid");
    EXPECT_FALSE(runner.InitLibDesc(out, "ZOVA"));
    ExpectLog(LOG_ERR, "WebAPI ZOVA is not valid");
    EXPECT_FALSE(runner.InitLibDesc(out, "ZOVA.A"));
    ExpectLog(LOG_ERR, "WebAPI ZOVA.A is not valid");
    EXPECT_EQ(platform.CallsOf({"QLIBCFileExist"}),
              (std::vector<std::string>{"QLIBCFileExist(ZOVA.A.lib)", "QLIBCFileExist(ZOVA.A.B.lib)",
                                        "QLIBCFileExist(ZOVA.lib)", "QLIBCFileExist(ZOVA.A.lib)"}));
}

TEST_F(DescriptionsTest, TheLongestExistingPrefixWinsEvenWhereOnlyAShorterOneDescribesTheAPI) {
    Describe("ZOVA.A.lib", "ZOVA.A.B.C", "short.so");
    Describe("ZOVA.A.B.lib", "ZOVA.A.B.D", "long.so");
    TestRunner runner;
    EXPECT_FALSE(Call(runner, "ZOVA.A.B.C", 1, "get"));
    EXPECT_EQ(runner.Response()->GetError(), 102);
    EXPECT_EQ(platform.CallsOf({"ReadJsonFile"}).back(), "ReadJsonFile(ZOVA.A.B.lib)");
}

TEST_F(DescriptionsTest, TheSearchDoesNotColourLaterLogLines) {
    TestRunner runner;
    Json::Value out(Json::objectValue);
    EXPECT_FALSE(runner.InitLibDesc(out, "ZOVA.None"));
    ExpectLog(LOG_ERR, "WebAPI ZOVA.None is not valid");
    EXPECT_EQ(platform.process.log.back().error, 0);
    platform.files["ZOVA.Found.lib"] = "{}";
    errno = EDOM;
    EXPECT_TRUE(runner.InitLibDesc(out, "ZOVA.Found"));
    EXPECT_EQ(errno, 0);
}

TEST_F(DescriptionsTest, AnAPIInTheCacheTriggersNoFileAccess) {
    TestRunner runner;
    Json::Value out(Json::objectValue);
    EXPECT_TRUE(runner.InitLibDesc(out, "ZOVA.Test.Good"));
    const std::size_t calls = platform.calls.size();
    EXPECT_TRUE(runner.InitLibDesc(out, "ZOVA.Test.Good"));
    EXPECT_TRUE(runner.InitLibDesc(out, "ZOVA.Test.Twice")) << "another member of the same file";
    EXPECT_EQ(platform.calls.size(), calls);
}

TEST_F(DescriptionsTest, AnEmptyNameAndANullRequestFailWithoutALine) {
    TestRunner runner;
    Json::Value out(Json::objectValue);
    EXPECT_FALSE(runner.InitLibDesc(out, ""));
    EXPECT_FALSE(runner.InitLibDesc(out, static_cast<ZOVA::APIRequest*>(nullptr)));
    EXPECT_FALSE(runner.InitLibDesc(out, runner.Request()));
}

TEST_F(DescriptionsTest, AFileThatDoesNotDescribeTheAPIStillLoads) {
    TestRunner runner;
    Json::Value out(Json::objectValue);
    EXPECT_TRUE(runner.InitLibDesc(out, "ZOVA.Test.Unknown"));
    EXPECT_FALSE(out.isMember("ZOVA.Test.Unknown"));
    EXPECT_TRUE(out.isMember("ZOVA.Test.Good"));
}

TEST_F(DescriptionsTest, AnUnparsableFileIsLogged) {
    for (const char* content : {"", "{", "not json"}) {
        platform.files["ZOVA.Broken.lib"] = content;
        TestRunner runner;
        EXPECT_FALSE(Call(runner, "ZOVA.Broken", 1, "get"));
        ExpectLog(LOG_ERR, "WebAPI description file ZOVA.Broken.lib is not valid", "Descriptions.cpp");
        EXPECT_EQ(runner.Response()->GetError(), 102);
    }
}

TEST_F(DescriptionsTest, AFileThatIsNoObjectDescribesNothing) {
    for (const char* content : {"[]", "null", "5", "\"x\"", "[{}]"}) {
        platform.files["ZOVA.Odd.lib"] = content;
        TestRunner runner;
        EXPECT_NO_THROW(EXPECT_FALSE(Call(runner, "ZOVA.Odd", 1, "get"))) << content;
        EXPECT_EQ(runner.Response()->GetError(), 102) << content;
    }
}

TEST_F(DescriptionsTest, AnInvalidMemberIsLoggedAndTheOthersLoad) {
    descriptions["ZOVA.Test.Bad"] = J(R"({"lib": ""})");
    descriptions["ZOVA.Test.NoMethods"] = J(R"({"lib": "x", "minVersion": 1, "maxVersion": 1})");
    descriptions["ZOVA.Test.Forged\nline"] = J("7");
    Install();
    TestRunner runner;
    EXPECT_FALSE(Call(runner, "ZOVA.Test.Bad", 1, "get"));
    ExpectLog(LOG_ERR, "WebAPI description ZOVA.Test.Bad is not valid.", "Descriptions.cpp");
    ExpectLog(LOG_ERR, "WebAPI description ZOVA.Test.Forged?line is not valid.", "Descriptions.cpp");
    ExpectLog(LOG_ERR, "WebAPI description ZOVA.Test.NoMethods is not valid.", "Descriptions.cpp");
    EXPECT_EQ(runner.Response()->GetError(), 102);
    EXPECT_TRUE(CallGood(runner, "success"));
}

// ---- all files ----

TEST_F(DescriptionsTest, AllFilesLoadInSortedOrderAndTheLastOneOfAnAPIWins) {
    platform.files.erase("ZOVA.Test.lib");
    Describe("a.lib", "ZOVA.X", "first.so");
    Describe("b.lib", "ZOVA.X", "last.so");
    platform.files["c.lib"] = "{";
    Describe("d.txt", "ZOVA.X", "no description file.so");
    Describe("e.lib", "ZOVA.Y", "other.so");
    TestRunner runner;
    Json::Value out(Json::objectValue);
    EXPECT_TRUE(runner.InitLibDesc(out));
    EXPECT_EQ(out.size(), 2U);
    EXPECT_EQ(out["ZOVA.X"]["lib"].asString(), "last.so");
    EXPECT_EQ(out["ZOVA.X"]["requestFormat"].asString(), "JSON");
    EXPECT_EQ(platform.CallsOf({"glob"}), (std::vector<std::string>{"glob(*.lib)"}));
}

TEST_F(DescriptionsTest, NoFileAtAllOrAFailedListingIsFalse) {
    TestRunner runner;
    Json::Value out(Json::objectValue);
    platform.Fail("glob", EACCES);
    EXPECT_FALSE(runner.InitLibDesc(out));
    platform.StopFailing();
    platform.files.clear();
    EXPECT_FALSE(runner.InitLibDesc(out));
    EXPECT_JSON(out, "{}");
}

TEST_F(DescriptionsTest, ACallTouchesOnlyTheFileOfItsAPI) {
    for (int i = 0; i < 5000; ++i) {
        Describe("ZOVA.Package" + std::to_string(i) + ".lib", "ZOVA.Package" + std::to_string(i), "x.so");
    }
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(platform.CountOf("QLIBCFileExist"), 2);
    EXPECT_EQ(platform.CountOf("ReadJsonFile"), 2);
    EXPECT_EQ(platform.CountOf("glob"), 0);
}

TEST_F(DescriptionsTest, ADescriptionUnderANameThatIsNoneIsNotFoundInAFileThatIsAlreadyRead) {
    descriptions["ZOVA.Test.Good/../x"] = Good();
    Install();
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_FALSE(Call(runner, "ZOVA.Test.Good/../x", 1, "success"));
    EXPECT_EQ(runner.Response()->GetError(), 102);
    ExpectLog(LOG_ERR, "WebAPI ZOVA.Test.Good/../x is not valid");
}

// ---- GetMethod and GetMethodAttr ----

class MethodAttributes : public DescriptionsTest {
protected:
    MethodAttributes() {
        platform.files["/usr/zova/zovaman/webapi/lib.def"] =
            R"({"methods": {"allowDemo": true, "allowUpload": false}})";
        Good()["methods"]["1"] = J(R"(["plain", {"empty": {}}, {"own": {"allowUpload": true}},
            {"first": {"allowUpload": true}, "second": {"allowUpload": true}}, 7, null, [], {}, {"own": {}},
            {"odd": "text"}, {"nothing": null}])");
        Install();
    }

    static bool Attr(TestRunner& runner, const std::string& method, const std::string& attr, int version = 1) {
        return runner.GetMethodAttr("ZOVA.Test.Good", version, method, attr);
    }
};

TEST_F(MethodAttributes, AMethodGivenAsATextTakesTheDefaults) {
    TestRunner runner;
    EXPECT_TRUE(Attr(runner, "plain", "allowDemo"));
    EXPECT_FALSE(Attr(runner, "plain", "allowUpload"));
}

TEST_F(MethodAttributes, AnEmptyAttributeObjectIsFalseForEveryAttribute) {
    TestRunner runner;
    EXPECT_FALSE(Attr(runner, "empty", "allowDemo"));
    EXPECT_FALSE(Attr(runner, "empty", "allowUpload"));
}

TEST_F(MethodAttributes, AnObjectOfItsOwnIsNotMergedWithTheDefaults) {
    TestRunner runner;
    EXPECT_TRUE(Attr(runner, "own", "allowUpload"));
    EXPECT_FALSE(Attr(runner, "own", "allowDemo"));
}

TEST_F(MethodAttributes, OnlyTheFirstMemberOfAnEntryNamesAMethod) {
    TestRunner runner;
    EXPECT_TRUE(Attr(runner, "first", "allowUpload"));
    EXPECT_FALSE(Attr(runner, "second", "allowUpload"));
    EXPECT_TRUE(Attr(runner, "second", "allowDemo")) << "the defaults";
}

TEST_F(MethodAttributes, AnythingUnknownTakesTheDefaults) {
    TestRunner runner;
    EXPECT_TRUE(Attr(runner, "not listed", "allowDemo"));
    EXPECT_TRUE(Attr(runner, "own", "allowDemo", 2));
    EXPECT_TRUE(runner.GetMethodAttr("ZOVA.None", 1, "own", "allowDemo"));
    ExpectLog(LOG_ERR, "WebAPI ZOVA.None is not valid");
}

TEST_F(MethodAttributes, AttributesThatAreNoObjectReadAsTheDefaults) {
    TestRunner runner;
    EXPECT_NO_THROW(EXPECT_TRUE(Attr(runner, "odd", "allowDemo")));
    EXPECT_NO_THROW(Attr(runner, "nothing", "allowDemo"));
}

TEST_F(MethodAttributes, AnEmptyAttributeNameOrANullRequestIsFalse) {
    TestRunner runner;
    Name(runner, "ZOVA.Test.Good", 1, "plain");
    EXPECT_TRUE(runner.GetMethodAttr(runner.Request(), "allowDemo"));
    EXPECT_FALSE(runner.GetMethodAttr(runner.Request(), ""));
    EXPECT_FALSE(runner.GetMethodAttr(nullptr, "allowDemo"));
}

TEST_F(MethodAttributes, WithoutReadableDefaultsEveryAttributeIsFalse) {
    platform.files.erase("/usr/zova/zovaman/webapi/lib.def");
    TestRunner runner;
    EXPECT_FALSE(Attr(runner, "plain", "allowDemo"));
    EXPECT_TRUE(Attr(runner, "own", "allowUpload"));
}

TEST_F(MethodAttributes, MethodListsOfAnyShapeAreSurvived) {
    for (const char* methods :
         {R"({"1": {}})", R"({"1": "plain"})", R"({"1": null})", R"({"1": 5})", "{}", R"({"1": [[["plain"]]]})"}) {
        Good()["methods"] = J(methods);
        Install();
        TestRunner runner;
        EXPECT_NO_THROW(EXPECT_TRUE(Attr(runner, "plain", "allowDemo"))) << methods;
        EXPECT_NO_THROW(EXPECT_FALSE(Call(runner, "ZOVA.Test.Good", 1, "plain"))) << methods;
        EXPECT_EQ(runner.Response()->GetError(), 103) << methods;
    }
}

}  // namespace
