#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <map>
#include <thread>

#include "PrivateDevice.h"
#include "httpfileoutputer.h"

namespace {

using Variables = std::map<std::string, std::string>;

/** What a program sent that had written one header line of its own before. */
struct Sent {
    /** The outputer's result; -1 if the program did not end by itself. */
    int result = -1;
    std::string bytes;

    std::string Head() const { return bytes.substr(0, bytes.find("\r\n\r\n") + 2); }
    std::string Body() const { return bytes.substr(bytes.find("\r\n\r\n") + 4); }
    /** Value of a header line; "none" if there is none. */
    std::string Value(const std::string& name) const {
        const std::string head = "\r\n" + Head();
        const size_t begin = head.find("\r\n" + name + ": ");
        if (begin == std::string::npos) {
            return "none";
        }
        const size_t value = begin + 4 + name.size();
        return head.substr(value, head.find("\r\n", value) - value);
    }
};

constexpr int kGood = 0;
constexpr int kFailed = 1;

/** Runs the program with descriptor 1 at `output`, with these CGI variables and SIGPIPE as a program finds it. */
int ResultOf(int output, const Variables& variables, const std::function<bool()>& body) {
    fflush(stdout);
    return StatusOfChild([&] {
        signal(SIGPIPE, SIG_DFL);
        if (dup2(output, STDOUT_FILENO) < 0) {
            return 9;
        }
        for (const auto& [name, value] : variables) {
            setenv(name.c_str(), value.c_str(), 1);
        }
        printf("X-Own: 1\r\n");
        const int result = body() ? kGood : kFailed;
        return fflush(stdout) == 0 ? result : 8;
    });
}

class FileOutputer : public DeviceTest {
protected:
    void SetUp() override {
        DeviceTest::SetUp();
        WriteFile(InRoot("/etc/mime.types"), "text/plain txt\n");
        path = InRoot("/scratch-download/a.txt");
        Write("0123456789");
    }

    void Write(const std::string& content) {
        unlink(path.c_str());
        WriteFile(path, content);
        MakeOlder(path, 100);
    }

    static Sent Answer(const Variables& variables, const std::function<bool()>& body) {
        const int file = memfd_create("answer", MFD_CLOEXEC);
        Sent sent;
        sent.result = ResultOf(file, variables, body);
        char part[65536];
        ssize_t got;
        while ((got = pread(file, part, sizeof(part), static_cast<off_t>(sent.bytes.size()))) > 0) {
            sent.bytes.append(part, static_cast<size_t>(got));
        }
        close(file);
        return sent;
    }

    Sent Answer(const Variables& variables = {}) const { return AnswerOf(path, variables); }

    static Sent AnswerOf(const std::string& file, const Variables& variables = {}) {
        Variables all = {{"REQUEST_METHOD", "GET"}};
        for (const auto& [name, value] : variables) {
            all[name] = value;
        }
        return Answer(all, [&] { return HTTPFileOutputer().Output(file, "text/plain"); });
    }

    static Sent AnswerOfStream(FILE* stream, const std::string& name = "", const Variables& variables = {}) {
        Variables all = {{"REQUEST_METHOD", "GET"}};
        all.insert(variables.begin(), variables.end());
        return Answer(all, [&] { return HTTPFileOutputer().Output(stream, name, "text/csv"); });
    }

    std::string path;
};

// ---- a whole file ----

TEST_F(FileOutputer, SendsTheProgramsLinesThenItsOwnThenTheContent) {
    const Sent sent = Answer();
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.bytes.compare(0, 38, "X-Own: 1\r\nContent-Type: text/plain\r\nCo"), 0) << sent.bytes;
    EXPECT_EQ(sent.Value("Content-Length"), "10");
    EXPECT_EQ(sent.Value("Content-Disposition"), "attachment; filename=\"a.txt\"");
    EXPECT_EQ(sent.Value("Accept-Ranges"), "bytes");
    EXPECT_EQ(sent.Value("Cache-Control"), "private, no-cache");
    EXPECT_EQ(sent.Value("X-Content-Type-Options"), "nosniff");
    EXPECT_EQ(sent.Value("Status"), "none");
    EXPECT_EQ(sent.Value("ETag").size() > 10 ? sent.Value("ETag")[0] : ' ', '"');
    EXPECT_NE(sent.Value("Last-Modified"), "none");
    EXPECT_EQ(sent.Body(), "0123456789");
}

TEST_F(FileOutputer, SendsAnEmptyFile) {
    Write("");
    const Sent sent = Answer();
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.Value("Content-Length"), "0");
    EXPECT_EQ(sent.Body(), "");
}

TEST_F(FileOutputer, SendsAllBytesOfALargeFile) {
    std::string content;
    for (int i = 0; i < 400'000; ++i) {
        content += std::to_string(i) + '\0';
    }
    Write(content);
    EXPECT_TRUE(Answer().Body() == content);
}

TEST_F(FileOutputer, AHeadHasTheSameLinesAndNoContent) {
    const Sent get = Answer();
    const Sent head = Answer({{"REQUEST_METHOD", "HEAD"}, {"HTTP_RANGE", "bytes=0-1"}});
    EXPECT_EQ(head.result, kGood);
    EXPECT_EQ(head.Head(), get.Head());
    EXPECT_EQ(head.Body(), "");
}

TEST_F(FileOutputer, NoByteOfTheTypeEndsItsLine) {
    const Sent sent = Answer({}, [&] { return HTTPFileOutputer().Output(path, "a/b\r\nSet-Cookie: x\n\x7f"); });
    EXPECT_EQ(sent.Value("Content-Type"), "a/b  Set-Cookie: x  ");
    EXPECT_EQ(sent.Value("Set-Cookie"), "none");
}

TEST_F(FileOutputer, WithoutATypeSendsOctetStream) {
    const Sent sent = Answer({}, [&] { return HTTPFileOutputer().Output(path, ""); });
    EXPECT_EQ(sent.Value("Content-Type"), "application/octet-stream");
}

TEST_F(FileOutputer, AFileChangedJustNowHasATagAndNoDate) {
    MakeOlder(path, 0);
    EXPECT_EQ(Answer().Value("Last-Modified"), "none");
    EXPECT_NE(Answer().Value("ETag"), "none");
}

// ---- conditions and ranges ----

TEST_F(FileOutputer, ATagThatTheClientHasGives304WithoutContent) {
    const std::string tag = Answer().Value("ETag");
    for (const char* method : {"GET", "HEAD"}) {
        const Sent sent = Answer({{"REQUEST_METHOD", method}, {"HTTP_IF_NONE_MATCH", "\"x\", " + tag}});
        EXPECT_EQ(sent.result, kGood);
        EXPECT_EQ(sent.Value("Status"), "304 Not Modified");
        EXPECT_EQ(sent.Value("ETag"), tag);
        EXPECT_EQ(sent.Value("Content-Length"), "none");
        EXPECT_EQ(sent.Body(), "");
    }
    Write("0123456789");
    EXPECT_EQ(Answer({{"HTTP_IF_NONE_MATCH", tag}}).Value("Status"), "none") << "another file of the same content";
}

TEST_F(FileOutputer, ADateThatTheClientHasGives304) {
    const std::string date = Answer().Value("Last-Modified");
    EXPECT_EQ(Answer({{"HTTP_IF_MODIFIED_SINCE", date}}).Value("Status"), "304 Not Modified");
}

TEST_F(FileOutputer, ATagThatIsNotTheFilesGives412) {
    const Sent sent = Answer({{"HTTP_IF_MATCH", "\"x\""}, {"HTTP_RANGE", "bytes=0-1"}});
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.Value("Status"), "412 Precondition Failed");
    EXPECT_EQ(sent.Value("Content-Length"), "0");
    EXPECT_EQ(sent.Body(), "");
}

TEST_F(FileOutputer, OneRangeGoesOutAlone) {
    const Sent sent = Answer({{"HTTP_RANGE", "bytes=3-5"}});
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.Value("Status"), "206 Partial Content");
    EXPECT_EQ(sent.Value("Content-Range"), "bytes 3-5/10");
    EXPECT_EQ(sent.Value("Content-Length"), "3");
    EXPECT_EQ(sent.Value("Content-Type"), "text/plain");
    EXPECT_EQ(sent.Body(), "345");
}

TEST_F(FileOutputer, SeveralRangesGoOutAsParts) {
    const Sent sent = Answer({{"HTTP_RANGE", "bytes=7-,0-1"}});
    EXPECT_EQ(sent.result, kGood);
    const std::string type = sent.Value("Content-Type");
    ASSERT_EQ(type.compare(0, 31, "multipart/byteranges; boundary="), 0) << type;
    const std::string boundary = type.substr(31);
    EXPECT_EQ(boundary.size(), 32U);
    EXPECT_EQ(sent.Body(), "\r\n--" + boundary +
                               "\r\nContent-Type: text/plain\r\nContent-Range: bytes 7-9/10\r\n\r\n789" + "\r\n--" +
                               boundary + "\r\nContent-Type: text/plain\r\nContent-Range: bytes 0-1/10\r\n\r\n01" +
                               "\r\n--" + boundary + "--\r\n");
    EXPECT_EQ(sent.Value("Content-Length"), std::to_string(sent.Body().size()));
    EXPECT_EQ(sent.Value("Content-Range"), "none");
    EXPECT_NE(Answer({{"HTTP_RANGE", "bytes=7-,0-1"}}).Value("Content-Type"), type) << "a boundary for each answer";
}

TEST_F(FileOutputer, RangesOutsideTheFileGive416WithItsSize) {
    const Sent sent = Answer({{"HTTP_RANGE", "bytes=10-"}});
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.Value("Status"), "416 Range Not Satisfiable");
    EXPECT_EQ(sent.Value("Content-Range"), "bytes */10");
    EXPECT_EQ(sent.Value("Content-Length"), "0");
    EXPECT_EQ(sent.Body(), "");
}

TEST_F(FileOutputer, ARangeOfAnotherStateGivesTheWholeFile) {
    const std::string tag = Answer().Value("ETag");
    EXPECT_EQ(Answer({{"HTTP_RANGE", "bytes=3-5"}, {"HTTP_IF_RANGE", tag}}).Body(), "345");
    EXPECT_EQ(Answer({{"HTTP_RANGE", "bytes=3-5"}, {"HTTP_IF_RANGE", "\"x\""}}).Body(), "0123456789");
    EXPECT_EQ(Answer({{"HTTP_RANGE", "bytes=30-"}, {"HTTP_IF_RANGE", "\"x\""}}).Body(), "0123456789");
}

TEST_F(FileOutputer, OnlyAGetHasRangesAndAPostNoConditions) {
    const Sent sent = Answer({{"REQUEST_METHOD", "POST"},
                              {"HTTP_RANGE", "bytes=3-5"},
                              {"HTTP_IF_MATCH", "\"x\""},
                              {"HTTP_IF_NONE_MATCH", "*"}});
    EXPECT_EQ(sent.Value("Status"), "none");
    EXPECT_EQ(sent.Body(), "0123456789");
}

// ---- what is no file to send ----

TEST_F(FileOutputer, WhatCannotBeSentIsToldByTheStatusAndAnEmptyBody) {
    const std::string link = InRoot("/scratch-download/link.txt");
    const std::string fifo = InRoot("/scratch-download/fifo");
    ASSERT_TRUE(symlink(path.c_str(), link.c_str()) == 0 || errno == EEXIST);
    ASSERT_TRUE(mkfifo(fifo.c_str(), 0600) == 0 || errno == EEXIST);
    const std::pair<std::string, const char*> rows[] = {
        {InRoot("/scratch-download/missing"), "404 Not Found"},
        {path + "/below", "404 Not Found"},
        {"", "404 Not Found"},
        {path + std::string("\0.txt", 5), "404 Not Found"},
        {"/" + std::string(10'000, 'a'), "404 Not Found"},
        {link, "403 Forbidden"},
        {fifo, "403 Forbidden"},
        {InRoot("/scratch-download"), "403 Forbidden"},
        {"/dev/null", "403 Forbidden"},
    };
    for (const auto& [file, status] : rows) {
        const Sent sent = AnswerOf(file);
        EXPECT_EQ(sent.result, kFailed) << file.substr(0, 100);
        EXPECT_EQ(sent.bytes, std::string("X-Own: 1\r\nStatus: ") + status + "\r\nContent-Length: 0\r\n\r\n")
            << file.substr(0, 100);
    }
}

TEST_F(FileOutputer, AFileThatTheCallersUserMayNotReadIsForbidden) {
    const Sent sent = Answer({}, [&] {
        if (setresgid(kAliceGid, kAliceGid, kAliceGid) != 0 || setresuid(kAliceUid, kAliceUid, kAliceUid) != 0) {
            return true;
        }
        return HTTPFileOutputer().Output("/etc/shadow", "text/plain");
    });
    EXPECT_EQ(sent.result, kFailed);
    EXPECT_EQ(sent.Value("Status"), "403 Forbidden");
}

// ---- streams ----

TEST_F(FileOutputer, AStreamAtTheBeginningOfAFileIsSentAsTheFile) {
    FILE* stream = fopen(path.c_str(), "re");
    const Sent sent = AnswerOfStream(stream, "", {{"HTTP_RANGE", "bytes=-2"}});
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.Value("Status"), "206 Partial Content");
    EXPECT_EQ(sent.Value("Content-Disposition"), "none");
    EXPECT_EQ(sent.Value("ETag"), Answer().Value("ETag"));
    EXPECT_EQ(sent.Body(), "89");
    fclose(stream);
}

TEST_F(FileOutputer, AStreamsNameIsTheAttachments) {
    FILE* stream = fopen(path.c_str(), "re");
    EXPECT_EQ(AnswerOfStream(stream, "other.csv").Value("Content-Disposition"), "attachment; filename=\"other.csv\"");
    fclose(stream);
}

TEST_F(FileOutputer, AStreamWithinAFileIsSentFromItsPosition) {
    FILE* stream = fopen(path.c_str(), "re");
    fgetc(stream);
    fgetc(stream);
    const Sent sent = AnswerOfStream(stream, "", {{"HTTP_RANGE", "bytes=0-0"}});
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.Value("Status"), "none");
    EXPECT_EQ(sent.Value("Content-Length"), "none");
    EXPECT_EQ(sent.Value("Accept-Ranges"), "none");
    EXPECT_EQ(sent.Body(), "23456789");
    fclose(stream);
}

TEST_F(FileOutputer, AStreamThatWasWrittenAndRewoundIsSentWhole) {
    const Sent sent = Answer({{"REQUEST_METHOD", "GET"}}, [] {
        FILE* stream = tmpfile();
        fputs("unwritten", stream);
        rewind(stream);
        fputs("U", stream);
        rewind(stream);
        const bool result = HTTPFileOutputer().Output(stream, "", "text/plain");
        fclose(stream);
        return result;
    });
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.Value("Content-Length"), "9");
    EXPECT_EQ(sent.Body(), "Unwritten");
}

TEST_F(FileOutputer, AStreamOfAPipeOrOfMemoryIsSentToItsEnd) {
    const auto send = [](FILE* stream) { return HTTPFileOutputer().Output(stream, "", "text/plain"); };
    const Sent pipe = Answer({{"REQUEST_METHOD", "GET"}, {"HTTP_RANGE", "bytes=0-0"}},
                             [&] { return send(popen("seq 1 100000", "re")); });
    EXPECT_EQ(pipe.result, kGood);
    EXPECT_EQ(pipe.Body().size(), 588'895U);
    EXPECT_EQ(pipe.Body().substr(588'888), "100000\n");
    char text[] = "in memory";
    EXPECT_EQ(Answer({}, [&] { return send(fmemopen(text, 9, "r")); }).Body(), "in memory");
}

TEST_F(FileOutputer, AHeadOfAPipeReadsNothingOfIt) {
    const Sent sent = Answer({{"REQUEST_METHOD", "HEAD"}}, [] {
        FILE* stream = popen("echo text", "re");
        const bool result = HTTPFileOutputer().Output(stream, "", "text/plain");
        return result && fgetc(stream) == 't';
    });
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(sent.Body(), "");
}

TEST_F(FileOutputer, AStreamThatCannotBeReadIsAFailure) {
    FILE* unreadable = fopen("/dev/null", "we");
    EXPECT_EQ(AnswerOfStream(unreadable).result, kFailed);
    fclose(unreadable);
    const Sent none = AnswerOfStream(nullptr);
    EXPECT_EQ(none.result, kFailed);
    EXPECT_EQ(none.Value("Status"), "500 Internal Server Error");
}

// ---- the way to the client ----

TEST_F(FileOutputer, AClientThatIsGoneIsAFailureAndEndsNoProcess) {
    Write(std::string(1 << 20, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    close(ends[0]);
    EXPECT_EQ(ResultOf(ends[1], {},
                       [&] {
                           const bool result = HTTPFileOutputer().Output(path, "a/b");
                           // What was not written must not be tried again at the end of the program.
                           return freopen("/dev/null", "w", stdout) == nullptr || result;
                       }),
              kFailed);
    close(ends[1]);
}

TEST_F(FileOutputer, AClientThatBreaksOffEndsTheTransferAndNoProcess) {
    Write(std::string(1 << 22, 'x'));
    for (const bool isSocket : {false, true}) {
        int ends[2];
        ASSERT_EQ(isSocket ? socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) : pipe2(ends, O_CLOEXEC), 0);
        std::thread client([&] {
            char part[1000];
            EXPECT_GT(read(ends[0], part, sizeof(part)), 0);
            close(ends[0]);
        });
        EXPECT_EQ(ResultOf(ends[1], {},
                           [&] {
                               close(ends[0]);
                               return HTTPFileOutputer().Output(path, "a/b");
                           }),
                  kFailed);
        client.join();
        close(ends[1]);
    }
}

TEST_F(FileOutputer, AnOutputThatDoesNotWaitGetsAllOfIt) {
    Write(std::string(1 << 22, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    ASSERT_EQ(fcntl(ends[1], F_SETFL, O_NONBLOCK), 0);
    std::string got;
    std::thread client([&] {
        char part[65536];
        for (ssize_t more; (more = read(ends[0], part, sizeof(part))) > 0;) {
            got.append(part, static_cast<size_t>(more));
        }
    });
    EXPECT_EQ(ResultOf(ends[1], {}, [&] { return HTTPFileOutputer().Output(path, "a/b"); }), kGood);
    close(ends[1]);
    client.join();
    close(ends[0]);
    EXPECT_EQ(got.size() - (got.find("\r\n\r\n") + 4), size_t{1} << 22);
}

TEST_F(FileOutputer, AnOutputThatTheKernelCannotJoinIsCopiedTo) {
    // sendfile refuses a descriptor that only appends.
    const std::string place = InRoot("/scratch-download/appended");
    unlink(place.c_str());
    const int file = open(place.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600);
    EXPECT_EQ(ResultOf(file, {{"REQUEST_METHOD", "GET"}, {"HTTP_RANGE", "bytes=2-8"}},
                       [&] { return HTTPFileOutputer().Output(path, "a/b"); }),
              kGood);
    close(file);
    const std::string got = ReadWholeFile(place);
    EXPECT_EQ(got.substr(got.find("\r\n\r\n") + 4), "2345678");
}

TEST_F(FileOutputer, SignalsDuringTheTransferDoNotEndIt) {
    Write(std::string(1 << 22, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    size_t got = 0;
    std::thread client([&] {
        char part[4096];
        for (ssize_t more; (more = read(ends[0], part, sizeof(part))) > 0;) {
            got += static_cast<size_t>(more);
        }
    });
    EXPECT_EQ(ResultOf(ends[1], {},
                       [&] {
                           struct sigaction action {};
                           action.sa_handler = [](int) {};
                           sigaction(SIGALRM, &action, nullptr);
                           const struct itimerval often = {{0, 500}, {0, 500}};
                           setitimer(ITIMER_REAL, &often, nullptr);
                           const bool result = HTTPFileOutputer().Output(path, "a/b");
                           const struct itimerval never = {};
                           setitimer(ITIMER_REAL, &never, nullptr);
                           return result;
                       }),
              kGood);
    close(ends[1]);
    client.join();
    close(ends[0]);
    EXPECT_GT(got, size_t{1} << 22);
}

TEST_F(FileOutputer, AFileThatShrinksEndsTheTransferWithoutOtherBytes) {
    constexpr size_t kSize = 1 << 22;
    Write(std::string(kSize, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    std::string got;
    std::thread client([&] {
        char part[4096];
        // The transfer waits for the pipe when the first bytes of the content are here.
        ssize_t more;
        while ((more = read(ends[0], part, sizeof(part))) > 0) {
            got.append(part, static_cast<size_t>(more));
            if (got.size() > kSize / 4 && got.size() <= kSize / 4 + sizeof(part)) {
                EXPECT_EQ(truncate(path.c_str(), kSize / 2), 0);
            }
        }
    });
    EXPECT_EQ(ResultOf(ends[1], {}, [&] { return HTTPFileOutputer().Output(path, "a/b"); }), kFailed);
    close(ends[1]);
    client.join();
    close(ends[0]);
    const std::string body = got.substr(got.find("\r\n\r\n") + 4);
    EXPECT_EQ(body.size(), kSize / 2);
    EXPECT_EQ(body.find_first_not_of('x'), std::string::npos);
    EXPECT_NE(got.find("Content-Length: 4194304\r\n"), std::string::npos);
}

TEST_F(FileOutputer, LeavesNoDescriptorAndNoBlockedSignalBehind) {
    EXPECT_EQ(Answer({},
                     [&] {
                         const int before = dup(0);
                         close(before);
                         HTTPFileOutputer().Output(path, "a/b");
                         const int after = dup(0);
                         sigset_t blocked;
                         sigemptyset(&blocked);
                         pthread_sigmask(SIG_BLOCK, nullptr, &blocked);
                         return before == after && sigismember(&blocked, SIGPIPE) == 0;
                     })
                  .result,
              kGood);
}

// ---- the web server's own sending ----

constexpr const char* kRootsFile = "/etc/passwd";
constexpr const char* kSetting = "fast_download=\"X-Sendfile\"\n";

class FastFileOutput : public FileOutputer {
protected:
    static void Set(const std::string& text) { WriteFile(InRoot("/etc/zovainfo.conf"), text); }
    static std::string FastLine(const Sent& sent) { return sent.Value("X-Sendfile"); }
};

TEST_F(FastFileOutput, IsOffUnlessTheDeviceNamesAGoodHeader) {
    for (const char* setting : {"", "fast_download=\"yes\"\n", "fast_download=\"x-sendfile\"\n",
                                "fast_download=\"Set-Cookie\"\n", "fast_download=\"X-Accel-Redirect\"\n",
                                "fast_download=\"X-Accel-Redirect\"\nfast_download_location=\"files\"\n",
                                "fast_download=\"X-Accel-Redirect\"\nfast_download_location=\"/files/\"\n",
                                "fast_download=\"X-Accel-Redirect\"\nfast_download_location=\"/a?b\"\n"}) {
        Set(setting);
        const Sent sent = Answer({}, [] {
            using ZOVA::HTTP::FileOutputerHelper;
            const bool stayedOff =
                !FileOutputerHelper::IsFastOutputEnabled() && !FileOutputerHelper::SetFastOutputEnabled(true) &&
                !FileOutputerHelper::IsFastOutputEnabled() && FileOutputerHelper::SetFastOutputEnabled(false);
            return HTTPFileOutputer().Output(kRootsFile, "a/b") && stayedOff;
        });
        EXPECT_EQ(sent.result, kGood) << setting;
        EXPECT_EQ(FastLine(sent), "none") << setting;
        EXPECT_EQ(sent.Body(), ReadWholeFile(kRootsFile)) << setting;
    }
}

TEST_F(FastFileOutput, NamesTheFileAndSendsNoContent) {
    Set(kSetting);
    const Sent sent = AnswerOf(kRootsFile);
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(FastLine(sent), "/etc/passwd");
    EXPECT_EQ(sent.Value("Content-Length"), "none");
    EXPECT_EQ(sent.Value("Content-Disposition"), "attachment; filename=\"passwd\"");
    EXPECT_EQ(sent.Body(), "");
}

TEST_F(FastFileOutput, StandsBehindTheLocationWhereTheServerMapsPaths) {
    Set("fast_download=\"X-Accel-Redirect\"\nfast_download_location=\"/inside/files\"\n");
    EXPECT_EQ(AnswerOf(kRootsFile).Value("X-Accel-Redirect"), "/inside/files/etc/passwd");
}

TEST_F(FastFileOutput, IsForWholeFilesOfAGetOnly) {
    Set(kSetting);
    const std::string content = ReadWholeFile(kRootsFile);
    const Sent range = AnswerOf(kRootsFile, {{"HTTP_RANGE", "bytes=0-3"}});
    EXPECT_EQ(FastLine(range), "none");
    EXPECT_EQ(range.Body(), content.substr(0, 4));
    const Sent head = AnswerOf(kRootsFile, {{"REQUEST_METHOD", "HEAD"}});
    EXPECT_EQ(FastLine(head), "none");
    EXPECT_EQ(head.Value("Content-Length"), std::to_string(content.size()));
    EXPECT_EQ(FastLine(AnswerOf(kRootsFile, {{"HTTP_IF_NONE_MATCH", "*"}})), "none");
}

TEST_F(FastFileOutput, IsOffForTheProcessThatSwitchedItOff) {
    Set(kSetting);
    const Sent sent = Answer({}, [] {
        using ZOVA::HTTP::FileOutputerHelper;
        const bool wasOn = FileOutputerHelper::IsFastOutputEnabled();
        const bool isOff =
            FileOutputerHelper::SetFastOutputEnabled(false) && !FileOutputerHelper::IsFastOutputEnabled();
        return HTTPFileOutputer().Output(kRootsFile, "a/b") && wasOn && isOff;
    });
    EXPECT_EQ(sent.result, kGood);
    EXPECT_EQ(FastLine(sent), "none");
    EXPECT_EQ(Answer({},
                     [] {
                         using ZOVA::HTTP::FileOutputerHelper;
                         FileOutputerHelper::SetFastOutputEnabled(false);
                         return FileOutputerHelper::SetFastOutputEnabled(true) &&
                                FileOutputerHelper::IsFastOutputEnabled();
                     })
                  .result,
              kGood)
        << "and on again";
}

TEST_F(FastFileOutput, IsNotForWhatAnotherThanRootCanExchange) {
    Set(kSetting);
    const std::string folder = "/etc/fast-output-test";
    ASSERT_TRUE(mkdir(folder.c_str(), 0755) == 0 || errno == EEXIST);
    const std::string file = folder + "/a b%\xe2\x82\xac";
    WriteFile(file, "content");
    EXPECT_EQ(FastLine(AnswerOf(file)), "/etc/fast-output-test/a%20b%25%E2%82%AC");
    const std::string linked = "/etc/fast-output-link";
    ASSERT_TRUE(symlink(folder.c_str(), linked.c_str()) == 0 || errno == EEXIST);
    EXPECT_EQ(FastLine(AnswerOf(linked + "/a b%\xe2\x82\xac")), "/etc/fast-output-test/a%20b%25%E2%82%AC")
        << "where the folder really lies";

    const auto sendsItself = [&](const char* why) {
        const Sent sent = AnswerOf(file);
        EXPECT_EQ(FastLine(sent), "none") << why;
        EXPECT_EQ(sent.Body(), "content") << why;
    };
    ASSERT_EQ(chmod(file.c_str(), 0664), 0);
    sendsItself("a file that its group may write");
    ASSERT_EQ(chmod(file.c_str(), 0644), 0);
    ASSERT_EQ(chown(file.c_str(), kAliceUid, 0), 0);
    sendsItself("a user's file");
    ASSERT_EQ(chown(file.c_str(), 0, 0), 0);
    ASSERT_EQ(chmod(folder.c_str(), 0775), 0);
    sendsItself("a folder that its group may write");
    ASSERT_EQ(chmod(folder.c_str(), 01777), 0);
    EXPECT_NE(FastLine(AnswerOf(file)), "none") << "a folder in which each may change their own";
    ASSERT_EQ(chmod(folder.c_str(), 0755), 0);
    ASSERT_EQ(chown(folder.c_str(), kAliceUid, 0), 0);
    sendsItself("a user's folder");
    ASSERT_EQ(chown(folder.c_str(), 0, 0), 0);
    EXPECT_NE(FastLine(AnswerOf(file)), "none") << "as before";
}

TEST_F(FastFileOutput, IsNotForAFileThatIsGoneOrWhoseNameIsNoPlainUtf8) {
    Set(kSetting);
    const std::string file = "/etc/fast-output-gone";
    WriteFile(file, "content");
    const Sent gone = Answer({{"REQUEST_METHOD", "GET"}}, [&] {
        FILE* stream = fopen(file.c_str(), "re");
        unlink(file.c_str());
        WriteFile(file, "another");
        return HTTPFileOutputer().Output(stream, "", "a/b");
    });
    EXPECT_EQ(FastLine(gone), "none");
    EXPECT_EQ(gone.Body(), "content");
    for (const std::string odd : {"/etc/fast-output-\xff", "/etc/fast-output-\n", "/etc/fast-output-\x7f"}) {
        WriteFile(odd, "content");
        const Sent sent = AnswerOf(odd);
        EXPECT_EQ(FastLine(sent), "none") << odd;
        EXPECT_EQ(sent.Body(), "content") << odd;
        unlink(odd.c_str());
    }
    unlink(file.c_str());
}

}  // namespace
