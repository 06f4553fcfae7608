// A CGI call from its environment and standard input to its header block and body.

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <iterator>

#include "DeviceTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

using unit::Serve;
using unit::WebAnswer;
using unit::WebCall;

namespace {

constexpr const char* kHeaderBlock =
    "Content-type: application/json; charset=\"UTF-8\"\r\n"
    "X-Content-Type-Options: nosniff\r\n"
    "X-XSS-Protection: 1; mode=block\r\n"
    "Cache-Control: max-age=0, no-cache, no-store, must-revalidate\r\n"
    "Pragma: no-cache\r\n"
    "Expires: 0\r\n"
    "\r\n";

class WebEntryTest : public unit::DeviceTest {
protected:
    /** "ZOVA.Test.Good" asks for a login from now on. */
    void AskForLogin() {
        Good()["authLevel"] = 1;
        Install();
    }

    static WebCall GoodCall(const std::string& method) {
        return WebCall::Get("api=ZOVA.Test.Good&version=1&method=" + method);
    }
};

// ---- the road of one call ----

TEST_F(WebEntryTest, ServesAPostWithALoginCookie) {
    AskForLogin();
    const WebAnswer answer = Serve(
        WebCall::Post("api=ZOVA.Test.Good&version=1&method=by_user").With("HTTP_COOKIE", "a=1; id=alice-sid; b=2"));
    ASSERT_TRUE(answer.child.orderly) << answer.child.end;
    EXPECT_EQ(answer.body["data"]["user"][1].asInt(), 1000);
    EXPECT_EQ(answer.Header("x-request-error"), "");
    const std::string stations[] = {"setsid()",
                                    "ReadJsonFile(/usr/zova/zovaman/webapi/lib.def)",
                                    "ZovaCgiInit()",
                                    "ZovaCgiLoadInCookies(a=1; id=alice-sid; b=2)",
                                    "ZovaCgiGetLang()",
                                    "ZovaCgiIsTokenEnable()",
                                    "ZovaCgiGetRemoteIP(65)",
                                    "ZovaCgiDetectAndDecryptParamLine(api=ZOVA.Test.Good&version=1&method=by_user)",
                                    "prctl(ZOVA.Test.Good_1)",
                                    "ReadJsonFile(ZOVA.Test.lib)",
                                    "ZovaCgiIsAuthorizedEx(alice-sid, 493, flags 31, allowTimeout 0, 0)",
                                    "setenv(ZOVA_WEBAPI_USERNAME, alice)",
                                    "ZOVA_aa_has_profile_restricted()",
                                    "dlopen(" + unit::LibraryPath("good") + ", lazy)",
                                    "getpriority()",
                                    "ResetCredentialsByName(alice, keep)",
                                    "mark(probe)",
                                    "setresuid(0, 0, 0)",
                                    "setpriority(0)",
                                    "ZovaCgiFree()"};
    std::size_t next = 0;
    for (const std::string& call : answer.calls) {
        next += next < std::size(stations) && call == stations[next] ? 1 : 0;
    }
    EXPECT_EQ(next, std::size(stations)) << "not reached: " << stations[std::min(next, std::size(stations) - 1)];
}

TEST_F(WebEntryTest, WritesHeaderBlockAndBodyByteForByte) {
    const WebAnswer answer = Serve(GoodCall("success"));
    EXPECT_EQ(answer.child.output, std::string(kHeaderBlock) + R"({"success":true})");
}

TEST_F(WebEntryTest, ARefusedCallAnswersWithItsCodeAndItsWordByteForByte) {
    AskForLogin();
    const WebAnswer answer = Serve(GoodCall("success"));
    const std::string block = kHeaderBlock;
    const std::size_t second = block.find("X-Content");
    EXPECT_EQ(answer.child.output, block.substr(0, second) + "x-request-error: unauth\r\n" + block.substr(second) +
                                       R"({"error":{"code":119},"success":false})");
}

TEST_F(WebEntryTest, ABadRequestGetsItsJsonErrorToo) {
    const WebAnswer answer = Serve(WebCall::Get("nothing=here"));
    EXPECT_EQ(answer.child.output, std::string(kHeaderBlock) + R"({"error":{"code":101},"success":false})");
}

TEST_F(WebEntryTest, AnEnvironmentWithoutAnythingAnswers101) {
    const WebAnswer answer = Serve(WebCall{});
    EXPECT_TRUE(answer.wellFormed);
    EXPECT_EQ(answer.ErrorCode(), 101);
}

TEST_F(WebEntryTest, AQueryThatCannotBeDecipheredKeepsTheInitialResponse) {
    const WebAnswer answer = Serve(
        GoodCall("success"), [](fake::FakePlatform& fakes) { fakes.Fail("ZovaCgiDetectAndDecryptParamLine", EINVAL); });
    EXPECT_EQ(answer.child.output, std::string(kHeaderBlock) + "{}");
    EXPECT_TRUE(answer.CallsOf("prctl").size() == 1) << "only the name given back";
}

TEST_F(WebEntryTest, SeedsTheSessionWithLanguageAndTokenSettingOfACallThatReachesNoGate) {
    platform.language = "ger";
    platform.tokenEnable = 1;
    const WebAnswer answer = Serve(GoodCall("success"));
    EXPECT_JSON(answer.request["session"], R"({"uiLang": "ger", "tokenEnable": 1})");
}

TEST_F(WebEntryTest, PutsTheProcessEnvironmentAndTheClientAddressIntoTheRequest) {
    const WebAnswer answer = Serve(GoodCall("success").With("HTTP_HOST", "nas:5000"));
    EXPECT_EQ(answer.request["environ"]["HTTP_HOST"].asString(), "nas:5000");
    EXPECT_EQ(answer.request["environ"]["ZOVA_REMOTE_IP"].asString(), "192.0.2.7");
    EXPECT_FALSE(answer.environment.isMember("ZOVA_REMOTE_IP"));
    EXPECT_TRUE(answer.request["attr"]["_collector_count_webapi"].asBool());
}

TEST_F(WebEntryTest, AnAddressThatCannotBeWorkedOutLeavesItsKeyOut) {
    platform.remoteAddress.clear();
    const WebAnswer answer = Serve(GoodCall("success"));
    EXPECT_FALSE(answer.request["environ"].isMember("ZOVA_REMOTE_IP"));
    EXPECT_EQ(answer.ErrorCode(), 0);
}

TEST_F(WebEntryTest, ARefusedThreadNameAnswers118AndRunsNothing) {
    const WebAnswer answer = Serve(GoodCall("success"), [](fake::FakePlatform& fakes) { fakes.Fail("prctl", EFAULT); });
    EXPECT_EQ(answer.ErrorCode(), 118);
    EXPECT_TRUE(answer.CallsOf("dlopen").empty());
    ExpectLog(LOG_ERR, "Set process name fail[Bad address]", "ProcessIdentity.cpp");
}

TEST_F(WebEntryTest, ASharingLinkToAMethodThatDoesNotAllowThemIsRefusedWith126) {
    const WebAnswer answer = Serve(GoodCall("success").With("HTTP_X_FAKE_SHARING", "hash"));
    EXPECT_EQ(answer.ErrorCode(), 126);
    EXPECT_TRUE(answer.CallsOf("mark").empty());
}

// ---- output ----

struct HeaderCase {
    const char* name;
    const char* header;
    const char* value;
    const char* line;
};

class HeaderBytes : public WebEntryTest, public ::testing::WithParamInterface<HeaderCase> {};

TEST_P(HeaderBytes, NeverSplitTheBlock) {
    const HeaderCase& row = GetParam();
    const WebAnswer answer = Serve(WebCall::Get(
        "api=ZOVA.Test.Good&version=1&method=header&name=" + std::string(row.header) + "&value=" + row.value));
    ASSERT_TRUE(answer.wellFormed) << answer.child.output;
    EXPECT_TRUE(answer.HasHeader(row.line)) << answer.child.output;
    EXPECT_EQ(answer.headers.size(), 8U);
    EXPECT_EQ(answer.bodyText, R"({"success":true})");
}

INSTANTIATE_TEST_SUITE_P(Rows, HeaderBytes,
                         ::testing::Values(HeaderCase{"Plain", "X-A", "b", "X-A: b"},
                                           HeaderCase{"LineFeed", "X-A", "b%0aSet-Cookie:+x=1",
                                                      "X-A: b Set-Cookie: x=1"},
                                           HeaderCase{"CarriageReturn", "X-A", "b%0dc", "X-A: b c"},
                                           HeaderCase{"BothAndABody", "X-A", "b%0d%0a%0d%0a{}", "X-A: b    {}"},
                                           HeaderCase{"NUL", "X-A", "b%00c", "X-A: b c"},
                                           HeaderCase{"NameWithLineFeed", "X-A%0d%0aX-B", "c", "X-A  X-B: c"}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(WebEntryTest, ACookieNeverSplitsTheBlock) {
    const WebAnswer answer =
        Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=header&name=X&value=1&path=/%0d%0aX-Evil:+1%00"));
    EXPECT_TRUE(answer.HasHeader("Set-Cookie: c=v; path=/  X-Evil: 1 "));
    EXPECT_EQ(answer.headers.size(), 8U);
}

TEST_F(WebEntryTest, AHeaderOrCookieThatIsNoTextIsNotWritten) {
    const unit::ChildResult result = unit::RunInChild("", [] {
        unit::TestWebEntry entry;
        Json::Value document = unit::J(R"({"headers": {"A": "1", "B": 2, "C": null, "D": ["x"]},
            "setCookie": ["k=v", 7, null], "body": {"success": true}})");
        entry.Response()->Deserialize(document);
        entry.OutputHeader();
        entry.OutputBody();
        return Json::Value(true);
    });
    const std::string block = kHeaderBlock;
    EXPECT_EQ(result.output,
              "A: 1\r\nSet-Cookie: k=v\r\n" + block.substr(block.find("X-Content")) + R"({"success":true})");
}

TEST_F(WebEntryTest, OutputThatIsSwitchedOffSuppressesHeadersAndBodyButNotTheCallbacks) {
    const WebAnswer answer = Serve(GoodCall("silent"));
    ASSERT_TRUE(answer.child.orderly);
    EXPECT_EQ(answer.child.output, "");
    EXPECT_EQ(answer.CallsOf("QLIBCProcFork").size(), 1U);
}

TEST_F(WebEntryTest, ARestartOfTheServerIsACallbackAfterTheAnswer) {
    const WebAnswer answer = Serve(GoodCall("restart"));
    EXPECT_EQ(answer.ErrorCode(), 0);
    EXPECT_EQ(answer.CallsOf("QLIBCProcFork").size(), 1U);
    EXPECT_TRUE(answer.CallsOf("RestartService").empty()) << "the parent restarted the server";
}

TEST_F(WebEntryTest, TheRestartRunsInTheDetachedChild) {
    platform.forkAs = fake::ForkAs::kChild;
    const unit::ChildResult result = unit::RunInChild(
        "",
        [] {
            unit::TestWebEntry entry;
            setenv("QUERY_STRING", "api=ZOVA.Test.Good&version=1&method=restart", 1);
            entry.Run(Json::Value());
            return Json::Value("came back");
        },
        [](int) { return unit::CallsToJson(); });
    ASSERT_TRUE(result.orderly) << result.end;
    ASSERT_TRUE(result.report.isArray());
    std::vector<std::string> tail;
    for (const Json::Value& call : result.report) {
        tail.push_back(call.asString());
    }
    tail.erase(tail.begin(), tail.end() - 6);
    EXPECT_EQ(tail, (std::vector<std::string>{"QLIBCProcFork()", "setsid()", "sleep(1)",
                                              "ZOVA_aa_has_profile_restricted()", "RestartService()", "exit(0)"}));
}

TEST_F(WebEntryTest, AnswersAlsoWhereStandardOutputTakesNothing) {
    const unit::ChildResult result = unit::RunInChild("", [] {
        {
            const fake::Suspended suspended;
            EXPECT_NE(freopen("/dev/full", "w", stdout), nullptr);
        }
        setenv("QUERY_STRING", "api=ZOVA.Test.Good&version=1&method=success", 1);
        unit::TestWebEntry entry;
        entry.Run(Json::Value());
        return Json::Value(entry.Response()->GetError());
    });
    EXPECT_TRUE(result.orderly) << result.end;
    EXPECT_JSON(result.report, "0");
}

// ---- parameters that stand in for the cookie header ----

struct CredentialCase {
    const char* name;
    const char* query;
    /** Cookie header that comes with the request; null: none. */
    const char* cookie;
    /** After the call; null: not set. */
    const char* newCookie;
    const char* sharing;
    const char* token;
    /** How often the request's environment was filled. */
    int loads;
};

class CredentialParameters : public WebEntryTest, public ::testing::WithParamInterface<CredentialCase> {};

void PrintTo(const CredentialCase& row, std::ostream* out) {
    *out << row.name;
}

TEST_P(CredentialParameters, RewriteCookieHeaderAndVariables) {
    const CredentialCase& row = GetParam();
    WebCall call = WebCall::Get(std::string("api=ZOVA.Test.Good&version=1&method=success") + row.query);
    if (row.cookie != nullptr) {
        call = call.With("HTTP_COOKIE", row.cookie);
    }
    const WebAnswer answer = Serve(call);
    ASSERT_TRUE(answer.child.orderly) << answer.child.end;
    const auto variable = [&](const char* name) {
        return answer.environment.isMember(name) ? answer.environment[name].asString() : "(unset)";
    };
    EXPECT_EQ(variable("HTTP_COOKIE"), row.newCookie == nullptr ? "(unset)" : row.newCookie);
    EXPECT_EQ(variable("HTTP_X_FAKE_SHARING"), row.sharing == nullptr ? "(unset)" : row.sharing);
    EXPECT_EQ(variable("zovaAccessToken"), row.token == nullptr ? "(unset)" : row.token);
    EXPECT_EQ(answer.CallsOf("ZovaCgiLoadInCookies").size(), static_cast<std::size_t>(row.loads));
    if (row.loads == 2) {
        const Json::Value& variables = answer.request["environ"];
        EXPECT_EQ(variables["HTTP_COOKIE"].asString(), row.newCookie == nullptr ? "" : row.newCookie);
        EXPECT_EQ(variables["HTTP_X_FAKE_SHARING"].asString(), row.sharing == nullptr ? "" : row.sharing);
        EXPECT_EQ(variables.isMember("zovaAccessToken"), row.token != nullptr);
        EXPECT_EQ(answer.CallsOf("ZovaCgiLoadInCookies")[1],
                  "ZovaCgiLoadInCookies(" + std::string(row.newCookie == nullptr ? "null" : row.newCookie) + ")");
    }
}

TEST_F(WebEntryTest, TheEnvironmentIsTakenInOnceUnlessAParameterStandsInForACookie) {
    // Each time it is, the link that it names is looked up.
    const WebCall call = GoodCall("success").With("HTTP_X_FAKE_SHARING", "link");
    EXPECT_EQ(Serve(call).CallsOf("EntryDB::GetByHash").size(), 1U);
    const std::string query = "api=ZOVA.Test.Good&version=1&method=success&_sid=X";
    EXPECT_EQ(Serve(WebCall(call).With("QUERY_STRING", query)).CallsOf("EntryDB::GetByHash").size(), 2U);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, CredentialParameters,
    ::testing::Values(CredentialCase{"NoneLeavesTheCookieHeaderUntouched", "", "a=1", "a=1", nullptr, nullptr, 1},
                      CredentialCase{"NoneWithoutCookieHeader", "", nullptr, nullptr, nullptr, nullptr, 1},
                      CredentialCase{"SidAbandonsTheOldCookie", "&_sid=X", "a=1; id=Y", "a=1; abandoned=Y; id=X",
                                     nullptr, nullptr, 2},
                      CredentialCase{"SidWithoutCookieHeader", "&_sid=X", nullptr, "id=X", nullptr, nullptr, 2},
                      CredentialCase{"SidWithEmptyCookieHeader", "&_sid=X", "", "id=X", nullptr, nullptr, 2},
                      CredentialCase{"SidBesideAnotherCookie", "&_sid=X", "a=1", "a=1; id=X", nullptr, nullptr, 2},
                      CredentialCase{"SidHitsACookieWhoseNameEndsInId", "&_sid=X", "paid=1; id=Y",
                                     "paabandoned=1; id=Y; id=X", nullptr, nullptr, 2},
                      CredentialCase{"TidAlone", "&tid=T", "a=1", "a=1", nullptr, "T", 2},
                      CredentialCase{"SidWinsOverTid", "&_sid=X&tid=T", nullptr, "id=X", nullptr, nullptr, 2},
                      CredentialCase{"SharingIdAlone", "&_sharing_id=H", "a=1", "a=1", "H", nullptr, 2},
                      CredentialCase{"SharingSidAloneChangesNothing", "&_sharing_sid=S", "a=1", "a=1", nullptr, nullptr,
                                     2},
                      CredentialCase{"SharingIdAndSid", "&_sharing_id=H&_sharing_sid=S", "a=1", "a=1; sharing_sid=S",
                                     "H", nullptr, 2},
                      CredentialCase{"SharingIdAndSidWithoutCookieHeader", "&_sharing_id=H&_sharing_sid=S", nullptr,
                                     "sharing_sid=S", "H", nullptr, 2},
                      CredentialCase{"AllJoinWithoutASeparatorOnAnEmptyHeader", "&_sharing_id=H&_sharing_sid=S&_sid=X",
                                     nullptr, "sharing_sid=Sid=X", "H", nullptr, 2},
                      CredentialCase{"AllWithACookieHeader", "&_sharing_id=H&_sharing_sid=S&_sid=X", "id=Y",
                                     "abandoned=Y; sharing_sid=S; id=X", "H", nullptr, 2},
                      CredentialCase{"ANumberIsNoSid", "&_sid=5", "a=1", "a=1", nullptr, nullptr, 1},
                      CredentialCase{"AnArrayIsNoTid", "&tid=[1]", "a=1", "a=1", nullptr, nullptr, 1}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(WebEntryTest, AnAccessTokenThatCannotBeStoredLeavesTheResponseAsItWas) {
    const WebAnswer answer = Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=success&tid=T"),
                                   [](fake::FakePlatform& fakes) { fakes.Fail("setenv", ENOMEM, 0, 1); });
    EXPECT_EQ(answer.bodyText, "{}");
    EXPECT_TRUE(answer.CallsOf("dlopen").empty());
}

TEST_F(WebEntryTest, TheParameterSidLogsInInPlaceOfTheCookie) {
    AskForLogin();
    const WebAnswer answer =
        Serve(WebCall::Get("api=ZOVA.Test.Good&version=1&method=session&_sid=alice-sid").With("HTTP_COOKIE", "id=no"));
    EXPECT_EQ(answer.body["data"]["user"].asString(), "alice");
}

}  // namespace
