// Every system and platform call of a batch in children fails once, in the batch's own process or in a child: the
// answer stays well-formed, nothing hangs, and the process is as it was before.

#include "SubrequestTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

using unit::J;
using unit::WebAnswer;
using unit::WebCall;

namespace {

constexpr int kMostCalls = 400;
constexpr Json::ArrayIndex kEntries = 2;

class CompoundNthCall : public unit::SubrequestTest, public ::testing::WithParamInterface<const char*> {
protected:
    CompoundNthCall() {
        platform.confined = true;
        platform.process.hats = {"ZOVA.Test.Hook", "DefaultHat"};
        platform.process.groups = {0, 4};
    }

    static WebCall Request() {
        const std::string entry = R"({"api":"ZOVA.Test.Hook","version":1,"method":"child","do":"tell_ids"})";
        return WebCall::Post(std::string("api=ZOVA.Entry.Request&version=1&method=request&compound=[") + entry + "," +
                             entry + "]&mode=" + GetParam());
    }

    static void CheckProcess(const WebAnswer& answer) {
        for (const std::string& key : answer.before.getMemberNames()) {
            // A body that was read leaves standard input at its end.
            if (key != "descriptors") {
                EXPECT_JSON(answer.after[key], Json::toString(answer.before[key])) << key;
            }
        }
        EXPECT_EQ(answer.after["descriptors"].size(), answer.before["descriptors"].size());
    }

    /** An entry that succeeded ran as its own user. */
    static void CheckResults(const Json::Value& results) {
        ASSERT_EQ(results.size(), kEntries);
        for (const Json::Value& result : results) {
            if (Json::asBool(Json::member(result, "success"))) {
                EXPECT_JSON(result["data"], R"({"user": [500, 500, 500], "group": [50, 50, 50], "groups": [50]})");
            }
        }
    }
};

TEST_P(CompoundNthCall, LeavesAWellFormedAnswerAndTheProcessAsItWas) {
    int number = 1;
    std::string failed;
    do {
        const WebAnswer answer = Serve(Request(), [&](fake::FakePlatform& fakes) { fakes.FailCall(number); });
        // Each failure has lines of its own.
        platform.process.log.clear();
        failed = answer.failedCall;
        SCOPED_TRACE("failed call " + std::to_string(number) + ": " + failed);
        ASSERT_TRUE(answer.child.orderly) << answer.child.end;
        EXPECT_TRUE(answer.wellFormed) << answer.child.output;
        CheckProcess(answer);
        if (answer.body["success"] == true) {
            CheckResults(answer.body["data"]["result"]);
        }
        for (const std::string& end : answer.child.forked) {
            EXPECT_TRUE(end == "status 0" || end == "signal 13") << end << ": the reader may have gone";
        }
        ++number;
    } while (!failed.empty() && number < kMostCalls);
    RecordProperty("failedCalls", number - 2);
    EXPECT_TRUE(failed.empty());
    EXPECT_GT(number, 20);
}

INSTANTIATE_TEST_SUITE_P(Modes, CompoundNthCall, ::testing::Values("sequential", "parallel"),
                         [](const auto& row) { return std::string(row.param); });

}  // namespace
