// What a batch's entries want done after the answer.

#include <algorithm>

#include "ChildRun.h"
#include "SubrequestTest.h"
#include "WebCall.h"
#include "envelope/APIResponsePrivate.h"
#include "webapi/Json.h"

using unit::J;
using unit::List;
using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

using Texts = std::vector<std::string>;

void Callback(void* argument) {
    fake::FakePlatform::Required("callback").Enter("callback", static_cast<const char*>(argument), 0);
}

class CompoundCallbacks : public unit::SubrequestTest {
protected:
    CompoundCallbacks() {
        unsetenv("in_zovaapid");
        unit::Hooks()["call_back"] = [](APIRequest* request, APIResponse* response) {
            static char first[] = "first";
            static char second[] = "second";
            response->SetCallbackFunc(Callback,
                                      Json::asString(request->GetParam("name", "")) == "first" ? first : second);
            response->SetSuccess(Json::Value());
        };
    }

    static Json::Value CallBack(const std::string& method, const std::string& name) {
        Json::Value more(Json::objectValue);
        more["name"] = name;
        return Entry(method, "call_back", more);
    }

    std::size_t PendingCallbacks() {
        return static_cast<const ZOVA::ResponseCallbackList*>(runner.Response()->GetCallbackFuncs())->size();
    }

    static Texts CallsFrom(const fake::ForkedChild& child, const std::string& first) {
        return {std::find(child.calls.begin(), child.calls.end(), first), child.calls.end()};
    }
};

TEST_F(CompoundCallbacks, ThoseOfEntriesInThisProcessAreHandedToTheBatchsResponse) {
    Batch(List(CallBack("local", "first"), CallBack("local", "second"), CallBack("local", "first")));
    EXPECT_EQ(PendingCallbacks(), 2u) << "each once";
    EXPECT_EQ(platform.CountOf("QLIBCProcFork") + platform.CountOf("callback"), 0) << "not before the answer";
}

TEST_F(CompoundCallbacks, ThoseOfANestedBatchAreHandedUp) {
    Json::Value inner = J(R"({"api": "ZOVA.Entry.Request", "version": 1, "method": "request"})");
    inner["compound"] = List(CallBack("local", "first"));
    Batch(List(inner, CallBack("local", "second")));
    EXPECT_EQ(PendingCallbacks(), 2u);
}

TEST_F(CompoundCallbacks, TwoEntriesOfThisProcessRunAfterTheAnswerInOneDetachedChild) {
    const std::string compound = Json::toString(List(CallBack("local", "first"), CallBack("local", "second")));
    std::string query = "api=ZOVA.Entry.Request&version=1&method=request&compound=";
    for (char c : compound) {
        query += c == '"' ? std::string("%22") : std::string(1, c);
    }
    const unit::WebAnswer answer = unit::Serve(unit::WebCall::Get(query));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end << answer.child.output;
    EXPECT_EQ(Outcomes(answer.body), (Texts{"success", "success"}));
    EXPECT_EQ(answer.CallsOf("QLIBCProcFork").size(), 1u);
    EXPECT_EQ(answer.CallsOf("QLIBCProcForkEx").size(), 0u);
}

TEST_F(CompoundCallbacks, ThatDetachedChildRunsThemInTheOrderOfTheEntries) {
    platform.forkAs = fake::ForkAs::kChild;
    const unit::ChildResult result = unit::RunInChild(
        "",
        [this] {
            Batch(List(CallBack("local", "first"), CallBack("local", "second")));
            platform.calls.clear();
            runner.HandleCallback(runner.Response());
            return Json::Value("came back");
        },
        [](int) { return unit::CallsToJson(); });
    EXPECT_TRUE(result.orderly) << result.end;
    EXPECT_JSON(result.report, R"j(["QLIBCProcFork()", "setsid()", "sleep(1)", "ZOVA_aa_has_profile_restricted()",
        "callback(first)", "callback(second)", "exit(0)"])j");
}

TEST_F(CompoundCallbacks, AChildRunsItsOwnAfterItsParentHasGone) {
    platform.forkAs = fake::ForkAs::kChild;
    platform.parentPolls = 2;
    HookAPI()["runAs"] = "system";
    Install();
    EXPECT_EQ(Outcomes(Batch(List(CallBack("child", "first")))), (Texts{"success"}));
    EXPECT_EQ(PendingCallbacks(), 0u);
    const std::vector<fake::ForkedChild> children = TakeChildren();
    EXPECT_EQ(CallsFrom(children.at(0), "kill(parent, 0)"),
              (Texts{"kill(parent, 0)", "usleep(200000)", "kill(parent, 0)", "usleep(200000)", "kill(parent, 0)",
                     "QLIBCProcFork()", "setsid()", "sleep(1)", "ZOVA_aa_has_profile_restricted()", "callback(first)",
                     "exit(0)"}));
}

TEST_F(CompoundCallbacks, AChildThatBecameAnotherUserWaitsForItsParentToo) {
    platform.parentPolls = 1;
    Batch(List(CallBack("child", "first")));
    EXPECT_EQ(CallsFrom(TakeChildren().at(0), "kill(parent, 0)"),
              (Texts{"kill(parent, 0)", "usleep(200000)", "kill(parent, 0)", "QLIBCProcFork()", "_exit(0)"}));
}

TEST_F(CompoundCallbacks, AChildWithoutAnyDoesNotWait) {
    platform.parentPolls = 1000;
    Batch(List(Entry("child", "succeed")));
    const Texts calls = TakeChildren().at(0).calls;
    EXPECT_EQ(std::count(calls.begin(), calls.end(), "kill(parent, 0)"), 0);
}

TEST_F(CompoundCallbacks, AChildDoesNotRunThoseOfEarlierEntries) {
    platform.parentPolls = 1000;
    Batch(List(CallBack("local", "first"), Entry("child", "succeed"), CallBack("local", "second")));
    EXPECT_EQ(PendingCallbacks(), 2u);
    const Texts calls = TakeChildren().at(0).calls;
    EXPECT_EQ(std::count(calls.begin(), calls.end(), "QLIBCProcFork()"), 0);
}

TEST_F(CompoundCallbacks, AChildAnswersBeforeItWaits) {
    platform.parentPolls = 3;
    Batch(List(CallBack("child", "first")));
    const Texts calls = TakeChildren().at(0).calls;
    const auto written = std::find(calls.begin(), calls.end(), "write(8)");
    EXPECT_LT(written, std::find(calls.begin(), calls.end(), "kill(parent, 0)"));
    EXPECT_NE(written, calls.end());
}

TEST_F(CompoundCallbacks, ABatchThatFailsHandsUpNone) {
    Batch(J("{}"));
    ExpectLog(LOG_ERR, "ParseParams failed", "CompoundHandler.cpp");
    EXPECT_EQ(PendingCallbacks(), 0u);
}

}  // namespace
