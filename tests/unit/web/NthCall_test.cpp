// Every system and platform call of a whole request fails once: the answer stays well-formed, or the process ends in
// order, and the process is as it was before.

#include <algorithm>

#include "DeviceTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

using unit::ExpectedLine;
using unit::WebAnswer;
using unit::WebCall;

namespace {

constexpr int kMostCalls = 400;

struct Mode {
    const char* name;
    const char* method;
    /** Effective user inside the method. */
    int runsAs;
    /** Identity, groups and nice value after a call whose method ran. */
    const char* user;
    const char* group;
    const char* groups;
    int nice;
};

void PrintTo(const Mode& mode, std::ostream* out) {
    *out << mode.name;
}

class NthCallTest : public unit::DeviceTest, public ::testing::WithParamInterface<Mode> {
protected:
    NthCallTest() {
        Good()["authLevel"] = 1;
        Good()["appPriv"] = "ZOVA.App";
        Install();
        platform.appPrivileges.insert({"alice", "ZOVA.App", platform.remoteAddress});
        platform.keyValueFiles["/etc/zovainfo.conf"]["enable_data_collect"] = "yes";
        platform.redirects["/var/spool/webapi"] = counters.Path();
        platform.confined = true;
        platform.process.hats = {"ZOVA.Test.Good", "DefaultHat"};
        platform.process.groups = {0, 4};
        platform.sessions["alice-sid"].options = {{1, "0"}, {7, "app"}};
    }

    WebCall Request() const {
        return WebCall::Post(std::string("api=ZOVA.Test.Good&version=1&method=") + GetParam().method)
            .With("HTTP_COOKIE", "a=1")
            .With("QUERY_STRING", "_sid=alice-sid");
    }

    /** Which parts of the process a failure of this call may leave changed, as it is the way back that failed. */
    static std::vector<std::string> LeftBy(const std::string& call) {
        if (call == "aa_change_hat") {
            return {"hat"};
        }
        if (call == "setresuid") {
            return {"user", "groups", "nice"};
        }
        if (call == "setresgid") {
            return {"group", "user", "groups", "nice"};
        }
        if (call == "setgroups") {
            return {"groups"};
        }
        if (call == "setpriority") {
            return {"nice"};
        }
        if (call == "chdir") {
            return {"directory"};
        }
        if (call == "setenv") {
            return {"stack"};
        }
        return {};
    }

    /** The line that tells of a way back that failed; "" where none belongs to it. */
    static std::string LineOf(const std::string& call) {
        if (call == "aa_change_hat") {
            return "AppArmor: chagehat Original Hat failed [";
        }
        if (call == "setresuid" || call == "setresgid") {
            return "ERROR: set";
        }
        return call == "setgroups" ? "ERROR: setgroups(" : "";
    }

    static bool Logged(const WebAnswer& answer, const std::string& begin) {
        return std::any_of(answer.log.begin(), answer.log.end(), [&](const fake::LogLine& line) {
            return line.priority <= LOG_WARNING && line.text.compare(0, begin.size(), begin) == 0;
        });
    }

    static bool MethodRan(const WebAnswer& answer) {
        return std::find(answer.calls.begin(), answer.calls.end(), "mark(probe)") != answer.calls.end();
    }

    /** Whether the failed call came after the method. */
    static bool FailedOnTheWayBack(const WebAnswer& answer) {
        const auto method = std::find(answer.calls.begin(), answer.calls.end(), "mark(probe)");
        return method != answer.calls.end() && method - answer.calls.begin() < answer.failedIndex;
    }

    /** Whether the process has become another user for good; the method need not have run then. */
    static bool HasChangedForGood(const WebAnswer& answer) {
        const std::vector<std::string> changes = answer.CallsOf("ResetCredentialsByName");
        return answer.failedCall != "ResetCredentialsByName" && !changes.empty() &&
               changes.back().find("for good") != std::string::npos;
    }

    /** The process as it has to be after the call. */
    Json::Value Expected(const WebAnswer& answer) const {
        const Mode& mode = GetParam();
        Json::Value expected = answer.before;
        if (MethodRan(answer) || HasChangedForGood(answer)) {
            expected["user"] = mode.user;
            expected["group"] = mode.group;
            expected["groups"] = unit::J(mode.groups);
            // A nice value that was never changed need not be given back.
            // The method reads its nice value too.
            const bool unread = answer.failedCall == "getpriority" && !FailedOnTheWayBack(answer);
            expected["nice"] = answer.failedCall == "setpriority" || unread ? 0 : mode.nice;
        }
        // The stack in the environment is put back as text once a hat was tried.
        if (answer.after["stack"] == "[]") {
            expected["stack"] = "[]";
        }
        // A body that was read leaves standard input at its end.
        if (answer.after["descriptors"]["0"] == "/dev/null") {
            expected["descriptors"]["0"] = "/dev/null";
        }
        return expected;
    }

    void CheckProcess(const WebAnswer& answer) const {
        const Json::Value expected = Expected(answer);
        const std::vector<std::string> left =
            FailedOnTheWayBack(answer) ? LeftBy(answer.failedCall) : std::vector<std::string>();
        for (const std::string& key : expected.getMemberNames()) {
            if (std::find(left.begin(), left.end(), key) == left.end()) {
                EXPECT_JSON(answer.after[key], Json::toString(expected[key])) << key;
            }
        }
        if (!left.empty() && !LineOf(answer.failedCall).empty()) {
            EXPECT_TRUE(Logged(answer, LineOf(answer.failedCall))) << "no line tells of it";
        }
    }

    unit::TemporaryDirectory counters;
};

TEST_P(NthCallTest, LeavesAWellFormedAnswerAndTheProcessAsItWas) {
    int number = 1;
    std::string failed;
    do {
        SCOPED_TRACE("failed call " + std::to_string(number) + ": " + failed);
        const WebAnswer answer = Serve(Request(), [&](fake::FakePlatform& fakes) { fakes.FailCall(number); });
        // Each failure has lines of its own; those that must come are looked for below.
        platform.process.log.clear();
        failed = answer.failedCall;
        SCOPED_TRACE("this is " + failed);
        ASSERT_TRUE(answer.child.orderly) << answer.child.end;
        EXPECT_TRUE(answer.wellFormed) << answer.child.output;
        CheckProcess(answer);
        if (failed.empty()) {
            EXPECT_TRUE(MethodRan(answer));
            EXPECT_EQ(answer.ErrorCode(), 0);
        } else if (answer.body["success"] == true) {
            EXPECT_TRUE(MethodRan(answer)) << "a success without the method";
        }
        if (MethodRan(answer)) {
            EXPECT_NE(answer.body["data"]["hat"].asString(), "") << "outside of any hat";
            // The failed call may be one by which the method itself asks for its identity.
            const Json::Value& user = answer.body["data"]["user"];
            EXPECT_TRUE(user.isNull() || user[1].asInt() == GetParam().runsAs) << Json::toString(user);
        }
        ++number;
    } while (!failed.empty() && number < kMostCalls);
    RecordProperty("failedCalls", number - 2);
    EXPECT_TRUE(failed.empty());
    EXPECT_GT(number, 40);
}

INSTANTIATE_TEST_SUITE_P(Modes, NthCallTest,
                         ::testing::Values(Mode{"Grantable", "granted", 500, "0/0/0", "0/0/0", "[0,4]", 0},
                                           Mode{"GrantByDefault", "by_default", 0, "0/0/0", "0/0/0", "[0,4]", 0},
                                           Mode{"GrantByUser", "by_user", 1000, "0/0/0", "0/0/0", "[0,4]", 0},
                                           // For good: also the nice value cannot be lowered again, as for any user.
                                           Mode{"Lasting", "lasting", 500, "500/500/500", "50/50/50", "[50]", 5},
                                           Mode{"LastingByUser", "by_user_lasting", 1000, "1000/1000/1000",
                                                "100/100/100", "[100,200]", 5}),
                         [](const auto& row) { return std::string(row.param.name); });

}  // namespace
