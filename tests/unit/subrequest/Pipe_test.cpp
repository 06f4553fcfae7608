// The framed pipe, within one process and between two.

#include "webapi/Pipe.h"

#include <fcntl.h>
#include <sched.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "ChildRun.h"
#include "SubrequestTest.h"
#include "webapi/Json.h"

using unit::J;
using ZOVA::Pipe;

namespace {

/** Of a pipe as the system makes it: sixteen pages. */
constexpr std::size_t kPipeSize = 65536;
constexpr std::size_t kHeaderSize = 8;

/** An open pipe, and its two descriptors. */
class PipeTest : public unit::SubrequestTest {
protected:
    PipeTest() : before(unit::OpenDescriptorNumbers()) {}

    void Open() {
        ASSERT_TRUE(pipe.Init());
        for (int fd : NewDescriptors()) {
            ((fcntl(fd, F_GETFL) & O_ACCMODE) == O_RDONLY ? readEnd : writeEnd) = fd;
        }
        ASSERT_GE(readEnd, 0);
        ASSERT_GE(writeEnd, 0);
    }

    std::vector<int> NewDescriptors() const {
        std::vector<int> opened;
        for (int fd : unit::OpenDescriptorNumbers()) {
            if (std::find(before.begin(), before.end(), fd) == before.end()) {
                opened.push_back(fd);
            }
        }
        return opened;
    }

    void Put(const std::string& bytes) const {
        ASSERT_EQ(write(writeEnd, bytes.data(), bytes.size()), static_cast<ssize_t>(bytes.size()));
    }

    static std::string Header(std::uint64_t length) {
        std::string bytes(kHeaderSize, '\0');
        memcpy(bytes.data(), &length, kHeaderSize);
        return bytes;
    }

    /** What `ReadJson` makes of these bytes, after which the writer has gone. */
    bool ReadBytes(const std::string& bytes) {
        Open();
        Put(bytes);
        pipe.ReadOnly(-1);
        value = J(R"({"old": true})");
        return pipe.ReadJson(value);
    }

    void ExpectUntouched() const { EXPECT_JSON(value, R"({"old": true})"); }

    std::vector<int> before;
    Pipe pipe;
    int readEnd = -1;
    int writeEnd = -1;
    Json::Value value;
};

// ---- opening and closing ----

TEST_F(PipeTest, OpensNothingBeforeInit) {
    EXPECT_EQ(NewDescriptors().size(), 0u);
    EXPECT_FALSE(pipe.IsReadable());
}

TEST_F(PipeTest, InitOpensTwoDescriptorsThatCloseOnExec) {
    Open();
    EXPECT_EQ(fcntl(readEnd, F_GETFD), FD_CLOEXEC);
    EXPECT_EQ(fcntl(writeEnd, F_GETFD), FD_CLOEXEC);
    EXPECT_TRUE(pipe.IsReadable());
    EXPECT_EQ(platform.CallsOf({"pipe2"}), (std::vector<std::string>{"pipe2()"}));
}

TEST_F(PipeTest, ARefusedInitIsFalseAndOpensNothing) {
    platform.Fail("pipe2", EMFILE);
    EXPECT_FALSE(pipe.Init());
    EXPECT_EQ(NewDescriptors().size(), 0u);
    EXPECT_FALSE(pipe.IsReadable());
}

TEST_F(PipeTest, NeverTakesAStandardDescriptor) {
    const unit::ChildResult child = unit::RunInChild("", [] {
        for (int fd : {0, 1, 2}) {
            close(fd);
        }
        Pipe inner;
        Json::Value report(Json::objectValue);
        report["opened"] = inner.Init();
        report["standard"] = fcntl(0, F_GETFD) != -1 || fcntl(1, F_GETFD) != -1 || fcntl(2, F_GETFD) != -1;
        Json::Value read;
        report["works"] = inner.WriteJson("text") && inner.ReadJson(read) && read == "text";
        return report;
    });
    EXPECT_TRUE(child.orderly) << child.end;
    EXPECT_JSON(child.report, R"({"opened": true, "standard": false, "works": true})");
}

TEST_F(PipeTest, ReadOnlyClosesTheEndForWriting) {
    Open();
    pipe.ReadOnly(-1);
    EXPECT_EQ(NewDescriptors(), (std::vector<int>{readEnd}));
    EXPECT_TRUE(pipe.IsReadable());
}

TEST_F(PipeTest, WriteOnlyClosesTheEndForReading) {
    Open();
    pipe.WriteOnly(-1);
    EXPECT_EQ(NewDescriptors(), (std::vector<int>{writeEnd}));
    EXPECT_FALSE(pipe.IsReadable());
}

TEST_F(PipeTest, ReadOnlyTwiceClosesOnce) {
    Open();
    pipe.ReadOnly(-1);
    const int other = dup2(STDERR_FILENO, writeEnd);
    pipe.ReadOnly(-1);
    EXPECT_NE(fcntl(other, F_GETFD), -1) << "the number belongs to somebody else by now";
    close(other);
}

TEST_F(PipeTest, WriteOnlyTwiceClosesOnce) {
    Open();
    pipe.WriteOnly(-1);
    const int other = dup2(STDERR_FILENO, readEnd);
    pipe.WriteOnly(-1);
    EXPECT_NE(fcntl(other, F_GETFD), -1);
    close(other);
}

TEST_F(PipeTest, ATargetOfReadOnlyBecomesACopyOfTheEndForReading) {
    Open();
    Put("x");
    const int target = dup(STDERR_FILENO);
    pipe.ReadOnly(target);
    char byte = '\0';
    EXPECT_EQ(read(target, &byte, 1), 1);
    EXPECT_EQ(byte, 'x');
    close(target);
}

TEST_F(PipeTest, ATargetOfWriteOnlyBecomesACopyOfTheEndForWriting) {
    Open();
    const int reader = dup(readEnd);
    const int target = dup(STDERR_FILENO);
    pipe.WriteOnly(target);
    EXPECT_EQ(write(target, "x", 1), 1);
    char byte = '\0';
    EXPECT_EQ(read(reader, &byte, 1), 1);
    EXPECT_EQ(byte, 'x');
    close(target);
    close(reader);
}

TEST_F(PipeTest, ATargetOfZeroCounts) {
    const unit::ChildResult child = unit::RunInChild("the client's", [] {
        Pipe inner;
        inner.Init();
        inner.WriteJson("through the pipe");
        inner.ReadOnly(0);
        char text[64] = "";
        Json::Value report(Json::objectValue);
        report["bytes"] = static_cast<int>(read(0, text, sizeof(text)));
        report["text"] = std::string(text + kHeaderSize);
        return report;
    });
    EXPECT_JSON(child.report, R"({"bytes": 26, "text": "\"through the pipe\""})");
}

TEST_F(PipeTest, CloseClosesBothEnds) {
    Open();
    pipe.Close();
    EXPECT_EQ(NewDescriptors().size(), 0u);
    pipe.Close();
}

TEST_F(PipeTest, CloseWithoutInitDoesNothing) {
    pipe.Close();
    EXPECT_EQ(unit::OpenDescriptorNumbers(), before);
}

TEST_F(PipeTest, TheDestructorClosesWhatIsOpen) {
    {
        Pipe whole;
        Pipe half;
        ASSERT_TRUE(whole.Init());
        ASSERT_TRUE(half.Init());
        half.ReadOnly(-1);
        EXPECT_EQ(NewDescriptors().size(), 3u);
    }
    EXPECT_EQ(NewDescriptors().size(), 0u);
}

// ---- the frame ----

TEST_F(PipeTest, AFrameIsTheLengthInHostOrderAndTheText) {
    Open();
    EXPECT_TRUE(pipe.WriteJson(J(R"({"b": 1, "a": "ü"})")));
    char bytes[64] = "";
    const ssize_t size = pipe.Read(bytes, sizeof(bytes));
    const std::string text = "{\"a\":\"ü\",\"b\":1}";
    EXPECT_EQ(std::string(bytes, static_cast<std::size_t>(size)), Header(text.size()) + text);
}

TEST_F(PipeTest, ATextIsWrittenInOneCall) {
    Open();
    EXPECT_TRUE(pipe.WriteJson(std::string(1000, 'x')));
    EXPECT_EQ(platform.CallsOf({"write"}), (std::vector<std::string>{"write(8)", "write(1002)"}));
}

TEST_F(PipeTest, ValuesOfEveryKindComeBack) {
    Open();
    for (const char* text : {"null", "true", "0", "-1", "18446744073709551615", "1.5", "\"\"", "\"\\u0000\\n\"", "[]",
                             "{}", R"({"result": {"success": true}, "info": {"error": 0}})"}) {
        value = "old";
        EXPECT_TRUE(pipe.WriteJson(J(text))) << text;
        EXPECT_TRUE(pipe.ReadJson(value)) << text;
        EXPECT_JSON(value, text);
    }
}

TEST_F(PipeTest, ANullIsSentAsItsTextAndComesBackNull) {
    Open();
    EXPECT_TRUE(pipe.WriteJson(Json::Value()));
    int waiting = 0;
    ioctl(readEnd, FIONREAD, &waiting);
    EXPECT_EQ(waiting, static_cast<int>(kHeaderSize + strlen("null")));
    value = "old";
    EXPECT_TRUE(pipe.ReadJson(value));
    EXPECT_TRUE(value.isNull());
}

TEST_F(PipeTest, FramesComeInTheirOrder) {
    Open();
    for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(pipe.WriteJson(i));
    }
    for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(pipe.ReadJson(value));
        EXPECT_EQ(value, i);
    }
}

TEST_F(PipeTest, WritingFailsWhereTheHeaderOrTheTextIsRefused) {
    Open();
    for (int passed : {0, 1}) {
        platform.Fail("write", ENOSPC, passed);
        EXPECT_FALSE(pipe.WriteJson("text")) << passed;
    }
    EXPECT_EQ(platform.CountOf("write"), 3);
}

TEST_F(PipeTest, WritingWithoutAnEndFails) {
    EXPECT_FALSE(pipe.WriteJson("text"));
    Open();
    pipe.ReadOnly(-1);
    EXPECT_FALSE(pipe.WriteJson("text"));
}

// ---- bad frames ----

TEST_F(PipeTest, AWriterThatClosedAtOnceIsAFailedProtocol) {
    EXPECT_FALSE(ReadBytes(""));
    ExpectUntouched();
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
}

TEST_F(PipeTest, AHeaderCutShortIsAFailedProtocol) {
    EXPECT_FALSE(ReadBytes(Header(4).substr(0, 7)));
    ExpectUntouched();
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
}

TEST_F(PipeTest, ReadingWithoutAnEndIsAFailedProtocol) {
    EXPECT_FALSE(pipe.ReadJson(value));
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
}

TEST_F(PipeTest, ALengthOfZeroIsLogged) {
    EXPECT_FALSE(ReadBytes(Header(0) + "null"));
    ExpectUntouched();
    ExpectLog(LOG_ERR, "error size=0", "Pipe.cpp");
}

TEST_F(PipeTest, ALengthThatNoMemoryHoldsIsLogged) {
    platform.Fail("calloc", ENOMEM);
    EXPECT_FALSE(ReadBytes(Header(UINT64_MAX) + "null"));
    ExpectUntouched();
    ExpectLog(LOG_ERR, "new szBuf[18446744073709551615] failed", "Pipe.cpp");
}

TEST_F(PipeTest, AHugeLengthWithLittleBehindItIsLogged) {
    EXPECT_FALSE(ReadBytes(Header(64UL << 20) + "null"));
    ExpectUntouched();
    ExpectLog(LOG_ERR, "read json 67108864 failed, got 4", "Pipe.cpp");
}

TEST_F(PipeTest, ATextCutShortIsLoggedWithBothNumbers) {
    EXPECT_FALSE(ReadBytes(Header(6) + "[1,2]"));
    ExpectUntouched();
    ExpectLog(LOG_ERR, "read json 6 failed, got 5", "Pipe.cpp");
}

TEST_F(PipeTest, ALengthWithoutATextIsLogged) {
    EXPECT_FALSE(ReadBytes(Header(5)));
    ExpectLog(LOG_ERR, "read json 5 failed, got 0", "Pipe.cpp");
}

TEST_F(PipeTest, ATextThatIsNoJSONFailsSilently) {
    const std::string deep = std::string(300, '[') + std::string(300, ']');
    for (const std::string& text :
         {std::string("{"), std::string("nul"), std::string("1 2"), std::string(1, '\0'), std::string("[1]x"), deep}) {
        EXPECT_FALSE(ReadBytes(Header(text.size()) + text)) << text;
        ExpectUntouched();
        pipe.Close();
    }
}

TEST_F(PipeTest, ALengthSmallerThanTheTextLeavesTheRestForTheNextFrame) {
    EXPECT_TRUE(ReadBytes(Header(1) + "1234567890"));
    EXPECT_JSON(value, "1");
    platform.Fail("calloc", ENOMEM);
    EXPECT_FALSE(pipe.ReadJson(value));
    ExpectLog(LOG_ERR, "new szBuf[4123106164818064178] failed", "Pipe.cpp");
}

// ---- what one read delivers ----

TEST_F(PipeTest, AFrameThatFillsThePipeArrivesWhole) {
    Open();
    const std::string text(kPipeSize - kHeaderSize - 2, 'x');
    EXPECT_TRUE(pipe.WriteJson(text));
    EXPECT_TRUE(pipe.ReadJson(value));
    EXPECT_EQ(Json::asString(value), text);
}

TEST_F(PipeTest, AFrameLongerThanOneReadDeliversFails) {
    Open();
    const int child = platform.children.Fork(platform);
    if (child == 0) {
        signal(SIGPIPE, SIG_IGN);
        pipe.WriteOnly(-1);
        pipe.WriteJson(std::string(kPipeSize, 'x'));
        _exit(0);
    }
    pipe.ReadOnly(-1);
    int waiting = 0;
    while (waiting <= static_cast<int>(kHeaderSize)) {
        ASSERT_EQ(ioctl(readEnd, FIONREAD, &waiting), 0);
        sched_yield();
    }
    EXPECT_FALSE(pipe.ReadJson(value));
    pipe.Close();
    ExpectLog(LOG_ERR, "read json 65538 failed, got " + std::to_string(waiting - static_cast<int>(kHeaderSize)),
              "Pipe.cpp");
}

// ---- plain reading ----

TEST_F(PipeTest, ReadZeroesTheWholeBufferAlsoWhenNothingArrives) {
    Open();
    pipe.ReadOnly(-1);
    std::string buffer(100, 'x');
    EXPECT_EQ(pipe.Read(buffer.data(), 99), 0);
    EXPECT_EQ(buffer, std::string(99, '\0') + "x");
    pipe.Close();
    buffer.assign(100, 'x');
    EXPECT_EQ(pipe.Read(buffer.data(), 100), -1);
    EXPECT_EQ(buffer, std::string(100, '\0'));
}

TEST_F(PipeTest, ReadReadsOnceAndNoMoreThanTheBufferHolds) {
    Open();
    Put("12345");
    char buffer[8] = "xxxxxxx";
    EXPECT_EQ(pipe.Read(buffer, 3), 3);
    EXPECT_EQ(std::string(buffer, 7), "123xxxx");
    EXPECT_EQ(pipe.Read(buffer, 7), 2);
    EXPECT_EQ(std::string(buffer, 7), std::string("45") + std::string(5, '\0'));
}

// ---- between two processes ----

TEST_F(PipeTest, CarriesAResultFromAChildToItsParent) {
    Open();
    if (platform.children.Fork(platform) == 0) {
        pipe.WriteOnly(-1);
        pipe.WriteJson(J(R"({"from": "child"})"));
        _exit(0);
    }
    pipe.ReadOnly(-1);
    EXPECT_TRUE(pipe.ReadJson(value));
    EXPECT_JSON(value, R"({"from": "child"})");
}

TEST_F(PipeTest, AChildThatDiesWithoutWritingEndsTheReading) {
    Open();
    if (platform.children.Fork(platform) == 0) {
        pipe.WriteOnly(-1);
        raise(SIGKILL);
    }
    pipe.ReadOnly(-1);
    EXPECT_FALSE(pipe.ReadJson(value));
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
    EXPECT_EQ(TakeChildren().at(0).end, "signal 9");
}

}  // namespace
