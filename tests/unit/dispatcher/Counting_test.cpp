// Which calls are counted.

#include <cerrno>

#include "ProcessLibTest.h"

using unit::TestRunner;

namespace {

struct CountCase {
    const char* name;
    bool attribute;
    const char* apiCount;
    bool allowTimeout;
    bool counted;
};

class CountingTest : public unit::DeviceTest, public ::testing::WithParamInterface<CountCase> {};

TEST_P(CountingTest, IsDecidedByRequestMethodAndDescription) {
    const CountCase& row = GetParam();
    if (row.apiCount != nullptr) {
        Good()["count"] = unit::J(row.apiCount);
    }
    Good()["methods"]["1"][0] = unit::J("{\"success\": {\"grantable\": true}}");
    Good()["methods"]["1"][0]["success"]["allowTimeout"] = row.allowTimeout;
    Install();
    platform.keyValueFiles["/etc/zovainfo.conf"]["enable_data_collect"] = "yes";
    platform.Fail("QLIBCFileLockTimeByFile", EAGAIN);
    const unit::ChildResult result = unit::RunInChild("", [&] {
        TestRunner runner;
        if (row.attribute) {
            runner.Request()->SetAttr("_collector_count_webapi", true);
        }
        CallGood(runner, "success");
        return Json::Value(platform.CountOf("QLIBCFileLockTimeByFile"));
    });
    ASSERT_TRUE(result.orderly) << result.end;
    EXPECT_EQ(result.report.asInt(), row.counted ? 1 : 0);
}

INSTANTIATE_TEST_SUITE_P(Rows, CountingTest,
                         ::testing::Values(CountCase{"Plain", true, nullptr, false, true},
                                           CountCase{"WithoutTheAttribute", false, nullptr, false, false},
                                           CountCase{"CountFalse", true, "false", false, false},
                                           CountCase{"CountTrue", true, "true", false, true},
                                           CountCase{"AllowTimeout", true, nullptr, true, false}),
                         [](const auto& row) { return std::string(row.param.name); });

}  // namespace
