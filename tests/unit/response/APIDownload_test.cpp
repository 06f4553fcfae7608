#include "webapi/APIDownload.h"

#include <cstdio>
#include <functional>

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"

using unit::J;
using ZOVA::APIDownload;
using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

constexpr const char* kJsonLine = "Content-type: application/json; charset=\"UTF-8\"\r\n";

class APIDownloadTest : public unit::FrameworkTest {
protected:
    /** What comes out on standard output meanwhile. */
    static std::string Printed(const std::function<void()>& body) {
        testing::internal::CaptureStdout();
        body();
        fflush(stdout);
        return testing::internal::GetCapturedStdout();
    }

    static std::string OutputOf(APIDownload& download, const std::string& path) {
        return Printed([&] { EXPECT_TRUE(download.Output(path)); });
    }

    static std::string OutputOf(APIDownload& download, FILE* stream) {
        return Printed([&] { EXPECT_TRUE(download.Output(stream)); });
    }

    APIRequest request{Json::Value()};
    APIResponse response{&request};
};

// ---- headers ----

TEST_F(APIDownloadTest, OnANullResponseAnswersFalseToSetHeader) {
    APIDownload download(nullptr);
    EXPECT_FALSE(download.SetHeader("X", "1"));
    EXPECT_FALSE(download.SetHeader(J(R"({"X": "1"})")));
    EXPECT_TRUE(download.SetHeader(J(R"({"X": 1})"))) << "nothing had to be set";
    EXPECT_TRUE(download.SetHeader(J("{}")));
}

TEST_F(APIDownloadTest, OnANullResponsePrintsNoHeaderAndSendsAllTheSame) {
    APIDownload download(nullptr);
    EXPECT_EQ(OutputOf(download, "/a"), "</a, type of//a>");
}

TEST_F(APIDownloadTest, WithoutAResponseHasOneOfItsOwnWithItsDefaultHeader) {
    APIDownload download;
    EXPECT_TRUE(download.SetHeader("X", "1"));
    EXPECT_EQ(OutputOf(download, "/a"), std::string(kJsonLine) + "X: 1\r\n</a, type of//a>");
}

TEST_F(APIDownloadTest, AnObjectWithANumberSetsTheTextsSkipsTheNumberAndReturnsTrue) {
    APIDownload download(&response);
    EXPECT_TRUE(download.SetHeader(J(R"({"A": "1", "B": 2, "C": "3", "D": null, "E": ["x"], "F": {"G": "x"}})")));
    EXPECT_JSON(response.GetHeaders(),
                R"({"A": "1", "C": "3", "Content-type": "application/json; charset=\"UTF-8\""})");
}

TEST_F(APIDownloadTest, SetHeaderWithTheEmptyNameReturnsFalse) {
    APIDownload download(&response);
    EXPECT_FALSE(download.SetHeader("", "x"));
    EXPECT_JSON(response.GetHeaders(), R"({"Content-type": "application/json; charset=\"UTF-8\""})");
}

TEST_F(APIDownloadTest, AnObjectIsSetUpToTheFirstHeaderThatIsRefused) {
    APIDownload download(&response);
    // The empty name comes first in the object's order.
    EXPECT_FALSE(download.SetHeader(J(R"({"": "refused", "X": "1"})")));
    EXPECT_FALSE(response.HasHeader("X"));
}

TEST_F(APIDownloadTest, AnythingButAnObjectHoldsNoHeaderAndIsNoFailure) {
    APIDownload download(&response);
    for (const char* value : {"null", "[]", "[\"A\"]", "\"A\"", "7", "true"}) {
        EXPECT_TRUE(download.SetHeader(J(value))) << value;
    }
    EXPECT_EQ(response.GetHeaders().size(), 1U);
}

TEST_F(APIDownloadTest, HeadersGoOutInTheOrderOfTheObjectWithoutAnEmptyLineBehindThem) {
    ASSERT_TRUE(response.SetHeader("X-Last", "3"));
    ASSERT_TRUE(response.SetHeader("Content-type", "video/mp4"));
    ASSERT_TRUE(response.SetHeader("A-First", ""));
    APIDownload download(&response);
    EXPECT_EQ(OutputOf(download, "/f"), "A-First: \r\nContent-type: video/mp4\r\nX-Last: 3\r\n</f, type of//f>");
}

TEST_F(APIDownloadTest, CookiesOfTheResponseAreNotPrinted) {
    ASSERT_TRUE(response.AddCookie("id", "secret", "/", 0, "", false, false));
    APIDownload download(&response);
    EXPECT_EQ(OutputOf(download, "/f"), std::string(kJsonLine) + "</f, type of//f>");
}

TEST_F(APIDownloadTest, AHeaderThatIsNoTextIsNotPrinted) {
    Json::Value document = J(R"({"headers": {"A": 1, "B": "2", "C": null, "D": []}, "option": {}, "setCookie": []})");
    response.Deserialize(document);
    APIDownload download(&response);
    EXPECT_EQ(OutputOf(download, "/f"), "B: 2\r\n</f, type of//f>");
}

TEST_F(APIDownloadTest, AResponseWhoseHeadersAreNoObjectPrintsNone) {
    for (const char* text : {R"({})", R"({"headers": []})", R"({"headers": ["a"]})", R"({"headers": "a"})", "null"}) {
        Json::Value document = J(text);
        response.Deserialize(document);
        APIDownload download(&response);
        EXPECT_EQ(OutputOf(download, "/f"), "</f, type of//f>") << text;
    }
}

TEST_F(APIDownloadTest, NoByteOfAHeaderEndsItsLine) {
    ASSERT_TRUE(response.SetHeader("X\r\nEvil", std::string("a\r\nSet-Cookie: b\n\0c", 19)));
    ASSERT_TRUE(response.SetHeader("Content-type", "text/plain"));
    APIDownload download(&response);
    EXPECT_EQ(OutputOf(download, "/f"), "Content-type: text/plain\r\nX  Evil: a  Set-Cookie: b  c\r\n</f, type of//f>");
}

// ---- MIME type ----

TEST_F(APIDownloadTest, AMimeTypeThatWasSetIsUsedAsItStandsWhateverTheName) {
    APIDownload download(nullptr);
    download.SetMimeType("x y;\"z");
    EXPECT_EQ(OutputOf(download, "/a.png"), "</a.png, x y;\"z>");
    EXPECT_EQ(platform.CountOf("HTTPFileOutputer::GetMimeType"), 0);
}

TEST_F(APIDownloadTest, AMimeTypeFromANameIsThatOfTheName) {
    APIDownload download(nullptr);
    download.SetMimeTypeFromFileName("b.jpg");
    EXPECT_EQ(OutputOf(download, "/a.png"), "</a.png, type of/b.jpg>");
}

TEST_F(APIDownloadTest, TheTypeOfTheFirstOutputStaysForTheSecond) {
    APIDownload download(nullptr);
    OutputOf(download, "/a");
    EXPECT_EQ(OutputOf(download, "/b"), "</b, type of//a>");
}

// ---- streams ----

TEST_F(APIDownloadTest, AStreamWithoutAMimeTypeIsSentAsOctetStreamAndWithoutAName) {
    APIDownload download(nullptr);
    EXPECT_EQ(OutputOf(download, stdin), "<stream, \"\", application/octet-stream>");
}

TEST_F(APIDownloadTest, AStreamIsSentWithTheHeadersAndTheMimeTypeThatWereSet) {
    APIDownload download(&response);
    download.SetMimeType("text/csv");
    EXPECT_EQ(OutputOf(download, stdin), std::string(kJsonLine) + "<stream, \"\", text/csv>");
    EXPECT_EQ(platform.CountOf("HTTPFileOutputer::GetMimeType"), 0);
}

// ---- results, life, switch ----

TEST_F(APIDownloadTest, AFailureOfTheOutputerIsTheResult) {
    platform.Fail("HTTPFileOutputer::Output", EPIPE);
    platform.Fail("HTTPFileOutputer::OutputStream", EPIPE);
    APIDownload download(nullptr);
    EXPECT_EQ(Printed([&] {
                  EXPECT_FALSE(download.Output("/a"));
                  EXPECT_FALSE(download.Output(stdin));
              }),
              "<failed><failed>");
}

TEST_F(APIDownloadTest, ASecondOutputPrintsTheHeadersAgain) {
    APIDownload download(&response);
    OutputOf(download, "/a");
    EXPECT_EQ(OutputOf(download, "/a"), std::string(kJsonLine) + "</a, type of//a>");
}

TEST_F(APIDownloadTest, DoesNotSwitchOffTheOutputOfTheResponse) {
    APIDownload download(&response);
    OutputOf(download, "/a");
    EXPECT_TRUE(response.IsEnableOutput());
}

TEST_F(APIDownloadTest, LeavesAResponseThatWasGivenToItsOwner) {
    { APIDownload download(&response); }
    EXPECT_TRUE(response.SetHeader("X", "1"));
    EXPECT_EQ(response.GetHeader("X", ""), "1");
}

TEST_F(APIDownloadTest, TheFastPathIsAskedForAndSwitchedOffForTheProcess) {
    APIDownload download(nullptr);
    EXPECT_TRUE(download.GetXSendFileEnabled());
    EXPECT_TRUE(download.SetXSendFileDisabled());
    EXPECT_FALSE(APIDownload::GetXSendFileEnabled());
    EXPECT_EQ(platform.CallsOf({"SetFastOutputEnabled"}), (std::vector<std::string>{"SetFastOutputEnabled(false)"}));
}

TEST_F(APIDownloadTest, ASwitchThatIsRefusedIsAFailure) {
    platform.Fail("SetFastOutputEnabled", EACCES);
    EXPECT_FALSE(APIDownload::SetXSendFileDisabled());
    EXPECT_TRUE(APIDownload::GetXSendFileEnabled());
}

}  // namespace
