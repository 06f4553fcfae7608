#include "DeviceTest.h"
#include "webapi/Json.h"

using unit::J;
using unit::TestRunner;

namespace {

struct AdmissionCase {
    const char* name;
    const char* api;
    int version;
    const char* method;
    int error;
};

class AdmissionTest : public unit::DeviceTest {
protected:
    AdmissionTest() {
        Good()["minVersion"] = 1;
        Good()["maxVersion"] = 3;
        Good()["methods"] =
            J(R"({"1": ["text", {"object": {}}, {"one": {}, "two": {}}, {"upload": {"allowUpload": true}}],
                                  "2": ["other"]})");
        Json::Value upsideDown = Good();
        upsideDown["minVersion"] = 3;
        upsideDown["maxVersion"] = 1;
        descriptions["ZOVA.Test.UpsideDown"] = upsideDown;
        Install();
    }
};

class Admission : public AdmissionTest, public ::testing::WithParamInterface<AdmissionCase> {};

TEST_P(Admission, AnswersTheFirstFailure) {
    const AdmissionCase& row = GetParam();
    TestRunner runner;
    Name(runner, row.api, row.version, row.method);
    EXPECT_EQ(runner.CheckRequestParam(runner.Request(), runner.Response()), row.error == 0);
    EXPECT_EQ(runner.Response()->GetError(), row.error);
    if (row.error == 102 && std::string(row.api) == "ZOVA.None") {
        ExpectLog(LOG_ERR, "WebAPI ZOVA.None is not valid", "Descriptions.cpp");
    }
}

INSTANTIATE_TEST_SUITE_P(
    Rows, Admission,
    ::testing::Values(AdmissionCase{"VersionZeroIsABadRequest", "ZOVA.Test.Good", 0, "text", 101},
                      AdmissionCase{"NegativeVersion", "ZOVA.Test.Good", -1, "text", 101},
                      AdmissionCase{"EmptyAPI", "", 1, "text", 101},
                      AdmissionCase{"EmptyMethod", "ZOVA.Test.Good", 1, "", 101},
                      AdmissionCase{"UnknownAPIWithVersionZero", "ZOVA.None", 0, "text", 101},
                      AdmissionCase{"UnknownAPI", "ZOVA.None", 1, "text", 102},
                      AdmissionCase{"APIThatItsFileDoesNotDescribe", "ZOVA.Test.None", 1, "text", 102},
                      AdmissionCase{"VersionAboveTheRangeWhateverTheMethod", "ZOVA.Test.Good", 9, "none", 104},
                      AdmissionCase{"VersionBelowTheRange", "ZOVA.Test.UpsideDown", 1, "text", 104},
                      AdmissionCase{"MinimumAboveMaximumAdmitsNone", "ZOVA.Test.UpsideDown", 2, "other", 104},
                      AdmissionCase{"VersionWithoutMethods", "ZOVA.Test.Good", 3, "text", 103},
                      AdmissionCase{"MethodOfAnotherVersion", "ZOVA.Test.Good", 2, "text", 103},
                      AdmissionCase{"UnknownMethod", "ZOVA.Test.Good", 1, "none", 103},
                      AdmissionCase{"MethodAsText", "ZOVA.Test.Good", 1, "text", 0},
                      AdmissionCase{"MethodAsObject", "ZOVA.Test.Good", 1, "object", 0},
                      AdmissionCase{"FirstMethodOfAnObject", "ZOVA.Test.Good", 1, "one", 0},
                      AdmissionCase{"SecondMethodOfAnObject", "ZOVA.Test.Good", 1, "two", 0}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(AdmissionTest, AnUploadNeedsAMethodThatAllowsIt) {
    TestRunner runner;
    runner.Request()->InitEnv(J(R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
    Name(runner, "ZOVA.Test.Good", 1, "text");
    EXPECT_FALSE(runner.CheckRequestParam(runner.Request(), runner.Response()));
    EXPECT_EQ(runner.Response()->GetError(), 115);
    Name(runner, "ZOVA.Test.Good", 1, "upload");
    EXPECT_TRUE(runner.CheckRequestParam(runner.Request(), runner.Response()));
}

TEST_F(AdmissionTest, TheDescriptionIsCopiedIntoTheRequest) {
    TestRunner runner;
    Good()["own"] = "kept";
    Install();
    Name(runner, "ZOVA.Test.Good", 1, "text");
    EXPECT_TRUE(runner.CheckRequestParam(runner.Request(), runner.Response()));
    EXPECT_TRUE(runner.AddAPIInfo(runner.Request()));
    EXPECT_EQ(runner.Request()->GetAPIInfo("own", "").asString(), "kept");
    EXPECT_EQ(runner.Request()->GetAPIInfo("requestFormat", "").asString(), "JSON");
}

TEST_F(AdmissionTest, NoDescriptionAndNoRequestGiveNoInfoAndNoError) {
    TestRunner runner;
    EXPECT_FALSE(runner.AddAPIInfo(nullptr));
    Name(runner, "ZOVA.Test.None", 1, "text");
    EXPECT_FALSE(runner.AddAPIInfo(runner.Request()));
    EXPECT_EQ(runner.Response()->GetError(), 0);
    EXPECT_FALSE(runner.Response()->Serialize().isMember("body"));
}

TEST_F(AdmissionTest, AfterAFailedAdmissionProcessCopiesNoDescription) {
    TestRunner runner;
    EXPECT_FALSE(Call(runner, "ZOVA.Test.Good", 1, "none"));
    EXPECT_JSON(runner.Request()->GetAPIInfo("", Json::Value()), "{}");
    EXPECT_TRUE(runner.asked.empty()) << "no hook is asked";
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
}

}  // namespace
