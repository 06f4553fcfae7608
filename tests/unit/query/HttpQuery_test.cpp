// One transfer: what libcurl is told, what is taken from it, and what a failure leaves.

#include "query/HttpQuery.h"

#include <cerrno>
#include <csignal>
#include <iostream>
#include <sstream>

#include "FrameworkTest.h"
#include "query/CurlLibrary.h"

using ZOVA::CurlLibrary;
using ZOVA::HttpQuery;

namespace {

using Texts = std::vector<std::string>;

constexpr const char* kUrl = "https://idp.example/";

class HttpQueryTest : public unit::FrameworkTest {
protected:
    HttpQueryTest() { platform.httpServers[kUrl] = {{"HTTP/1.1 200 OK\r\n", "A: b\r\n", "\r\n"}, {"an", "swer"}}; }
    ~HttpQueryTest() override { EXPECT_EQ(platform.curlObjects, 0) << "something of libcurl was not given back"; }

    bool Query() { return HttpQuery(library, kUrl, headers, body); }

    void ExpectFailureThatLeavesEverything() {
        EXPECT_FALSE(Query());
        EXPECT_EQ(headers, "X-A: 1\nX-B: 2");
        EXPECT_EQ(body, "a=1");
    }

    CurlLibrary library;
    std::string headers = "X-A: 1\nX-B: 2";
    std::string body = "a=1";
};

TEST_F(HttpQueryTest, PostsTheBodyWithinItsConfines) {
    EXPECT_TRUE(Query());
    ASSERT_EQ(platform.httpRequests.size(), 1U);
    const std::map<std::string, std::string> expected = {
        {"URL", kUrl}, {"SSL_VERIFYHOST", "0"}, {"SSL_VERIFYPEER", "0"},    {"TIMEOUT", "60"}, {"POSTFIELDS", "a=1"},
        {"PROXY", ""}, {"FOLLOWLOCATION", "0"}, {"PROTOCOLS_STR", "https"}, {"NOSIGNAL", "1"}};
    EXPECT_EQ(platform.httpRequests[0].options, expected);
    EXPECT_EQ(platform.httpRequests[0].headers, (Texts{"X-A: 1", "X-B: 2"}));
}

TEST_F(HttpQueryTest, GivesBodyAndHeadersInOnePiece) {
    EXPECT_TRUE(Query());
    EXPECT_EQ(body, "answer");
    EXPECT_EQ(headers, "HTTP/1.1 200 OK\r\nA: b\r\n\r\n");
}

TEST_F(HttpQueryTest, NeitherStatusNorAnEmptyAnswerIsAFailure) {
    platform.httpServers[kUrl] = {{"HTTP/1.1 500 No\r\n"}, {}};
    EXPECT_TRUE(Query());
    EXPECT_EQ(body, "");
    EXPECT_EQ(headers, "HTTP/1.1 500 No\r\n");
}

TEST_F(HttpQueryTest, TheAnswerIsCutAtItsFirstNul) {
    platform.httpServers[kUrl].body = {std::string("ab\0", 3), "cd"};
    EXPECT_TRUE(Query());
    EXPECT_EQ(body, "ab");
}

TEST_F(HttpQueryTest, TheRequestIsSentAsItCameNulIncluded) {
    body = std::string("a\0b", 3);
    EXPECT_TRUE(Query());
    EXPECT_EQ(platform.httpRequests[0].options.at("POSTFIELDS"), std::string("a\0b", 3));
}

TEST_F(HttpQueryTest, EmptyHeaderLinesAreLeftOut) {
    const std::pair<const char*, Texts> rows[] = {
        {"", {}}, {"\n\n", {}}, {"A: 1", {"A: 1"}}, {"A: 1\n", {"A: 1"}}, {"\nA: 1\n\n\nB: 2\n", {"A: 1", "B: 2"}}};
    for (const auto& [text, lines] : rows) {
        platform.httpRequests.clear();
        headers = text;
        EXPECT_TRUE(Query());
        EXPECT_EQ(platform.httpRequests[0].headers, lines) << text;
    }
}

TEST_F(HttpQueryTest, AConnectionThatFailsLeavesHeadersAndBody) {
    platform.httpServers.clear();
    ExpectFailureThatLeavesEverything();
}

TEST_F(HttpQueryTest, EveryCallOfLibcurlMayFailAndNothingIsLeftBehind) {
    int number = 1;
    for (;; ++number) {
        // The library as it is after an earlier use, so that only calls of libcurl are failed here.
        ASSERT_NE(library.Open(), nullptr);
        platform.FailCall(number);
        const bool answered = Query();
        if (platform.FailedCall().empty()) {
            EXPECT_TRUE(answered);
            break;
        }
        EXPECT_FALSE(answered) << platform.FailedCall();
        EXPECT_EQ(headers, "X-A: 1\nX-B: 2") << platform.FailedCall();
        EXPECT_EQ(body, "a=1") << platform.FailedCall();
        EXPECT_EQ(platform.curlObjects, 0) << platform.FailedCall();
    }
    EXPECT_EQ(number, 20) << "handle, two header lines, sixteen options, transfer";
}

TEST_F(HttpQueryTest, AnAnswerAtTheLimitIsTakenWhole) {
    platform.httpServers[kUrl].body = {std::string(ZOVA::kLargestAnswer - 1, 'x'), "y"};
    EXPECT_TRUE(Query());
    EXPECT_EQ(body.size(), ZOVA::kLargestAnswer);
}

TEST_F(HttpQueryTest, AnAnswerBeyondTheLimitEndsTheTransferAndSaysSoOnStandardOutput) {
    platform.httpServers[kUrl].body = {std::string(ZOVA::kLargestAnswer, 'x'), "y"};
    std::ostringstream output;
    std::streambuf* saved = std::cout.rdbuf(output.rdbuf());
    ExpectFailureThatLeavesEverything();
    std::cout.rdbuf(saved);
    EXPECT_EQ(output.str(), "not enough memory (realloc returned NULL)");
}

TEST_F(HttpQueryTest, AStreamThatThrowsNeverUnwindsThroughLibcurl) {
    platform.httpServers[kUrl].body = {std::string(ZOVA::kLargestAnswer + 1, 'x')};
    std::streambuf* saved = std::cout.rdbuf(nullptr);
    const std::ios_base::iostate state = std::cout.exceptions();
    std::cout.clear(std::ios_base::badbit);
    EXPECT_THROW(std::cout.exceptions(std::ios_base::badbit), std::ios_base::failure);
    ExpectFailureThatLeavesEverything();
    std::cout.exceptions(std::ios_base::goodbit);
    std::cout.rdbuf(saved);
    std::cout.exceptions(state);
}

TEST_F(HttpQueryTest, AHeaderBlockBeyondItsLimitEndsTheTransfer) {
    platform.httpServers[kUrl].headers = {std::string(ZOVA::kLargestHeaderBlock, 'x')};
    EXPECT_TRUE(Query());
    headers = "X-A: 1\nX-B: 2";
    body = "a=1";
    platform.httpServers[kUrl].headers.emplace_back("y");
    ExpectFailureThatLeavesEverything();
}

TEST_F(HttpQueryTest, APeerThatClosesItsEndDoesNotEndTheProcess) {
    EXPECT_TRUE(Query());
    EXPECT_EQ(platform.CallsOf({"curl_easy_perform"}), (Texts{"curl_easy_perform(https://idp.example/)"}));
}

TEST_F(HttpQueryTest, TheDispositionOfBrokenPipesIsAsBefore) {
    struct sigaction mine {};
    mine.sa_handler = [](int) {};
    struct sigaction before {};
    sigaction(SIGPIPE, &mine, &before);
    EXPECT_TRUE(Query());
    struct sigaction after {};
    sigaction(SIGPIPE, &before, &after);
    EXPECT_EQ(after.sa_handler, mine.sa_handler);
}

// ---- the library itself ----

TEST_F(HttpQueryTest, OpensTheLibraryAtItsFirstUseAndOnce) {
    EXPECT_EQ(platform.CountOf("dlopen"), 0);
    EXPECT_TRUE(Query());
    EXPECT_TRUE(Query());
    EXPECT_EQ(platform.CallsOf({"dlopen"}), (Texts{"dlopen(libcurl.so.4)"}));
    EXPECT_EQ(platform.CountOf("dlclose"), 0);
}

TEST_F(HttpQueryTest, ALibraryThatCannotBeOpenedIsLoggedAndTriedAgain) {
    platform.Fail("dlopen", ENOENT, 0, 1);
    ExpectFailureThatLeavesEverything();
    ExpectLog(LOG_ERR, "cannot open library: libcurl.so.4. error = made-up loading error", "CurlLibrary.cpp");
    EXPECT_TRUE(Query());
}

TEST_F(HttpQueryTest, ALibraryThatLacksAFunctionIsAsOneThatCannotBeOpened) {
    for (int function = 0; function < 6; ++function) {
        platform.StopFailing();
        platform.Fail("dlsym", ENOENT, function, 1);
        ExpectFailureThatLeavesEverything();
        ExpectLog(LOG_ERR, "cannot open library: libcurl.so.4. error = made-up symbol error", "CurlLibrary.cpp");
    }
    EXPECT_TRUE(platform.httpRequests.empty());
}

}  // namespace
