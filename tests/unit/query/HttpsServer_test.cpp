// The real libcurl against a real server on the loopback. No fake platform is active: every call is the system's own.

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <sstream>

#include "FrameworkTest.h"
#include "query/CurlLibrary.h"
#include "query/HttpQuery.h"

using unit::J;
using ZOVA::CurlLibrary;
using ZOVA::HttpQuery;

namespace {

bool IsCurlMapped() {
    std::ifstream maps("/proc/self/maps");
    std::ostringstream text;
    text << maps.rdbuf();
    return text.str().find("libcurl") != std::string::npos;
}

/** The server's process. */
class Server {
public:
    Server() {
        int ends[2];
        if (pipe2(ends, O_CLOEXEC) != 0) {
            return;
        }
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_adddup2(&actions, ends[1], STDOUT_FILENO);
        std::string script = UNIT_HTTPS_SERVER;
        std::string folder = directory.Path();
        char* arguments[] = {script.data(), folder.data(), nullptr};
        if (posix_spawn(&process, script.c_str(), &actions, nullptr, arguments, environ) != 0) {
            process = -1;
        }
        posix_spawn_file_actions_destroy(&actions);
        close(ends[1]);
        FILE* output = fdopen(ends[0], "r");
        if (fscanf(output, "%d", &port) != 1) {
            port = 0;
        }
        fclose(output);
    }
    Server(const Server&) = delete;
    Server& operator=(const Server&) = delete;
    ~Server() {
        if (process > 0) {
            kill(process, SIGTERM);
            waitpid(process, nullptr, 0);
        }
    }

    int port = 0;

private:
    unit::TemporaryDirectory directory;
    pid_t process = -1;
};

class HttpsServerTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        mappedAtFirst = IsCurlMapped();
        server = new Server;
    }
    static void TearDownTestSuite() {
        delete server;
        server = nullptr;
    }

    void SetUp() override { ASSERT_NE(server->port, 0) << "no server"; }

    bool Query(const std::string& path) {
        return HttpQuery(library, "https://127.0.0.1:" + std::to_string(server->port) + path, headers, body);
    }

    static bool mappedAtFirst;
    static Server* server;

    unit::EnvironmentScope environment;
    CurlLibrary library;
    std::string headers = "X-First: 1\nX-Second: two";
    std::string body = "token=a&b=c";
};

bool HttpsServerTest::mappedAtFirst = false;
Server* HttpsServerTest::server = nullptr;

TEST_F(HttpsServerTest, MapsLibcurlAtTheFirstQueryAndNotBefore) {
    EXPECT_FALSE(mappedAtFirst);
    EXPECT_TRUE(Query("/echo"));
    EXPECT_TRUE(IsCurlMapped());
}

TEST_F(HttpsServerTest, PostsBodyAndHeadersToAServerWithAnyCertificate) {
    ASSERT_TRUE(Query("/echo"));
    const Json::Value echo = J(body);
    EXPECT_EQ(echo["method"].asString(), "POST");
    EXPECT_EQ(echo["body"].asString(), "token=a&b=c");
    EXPECT_EQ(echo["headers"]["x-first"].asString(), "1");
    EXPECT_EQ(echo["headers"]["x-second"].asString(), "two");
    EXPECT_EQ(headers.substr(0, 9), "HTTP/1.0 ") << headers;
    EXPECT_NE(headers.find("X-Mark: from the server\r\n"), std::string::npos) << headers;
}

TEST_F(HttpsServerTest, AnEmptyBodyIsAPostToo) {
    body.clear();
    ASSERT_TRUE(Query("/echo"));
    EXPECT_EQ(J(body)["method"].asString(), "POST");
    EXPECT_EQ(J(body)["headers"]["content-length"].asString(), "0");
}

TEST_F(HttpsServerTest, TheAnswerIsCutAtItsFirstNul) {
    EXPECT_TRUE(Query("/nul"));
    EXPECT_EQ(body, "ab");
}

TEST_F(HttpsServerTest, AnErrorStatusIsAnAnswer) {
    EXPECT_TRUE(Query("/error"));
    EXPECT_EQ(body, "sorry");
}

TEST_F(HttpsServerTest, ARedirectIsAnAnswerAndIsNotFollowed) {
    EXPECT_TRUE(Query("/redirect"));
    EXPECT_EQ(body, "moved");
}

TEST_F(HttpsServerTest, AProxyOfTheEnvironmentIsNotUsed) {
    for (const char* name : {"https_proxy", "HTTPS_PROXY", "all_proxy", "ALL_PROXY", "http_proxy", "HTTP_PROXY"}) {
        setenv(name, "http://127.0.0.1:1/", 1);
    }
    EXPECT_TRUE(Query("/echo"));
}

TEST_F(HttpsServerTest, AnAnswerOf17MiBIsRefused) {
    std::ostringstream output;
    std::streambuf* saved = std::cout.rdbuf(output.rdbuf());
    EXPECT_FALSE(Query("/large"));
    std::cout.rdbuf(saved);
    EXPECT_EQ(output.str(), "not enough memory (realloc returned NULL)");
    EXPECT_EQ(body, "token=a&b=c");
    EXPECT_EQ(headers, "X-First: 1\nX-Second: two");
}

TEST_F(HttpsServerTest, AnAnswerThatStopsInTheMiddleIsNone) {
    EXPECT_FALSE(Query("/short"));
    EXPECT_EQ(body, "token=a&b=c");
    EXPECT_EQ(headers, "X-First: 1\nX-Second: two");
}

TEST_F(HttpsServerTest, AConnectionThatFailsLeavesHeadersAndBody) {
    EXPECT_FALSE(HttpQuery(library, "https://127.0.0.1:1/", headers, body));
    EXPECT_EQ(body, "token=a&b=c");
    EXPECT_EQ(headers, "X-First: 1\nX-Second: two");
}

TEST_F(HttpsServerTest, NoOtherProtocolIsSpoken) {
    for (const char* url : {"http://127.0.0.1:1/", "file:///etc/hostname", "ftp://127.0.0.1/", "gopher://127.0.0.1/"}) {
        EXPECT_FALSE(HttpQuery(library, url, headers, body)) << url;
        EXPECT_EQ(body, "token=a&b=c");
    }
}

}  // namespace
