// Requests to a real peer over TLS on the loopback, one that answers badly where it is asked to.

#include <fcntl.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdio>
#include <fstream>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/JsonText.h"
#include "zovacredential/RelayError.h"
#include "zovacredential/RelayRequest.h"

namespace {

using reference::RelayError;
using Clock = std::chrono::steady_clock;
using std::string_literals::operator""s;

constexpr const char* kMultipart = "multipart/form-data; boundary=edge";
const std::string kToken(64, 'a');

/** The server's process. */
class PeerServer {
public:
    explicit PeerServer(const std::string& place = InRoot("/peer")) : folder(place) {
        mkdir(folder.c_str(), 0700);
        int ends[2];
        if (pipe2(ends, O_CLOEXEC) != 0) {
            return;
        }
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_adddup2(&actions, ends[1], STDOUT_FILENO);
        std::string script = ZOVA_PEER_SERVER;
        char* arguments[] = {script.data(), folder.data(), nullptr};
        if (posix_spawn(&process, script.c_str(), &actions, nullptr, arguments, environ) != 0) {
            process = -1;
        }
        posix_spawn_file_actions_destroy(&actions);
        close(ends[1]);
        FILE* output = fdopen(ends[0], "r");
        char text[128] = "";
        if (fscanf(output, "%d %d %127s", &port, &plainPort, text) == 3) {
            pin = text;
        }
        fclose(output);
    }
    PeerServer(const PeerServer&) = delete;
    PeerServer& operator=(const PeerServer&) = delete;
    ~PeerServer() {
        if (process > 0) {
            kill(process, SIGTERM);
            waitpid(process, nullptr, 0);
        }
    }

    std::string folder;
    int port = 0;
    int plainPort = 0;
    std::string pin;

private:
    pid_t process = -1;
};

/** The outcome of one request. */
struct Outcome {
    int number = -1;
    bool ran = false;
    int error = 0;
    std::string answer;
    double seconds = 0;

    bool IsGood() const { return ran && error == 0; }
};

std::ostream& operator<<(std::ostream& out, const Outcome& outcome) {
    return out << "number " << outcome.number << ", error " << outcome.error << ", " << outcome.seconds << " s, "
               << outcome.answer.substr(0, 200);
}

/** A device with one peer, number 2, at which alice has a token. */
class Relay : public DeviceTest {
protected:
    static void SetUpTestSuite() { server = new PeerServer; }
    static void TearDownTestSuite() { delete server; }

    void SetUp() override {
        DeviceTest::SetUp();
        ASSERT_NE(server->pin, "") << "the peer does not start";
        record["host"] = "peer.example";
        record["address"] = "127.0.0.1";
        record["port"] = server->port;
        record["pin"] = server->pin;
        record["users"]["alice"]["uid"] = Json::UInt(kAliceUid);
        record["users"]["alice"]["token"] = kToken;
    }

    void WriteTable() {
        Json::Value table(Json::objectValue);
        table["peers"]["2"] = record;
        WriteFile(InRoot("/etc/zova/peers.json"), reference::WriteJson(table));
    }

    template <class Add>
    Outcome Ask(const std::string& path, long timeout, const Add& add) {
        record["path"] = path;
        WriteTable();
        const auto begun = Clock::now();
        ZOVA::CredRequestMgr requests;
        Outcome outcome;
        outcome.number = add(requests);
        if (outcome.number >= 0) {
            requests.GetRequest(outcome.number)->SetResponseTimeout(timeout);
            outcome.ran = requests.Run();
            outcome.answer = requests.GetResponse(outcome.number);
        }
        outcome.error = requests.GetError();
        outcome.seconds = std::chrono::duration<double>(Clock::now() - begun).count();
        return outcome;
    }

    Outcome Call(const std::string& path, long timeout = 0, const Json::Value& params = Json::Value()) {
        return Ask(path, timeout, [&](ZOVA::CredRequestMgr& requests) {
            return requests.AddWebAPIRequest(2, "ZOVA.Core.User", 1, "get", params);
        });
    }

    static Json::Value Headers(const std::string& length, const std::string& type = kMultipart) {
        Json::Value headers(Json::objectValue);
        headers["Content-Type"] = type;
        headers["Content-Length"] = length;
        return headers;
    }

    Outcome Upload(const std::string& path, FILE* in, const Json::Value& headers, FILE* out = nullptr) {
        return Ask(path, 0, [&](ZOVA::CredRequestMgr& requests) {
            return requests.AddRelayRequest(2, "ZOVA.Core.User", 1, "set", headers, in, out);
        });
    }

    static Json::Value Parsed(const Outcome& outcome) {
        Json::Value value;
        EXPECT_TRUE(reference::ParseJson(outcome.answer, value)) << outcome;
        return value;
    }

    static void ExpectError(const Outcome& outcome, RelayError error) {
        EXPECT_EQ(outcome.error, static_cast<int>(error)) << outcome;
        EXPECT_FALSE(outcome.ran);
        EXPECT_EQ(outcome.answer, "");
    }

    static inline PeerServer* server = nullptr;
    Json::Value record;
    /** Alice has passed the gate. */
    ScopedVariable user{"ZOVA_WEBAPI_USERNAME", "alice"};
};

/** A stream over a text, as a body of an upload. */
class BodyStream {
public:
    explicit BodyStream(const std::string& text) : content(text) {
        stream = fmemopen(content.data(), content.size(), "r");
    }
    BodyStream(const BodyStream&) = delete;
    BodyStream& operator=(const BodyStream&) = delete;
    ~BodyStream() { fclose(stream); }

    FILE* Get() { return stream; }

private:
    std::string content;
    FILE* stream;
};

}  // namespace

// ---- good answers ----

TEST_F(Relay, ACallIsAFormWithTheUsersTokenInItsBodyAndNothingInTheUrl) {
    Json::Value params(Json::objectValue);
    params["text"] = "1";
    params["list"].append("a&b");
    params["_sid"] = "the local session";
    const Outcome outcome = Call("/echo", 0, params);
    ASSERT_TRUE(outcome.IsGood()) << outcome;
    const Json::Value request = Parsed(outcome);
    EXPECT_EQ(request["method"], "POST");
    EXPECT_EQ(request["target"], "/echo");
    EXPECT_EQ(request["body"].asString(), "tid=" + kToken +
                                              "&api=ZOVA.Core.User&version=1&method=get&list=%5B%22a%26b%22%5D&text="
                                              "%221%22");
    const Json::Value& headers = request["headers"];
    EXPECT_EQ(headers["content-type"], "application/x-www-form-urlencoded");
    EXPECT_EQ(headers["host"].asString(), "peer.example:" + std::to_string(server->port));
    EXPECT_EQ(headers.getMemberNames(), (std::vector<std::string>{"accept", "content-length", "content-type", "host"}));
}

TEST_F(Relay, AnUploadIsTheBodyAsItStandsWithTheCallInTheUrl) {
    BodyStream body("--edge\r\nanything\0 at all"s + "\r\n--edge--\r\nnot this");
    const std::string sent = "--edge\r\nanything\0 at all"s + "\r\n--edge--\r\n";
    const Outcome outcome = Upload("/echo", body.Get(), Headers(std::to_string(sent.size())));
    ASSERT_TRUE(outcome.IsGood()) << outcome;
    const Json::Value request = Parsed(outcome);
    EXPECT_EQ(request["target"].asString(), "/echo?tid=" + kToken + "&api=ZOVA.Core.User&version=1&method=set");
    EXPECT_EQ(request["body"].asString(), sent);
    EXPECT_EQ(request["headers"]["content-type"], kMultipart);
    EXPECT_EQ(request["headers"]["content-length"].asString(), std::to_string(sent.size()));
}

TEST_F(Relay, AnUploadGoesOnFromWhereItsStreamStands) {
    BodyStream body("already read--edge--");
    ASSERT_EQ(fseek(body.Get(), 12, SEEK_SET), 0);
    const Outcome outcome = Upload("/echo", body.Get(), Headers("8"));
    EXPECT_EQ(Parsed(outcome)["body"], "--edge--");
}

TEST_F(Relay, AnAnswerMayHaveNoBodyInterimAnswersBeforeItOrSixteenMebibytes) {
    const Outcome empty = Call("/empty");
    EXPECT_TRUE(empty.IsGood()) << empty;
    EXPECT_EQ(empty.answer, "");
    EXPECT_TRUE(Call("/interim").IsGood());
    const Outcome largest = Call("/largest");
    EXPECT_TRUE(largest.IsGood()) << largest.error;
    EXPECT_EQ(largest.answer, std::string(16 << 20, 'x'));
}

TEST_F(Relay, AnAnswerBeforeTheEndOfAnUploadCounts) {
    // More than fits into the buffers between the two.
    const std::string body(8 << 20, 'u');
    BodyStream stream(body);
    const std::string length = std::to_string(body.size());
    for (const char* path : {"/early", "/full"}) {
        ASSERT_EQ(fseek(stream.Get(), 0, SEEK_SET), 0);
        const Outcome outcome = Upload(path, stream.Get(), Headers(length));
        EXPECT_TRUE(outcome.IsGood()) << path << ": " << outcome;
        EXPECT_EQ(outcome.answer, "{\"early\":true}") << path;
        EXPECT_LT(outcome.seconds, 4.0) << path << ": nothing more is sent";
    }
}

TEST_F(Relay, RequestsRunInTheirOrderAndOnce) {
    record["path"] = "/echo";
    WriteTable();
    ZOVA::CredRequestMgr requests;
    const int first = requests.AddWebAPIRequest(2, "ZOVA.A", 1, "first", Json::Value());
    const int second = requests.AddWebAPIRequest(2, "ZOVA.A", 1, "second", Json::Value());
    EXPECT_EQ(requests.GetResponse(first), "") << "not yet";
    EXPECT_TRUE(requests.Run());
    EXPECT_TRUE(requests.Run()) << "nothing is left to do";
    EXPECT_NE(requests.GetResponse(first).find("method=first"), std::string::npos);
    EXPECT_NE(requests.GetResponse(second).find("method=second"), std::string::npos);
    for (const int number : {-1, 2, 2147483647}) {
        EXPECT_EQ(requests.GetResponse(number), "");
        EXPECT_EQ(requests.GetRequest(number), nullptr);
    }
}

TEST_F(Relay, NothingToDoIsNoFailure) {
    ZOVA::CredRequestMgr requests;
    EXPECT_TRUE(requests.Run());
    EXPECT_EQ(requests.GetError(), 0);
}

TEST_F(Relay, NoProxyOfTheEnvironmentStandsBetween) {
    const ScopedVariable https("https_proxy", "http://127.0.0.1:1/");
    const ScopedVariable all("ALL_PROXY", "http://127.0.0.1:1/");
    const ScopedVariable client("HTTP_PROXY", "http://127.0.0.1:1/");
    EXPECT_TRUE(Call("/echo").IsGood());
}

TEST_F(Relay, NoProcessIsEndedByAPeerThatIsGone) {
    const std::string body(8 << 20, 'u');
    BodyStream stream(body);
    EXPECT_EQ(StatusOfChild([&] {
                  signal(SIGPIPE, SIG_DFL);
                  return Upload("/gone", stream.Get(), Headers(std::to_string(body.size()))).ran ? 1 : 0;
              }),
              0);
}

// ---- who the peer is ----

TEST_F(Relay, ThePinAloneMakesAPeerKnown) {
    EXPECT_TRUE(Call("/echo").IsGood());
    record["pin"] = "sha256//AAECAwQFBgcICQoLDA0ODxAREhMUFRYXGBkaGxwdHh8=";
    ExpectError(Call("/echo"), RelayError::kNotTrusted);
}

TEST_F(Relay, AnAuthorityAloneMakesAPeerKnown) {
    record.removeMember("pin");
    record["ca_file"] = server->folder + "/certificate.pem";
    EXPECT_TRUE(Call("/echo").IsGood());
}

TEST_F(Relay, APeerThatTheAuthorityDoesNotVouchForIsRefusedWhateverItsPin) {
    const PeerServer other(InRoot("/other-peer"));
    ASSERT_NE(other.pin, server->pin);
    record["ca_file"] = other.folder + "/certificate.pem";
    ExpectError(Call("/echo"), RelayError::kNotTrusted);
    record.removeMember("pin");
    ExpectError(Call("/echo"), RelayError::kNotTrusted);
}

TEST_F(Relay, AnAuthorityDoesNotTakeThePlaceOfThePin) {
    record["ca_file"] = server->folder + "/certificate.pem";
    EXPECT_TRUE(Call("/echo").IsGood());
    record["pin"] = "sha256//AAECAwQFBgcICQoLDA0ODxAREhMUFRYXGBkaGxwdHh8=";
    ExpectError(Call("/echo"), RelayError::kNotTrusted);
}

TEST_F(Relay, AnAuthorityThatIsNoCertificateVouchesForNobody) {
    WriteFile(InRoot("/scratch/ca.pem"), "no certificate");
    record["ca_file"] = InRoot("/scratch/ca.pem");
    ExpectError(Call("/echo"), RelayError::kNotTrusted);
}

TEST_F(Relay, TheNameInTheCertificateHasToBeTheHostInAnyCase) {
    record["host"] = "other.example";
    ExpectError(Call("/echo"), RelayError::kNotTrusted);
    record["host"] = "127.0.0.2";
    ExpectError(Call("/echo"), RelayError::kNotTrusted);
    record["host"] = "127.0.0.1";
    EXPECT_TRUE(Call("/echo").IsGood());
}

TEST_F(Relay, APeerWithoutTlsIsToldNothing) {
    record["port"] = server->plainPort;
    ExpectError(Call("/echo"), RelayError::kNotTrusted);
}

// ---- bad answers ----

TEST_F(Relay, EveryBadAnswerHasItsNumber) {
    const std::pair<const char*, RelayError> rows[] = {
        {"/status", RelayError::kStatus},    {"/redirect", RelayError::kStatus},  {"/large", RelayError::kTooLarge},
        {"/endless", RelayError::kTooLarge}, {"/headers", RelayError::kTooLarge}, {"/garbage", RelayError::kBroken},
        {"/close", RelayError::kBroken},     {"/short", RelayError::kBroken},     {"/chunk", RelayError::kBroken},
        {"/cut", RelayError::kBroken}};
    for (const auto& [path, error] : rows) {
        SCOPED_TRACE(path);
        ExpectError(Call(path), error);
    }
}

TEST_F(Relay, APeerThatDoesNotListenHasNoConnection) {
    record["port"] = 1;
    ExpectError(Call("/echo"), RelayError::kNoConnection);
}

TEST_F(Relay, ASlowPeerIsWaitedForAsLongAsAsked) {
    for (const char* path : {"/slow", "/drip"}) {
        const Outcome outcome = Call(path, 2);
        ExpectError(outcome, RelayError::kTimeout);
        EXPECT_GE(outcome.seconds, 1.0);
        EXPECT_LT(outcome.seconds, 10.0);
    }
}

TEST_F(Relay, TheTimeOutIsTheLibrarysOwnUnlessOneIsAskedForAndBounded) {
    reference::RelayRequest plain;
    EXPECT_EQ(plain.answerSeconds, 60);
    EXPECT_TRUE(Call("/echo", -5).IsGood());
    EXPECT_TRUE(Call("/echo", 9223372036854775807).IsGood()) << "no overflow";
}

// ---- what cannot be sent ----

TEST_F(Relay, WithoutATableAPeerOrACredentialNothingIsQueued) {
    {
        ZOVA::CredRequestMgr requests;
        EXPECT_LT(requests.AddWebAPIRequest(2, "ZOVA.A", 1, "get", Json::Value()), 0);
        EXPECT_EQ(requests.GetError(), static_cast<int>(RelayError::kNoTable));
    }
    WriteTable();
    ZOVA::CredRequestMgr requests;
    EXPECT_LT(requests.AddWebAPIRequest(3, "ZOVA.A", 1, "get", Json::Value()), 0);
    EXPECT_EQ(requests.GetError(), static_cast<int>(RelayError::kUnknownPeer));
    for (const char* other : {"boss", "", static_cast<const char*>(nullptr)}) {
        const ScopedVariable somebody("ZOVA_WEBAPI_USERNAME", other);
        EXPECT_LT(requests.AddWebAPIRequest(2, "ZOVA.A", 1, "get", Json::Value()), 0);
        EXPECT_EQ(requests.GetError(), static_cast<int>(RelayError::kNoCredential));
    }
    EXPECT_EQ(requests.GetRequest(0), nullptr);
}

TEST_F(Relay, ParametersThatAreNoObjectAreNotQueued) {
    for (const Json::Value& params : {Json::Value(5), Json::Value("a=b"), Json::Value(Json::arrayValue)}) {
        const Outcome outcome = Call("/echo", 0, params);
        EXPECT_LT(outcome.number, 0);
        EXPECT_EQ(outcome.error, static_cast<int>(RelayError::kBadRequest));
    }
}

TEST_F(Relay, HeadersThatCouldSayMoreThanTheyShouldAreNotQueued) {
    BodyStream body("--edge--");
    const std::string type = kMultipart;
    const Json::Value rows[] = {Json::Value(),
                                Json::Value("x"),
                                Headers(""),
                                Headers("0"),
                                Headers("-1"),
                                Headers("+8"),
                                Headers("8 "),
                                Headers("8\r\nX: y"),
                                Headers("0x8"),
                                Headers("8.0"),
                                Headers("99999999999999999999"),
                                Headers("9223372036854775807"),
                                Headers("8", ""),
                                Headers("8", type + "\r\nX: y"),
                                Headers("8", type + "\n"),
                                Headers("8", type + std::string(1, '\0')),
                                Headers("8", "multipart/form-data"),
                                Headers("8", "application/octet-stream"),
                                Headers("8", "text/plain; x=multipart/form-data"),
                                Headers("8", type + "; x=" + std::string(1024, 'x'))};
    for (const Json::Value& headers : rows) {
        const Outcome outcome = Upload("/echo", body.Get(), headers);
        EXPECT_LT(outcome.number, 0) << reference::WriteJson(headers);
        EXPECT_EQ(outcome.error, static_cast<int>(RelayError::kBadRequest)) << reference::WriteJson(headers);
    }
    Json::Value number = Headers("8");
    number["Content-Length"] = 8;
    EXPECT_LT(Upload("/echo", body.Get(), number).number, 0) << "no text";
    EXPECT_LT(Upload("/echo", nullptr, Headers("8")).number, 0) << "no body";
    EXPECT_LT(Upload("/echo", body.Get(), Headers("8"), stderr).number, 0) << "an answer for a file";
}

TEST_F(Relay, ABodyThatEndsEarlyEndsTheRequest) {
    BodyStream body("--edge");
    ExpectError(Upload("/echo", body.Get(), Headers("100")), RelayError::kClientGone);
}

TEST_F(Relay, ABodyOfAnySizeNeedsNoMemory) {
    FILE* sparse = tmpfile();
    ASSERT_NE(sparse, nullptr);
    const off_t size = off_t{200} << 20;
    ASSERT_EQ(ftruncate(fileno(sparse), size), 0);
    const auto memory = [] {
        std::ifstream status("/proc/self/status");
        std::string line;
        long kibibytes = 0;
        while (std::getline(status, line) && sscanf(line.c_str(), "VmHWM: %ld", &kibibytes) != 1) {
        }
        return kibibytes;
    };
    EXPECT_TRUE(Call("/count").IsGood()) << "libcurl is mapped";
    const long before = memory();
    const Outcome outcome = Upload("/count", sparse, Headers(std::to_string(size)));
    ASSERT_TRUE(outcome.IsGood()) << outcome;
    EXPECT_EQ(Parsed(outcome)["length"].asInt64(), size);
#ifdef __SANITIZE_ADDRESS__
    constexpr long kMost = 32768;  // what has been given back is kept for a while
#else
    constexpr long kMost = 2048;
#endif
    EXPECT_LT(memory() - before, kMost);
    fclose(sparse);
}
