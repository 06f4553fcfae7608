// Calls that go to a daemon: which ones, what it is sent, and what every failure leaves.

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "DeviceTest.h"

using unit::J;
using unit::TestRunner;

namespace {

using Texts = std::vector<std::string>;

class SocketTest : public unit::DeviceTest {
protected:
    SocketTest() {
        unsetenv("in_zovaapid");
        path = directory.Path() + "/daemon.sock";
        Good()["socket"] = path;
        Good()["methods"]["1"] = J(R"(["success",
            {"near": {"disableSocket": true}}, {"allowed": {"disableSocket": false}},
            {"takes": {"allowUpload": true}}, {"defers": {"allowUpload": true, "deferUpload": true}},
            {"defers_only": {"deferUpload": true}}, {"gives": {"allowDownload": true}},
            {"odd": {"allowDownload": "yes", "disableSocket": "yes"}}])");
        Install();
        platform.services[path] = [this](const std::string& text) {
            received = J(text);
            return answer;
        };
        Listen();
    }
    ~SocketTest() override {
        const fake::Suspended suspended;
        close(listener);
    }

    void Listen() {
        const fake::Suspended suspended;
        listener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        path.copy(address.sun_path, sizeof(address.sun_path) - 1);
        ASSERT_EQ(bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
    }

    void RemoveSocket() {
        const fake::Suspended suspended;
        unlink(path.c_str());
    }

    /** The request admitted, so that the hook can be asked by itself. */
    bool CanProcess(const std::string& method) {
        TestRunner runner;
        Name(runner, "ZOVA.Test.Good", 1, method);
        runner.InitLibDesc(runner.Descriptions(), "ZOVA.Test.Good");
        EXPECT_TRUE(runner.AddAPIInfo(runner.Request()));
        return runner.CanProcessSocket(runner.Request());
    }

    std::string NotReady(const char* reason = nullptr) const {
        return "(" + std::to_string(getpid()) + ") socket is not ready: " + path +
               (reason == nullptr ? "" : std::string(" [err: ") + reason + "]");
    }

    int Connects() const { return platform.CountOf("DomainSockConnection::Connect"); }

    unit::TemporaryDirectory directory;
    std::string path;
    int listener = -1;
    Json::Value received;
    std::string answer = R"({"code": 0, "body": {"success": true, "data": "from the daemon"}})";
};

// ---- which calls ----

TEST_F(SocketTest, ACallGoesToTheSocketOfItsDescription) {
    EXPECT_TRUE(CanProcess("success"));
    EXPECT_TRUE(CanProcess("allowed"));
}

TEST_F(SocketTest, TheDaemonItselfNeverForwardsAndLooksForNoSocket) {
    for (const char* value : {"1", ""}) {
        setenv("in_zovaapid", value, 1);
        platform.calls.clear();
        EXPECT_FALSE(CanProcess("success"));
        EXPECT_EQ(platform.CountOf("stat"), 0);
    }
}

TEST_F(SocketTest, OnlyTheProcessEnvironmentSaysThatThisIsTheDaemon) {
    TestRunner runner;
    runner.Request()->InitEnv(J(R"({"in_zovaapid": "1"})"));
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(Connects(), 1);
}

TEST_F(SocketTest, WithoutASocketInTheDescriptionNoneIsLookedFor) {
    for (const char* socket : {R"("")", "null", "[]", "{}"}) {
        Good()["socket"] = J(socket);
        Install();
        EXPECT_FALSE(CanProcess("success")) << socket;
    }
    EXPECT_EQ(platform.CountOf("stat"), 0);
}

TEST_F(SocketTest, DisableSocketOfTheAPIKeepsItsCallsHere) {
    Good()["disableSocket"] = true;
    Install();
    EXPECT_FALSE(CanProcess("success"));
    EXPECT_FALSE(CanProcess("allowed")) << "a method does not open what its API closes";
    EXPECT_EQ(platform.CountOf("stat"), 0);
}

TEST_F(SocketTest, DisableSocketOfTheMethodKeepsItsCallsHere) {
    EXPECT_FALSE(CanProcess("near"));
}

TEST_F(SocketTest, AnUploadThatTheMethodTakesItselfStaysHere) {
    EXPECT_FALSE(CanProcess("defers"));
    EXPECT_TRUE(CanProcess("takes")) << "this process has received it already";
    EXPECT_TRUE(CanProcess("defers_only"));
}

TEST_F(SocketTest, ADownloadStaysHere) {
    EXPECT_FALSE(CanProcess("gives"));
}

TEST_F(SocketTest, AttributesOfAnotherTypeKeepNothingHere) {
    EXPECT_TRUE(CanProcess("odd"));
}

TEST_F(SocketTest, AMissingSocketIsLoggedWithItsReasonWhichIsThenForgotten) {
    RemoveSocket();
    EXPECT_FALSE(CanProcess("success"));
    EXPECT_EQ(errno, 0);
    ExpectLog(LOG_ERR, NotReady("No such file or directory"), "SocketDispatch.cpp");
}

TEST_F(SocketTest, AMissingSocketFallsBackToTheLibrary) {
    RemoveSocket();
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(Connects(), 0);
    EXPECT_EQ(platform.CountOf("dlopen"), 1);
    ExpectLog(LOG_ERR, NotReady("No such file or directory"), "SocketDispatch.cpp");
}

TEST_F(SocketTest, ARegularFileIsNoSocketAndTheCallRunsHere) {
    RemoveSocket();
    directory.Write("daemon.sock", "");
    errno = 0;
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(Connects(), 0);
    ASSERT_FALSE(platform.process.log.empty());
    const std::string line = platform.process.log.front().text;
    EXPECT_EQ(line.substr(0, NotReady().size()), NotReady());
    ExpectLog(LOG_ERR, line, "SocketDispatch.cpp");
}

TEST_F(SocketTest, WithoutAReasonTheLineGivesNone) {
    platform.Fail("stat", 0);
    EXPECT_FALSE(CanProcess("success"));
    ExpectLog(LOG_ERR, NotReady(), "SocketDispatch.cpp");
}

// ---- what passes over the socket ----

TEST_F(SocketTest, TheDaemonGetsRequestAndResponseAndItsAnswerReplacesTheResponse) {
    TestRunner runner;
    runner.Request()->InitSession(J(R"({"username": "alice"})"));
    runner.Response()->SetHeader("X-Before", "1");
    runner.Response()->AddCookie("before", "1", "/", 0, "", false, false);
    runner.Response()->SetServerError("before");
    EXPECT_TRUE(Call(runner, "ZOVA.Test.Good", 1, "success", J(R"({"x": [1]})")));
    EXPECT_FALSE(runner.Response()->HasHeader("X-Before"));
    EXPECT_JSON(runner.Response()->GetCookies(), "[]");
    EXPECT_EQ(runner.Response()->GetServerError(), "");
    EXPECT_JSON(runner.Response()->GetBody(), R"({"success": true, "data": "from the daemon"})");
    EXPECT_EQ(runner.Response()->GetError(), 0);
    EXPECT_EQ(received.getMemberNames(), (Texts{"req", "resp"}));
    EXPECT_EQ(received["req"]["session"]["username"].asString(), "alice");
    EXPECT_JSON(received["req"]["param"]["x"], "[1]");
    EXPECT_EQ(received["resp"]["code"].asInt(), 117);
    EXPECT_EQ(platform.openConnections, 0);
}

TEST_F(SocketTest, TheTextIsTheCompactOneOfTheWholeRequest) {
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    const Texts sent = platform.CallsOf({"SockConnection::Send"});
    ASSERT_EQ(sent.size(), 1U);
    EXPECT_EQ(sent[0], "SockConnection::Send(" + Json::toString(received) + ")");
    EXPECT_JSON(received["req"], Json::toString(runner.Request()->Serialize()));
}

TEST_F(SocketTest, AnErrorOfTheCallIsAnAnswerLikeAnyOther) {
    answer = R"({"code": 400, "body": {"success": false, "error": {"code": 400}}})";
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(runner.Response()->GetError(), 400);
}

TEST_F(SocketTest, AnAnswerOfOddSectionsIsReadAsTheirZeroes) {
    answer = R"({"code": [], "body": 5, "headers": null, "option": "x"})";
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(runner.Response()->GetError(), 0);
    EXPECT_TRUE(runner.Response()->IsEnableOutput());
    EXPECT_EQ(runner.Response()->GetServerError(), "");
}

TEST_F(SocketTest, NothingOfThisProcessIsChangedForTheDaemonsCall) {
    Good()["priority"] = 5;
    Install();
    platform.confined = true;
    TestRunner runner;
    EXPECT_TRUE(CallGood(runner, "success"));
    for (const char* call : {"dlopen", "setresuid", "setresgid", "setgroups", "setpriority", "aa_change_hat", "dup2",
                             "QLIBCFileCheckKeyValue", "ZOVA_aa_has_profile_restricted"}) {
        EXPECT_EQ(platform.CountOf(call), 0) << call;
    }
}

// ---- failures ----

struct Failure {
    const char* name;
    /** The call that fails, null for none. */
    const char* call;
    int error;
    const char* answer;
    const char* line;
    const char* reason;
};

class SocketFailure : public SocketTest, public ::testing::WithParamInterface<Failure> {};

TEST_P(SocketFailure, Answers117LogsAndClosesTheConnection) {
    const Failure& row = GetParam();
    if (row.call != nullptr) {
        platform.Fail(row.call, row.error);
    }
    if (row.answer != nullptr) {
        answer = row.answer;
    }
    errno = 0;
    TestRunner runner;
    Name(runner, "ZOVA.Test.Good", 1, "success");
    runner.InitLibDesc(runner.Descriptions(), "ZOVA.Test.Good");
    ASSERT_TRUE(runner.AddAPIInfo(runner.Request()));
    errno = 0;
    EXPECT_FALSE(runner.ProcessSocket(runner.Request(), runner.Response()));
    EXPECT_EQ(runner.Response()->GetError(), 117);
    EXPECT_JSON(runner.Response()->GetBody(), R"({"success": false, "error": {"code": 117}})");
    EXPECT_EQ(platform.openConnections, 0);
    EXPECT_EQ(platform.CountOf("dlopen"), 0) << "no way back to the library";
    const std::string reason = row.reason[0] == '\0' ? "" : std::string(" [err: ") + row.reason + "]";
    ExpectLog(LOG_ERR, "(" + std::to_string(getpid()) + ") " + row.line + ": " + path + reason, "SocketDispatch.cpp");
}

constexpr const char* kConnect = "Failed to connect domain socket";
constexpr const char* kSend = "Failed to send data from socket";
constexpr const char* kRecv = "Failed to recv data from socket";
constexpr const char* kParse = "Failed to parse response from socket";

INSTANTIATE_TEST_SUITE_P(
    Rows, SocketFailure,
    ::testing::Values(
        Failure{"Connect", "DomainSockConnection::Connect", ECONNREFUSED, nullptr, kConnect, "Connection refused"},
        Failure{"ConnectSilently", "DomainSockConnection::Connect", 0, nullptr, kConnect, ""},
        Failure{"Send", "SockConnection::Send", EPIPE, nullptr, kSend, "Broken pipe"},
        Failure{"SendSilently", "SockConnection::Send", 0, nullptr, kSend, ""},
        Failure{"Recv", "SockConnection::Recv", ECONNRESET, nullptr, kRecv, "Connection reset by peer"},
        Failure{"RecvSilently", "SockConnection::Recv", 0, nullptr, kRecv, ""},
        Failure{"NothingSaid", nullptr, 0, "", kParse, ""}, Failure{"NoJson", nullptr, 0, "{", kParse, ""},
        Failure{"MoreBehindIt", nullptr, 0, "{} {}", kParse, ""}, Failure{"Null", nullptr, 0, "null", kParse, ""},
        Failure{"Array", nullptr, 0, "[]", kParse, ""}, Failure{"Text", nullptr, 0, R"("x")", kParse, ""},
        Failure{"Number", nullptr, 0, "5", kParse, ""}, Failure{"True", nullptr, 0, "true", kParse, ""}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(SocketTest, AFileThatOutlivesItsDaemonAnswers117) {
    platform.services.clear();
    TestRunner runner;
    EXPECT_FALSE(CallGood(runner, "success"));
    EXPECT_EQ(runner.Response()->GetError(), 117);
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
    ExpectLog(LOG_ERR,
              "(" + std::to_string(getpid()) + ") " + kConnect + ": " + path + " [err: No such file or directory]",
              "SocketDispatch.cpp");
}

// ---- the gate in front ----

TEST_F(SocketTest, ARefusedCallNeverReachesTheDaemon) {
    TestRunner runner;
    runner.needsPermission = true;
    runner.permissionError = 119;
    EXPECT_FALSE(CallGood(runner, "success"));
    EXPECT_EQ(runner.Response()->GetError(), 119);
    EXPECT_EQ(runner.asked, (Texts{"NeedPermission", "CheckPermission", "SkipPermission"}));
    EXPECT_EQ(Connects(), 0);
}

TEST_F(SocketTest, AForgivenRefusalGoesToTheDaemon) {
    TestRunner runner;
    runner.needsPermission = true;
    runner.permissionError = 119;
    runner.skipsPermission = true;
    EXPECT_TRUE(CallGood(runner, "success"));
    EXPECT_EQ(Connects(), 1);
}

TEST_F(SocketTest, ASharingLinkMeetsItsOwnGate) {
    TestRunner runner;
    runner.Request()->InitEnv(J(R"({"HTTP_X_FAKE_SHARING": "hash"})"));
    ASSERT_TRUE(runner.Request()->IsSharing());
    runner.sharingError = 126;
    EXPECT_FALSE(CallGood(runner, "success"));
    EXPECT_EQ(runner.asked, (Texts{"CheckSharingPermission", "SkipPermission"}));
    EXPECT_EQ(Connects(), 0);
}

// ---- uploads ----

class SocketUpload : public SocketTest {
protected:
    SocketUpload() {
        runner.Request()->InitEnv(
            J(R"({"REQUEST_METHOD": "POST", "CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
        EXPECT_TRUE(runner.Request()->IsUploadRequest());
    }

    bool Process(const std::string& method) {
        Name(runner, "ZOVA.Test.Good", 1, method);
        runner.InitLibDesc(runner.Descriptions(), "ZOVA.Test.Good");
        EXPECT_TRUE(runner.AddAPIInfo(runner.Request()));
        return runner.ProcessSocket(runner.Request(), runner.Response());
    }

    TestRunner runner;
};

TEST_F(SocketUpload, IsTakenBeforeTheDaemonIsAsked) {
    runner.uploadedParams = J(R"({"postParam": {"file": {"path": "/tmp/part"}}})");
    EXPECT_TRUE(Process("takes"));
    EXPECT_EQ(runner.asked, (Texts{"NeedPermission", "HandleUpload"}));
    EXPECT_EQ(received["req"]["param"]["file"]["path"].asString(), "/tmp/part");
}

TEST_F(SocketUpload, IsRefusedForAMethodThatTakesNone) {
    EXPECT_FALSE(Process("success"));
    EXPECT_EQ(runner.asked, (Texts{"NeedPermission"}));
    EXPECT_EQ(Connects(), 0);
}

TEST_F(SocketUpload, ThatFailsEndsTheCallWithItsError) {
    runner.uploadError = 108;
    EXPECT_FALSE(Process("takes"));
    EXPECT_EQ(runner.Response()->GetError(), 108);
    EXPECT_EQ(Connects(), 0);
}

TEST_F(SocketUpload, ItsFormFieldsNeverChangeTheCallThatWasAdmitted) {
    runner.uploadedParams = J(R"({"postParam": {"api": "ZOVA.Test.Other", "version": 2, "method": "gives"}})");
    EXPECT_TRUE(Process("takes"));
    ZOVA::APIRequest atDaemon{Json::Value()};
    Json::Value sections = received["req"];
    atDaemon.Deserialize(sections);
    EXPECT_EQ(atDaemon.GetAPIClass(), "ZOVA.Test.Good");
    EXPECT_EQ(atDaemon.GetAPIVersion(), 1);
    EXPECT_EQ(atDaemon.GetAPIMethod(), "takes");
}

}  // namespace
