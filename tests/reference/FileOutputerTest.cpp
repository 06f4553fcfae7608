#include "FileOutputerFixture.h"

namespace {

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

}  // namespace
