#include "FileOutputerFixture.h"

namespace {

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

TEST_F(FastFileOutput, EncodesAPathOnlyForTheServerThatIsKnownToDecodeIt) {
    const std::string odd = "/etc/fast output%\xe2\x82\xac";
    WriteFile(odd, "content");
    ASSERT_EQ(chmod(odd.c_str(), 0644), 0);
    Set("fast_download=\"X-Accel-Redirect\"\nfast_download_location=\"/inside\"\n");
    EXPECT_EQ(AnswerOf(odd).Value("X-Accel-Redirect"), "/inside/etc/fast%20output%25%E2%82%AC");
    Set(kSetting);
    const Sent sent = AnswerOf(odd);
    EXPECT_EQ(FastLine(sent), "none");
    EXPECT_EQ(sent.Body(), "content");
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

TEST_F(FastFileOutput, IsNotForARequestWithConditionsOrRangesThatTheWebServerWouldJudgeAgain) {
    Set(kSetting);
    const std::string tag = AnswerOf(kRootsFile).Value("ETag");
    for (const auto& [name, value] : {std::pair<const char*, std::string>("HTTP_IF_MATCH", tag),
                                      {"HTTP_IF_NONE_MATCH", "\"x\""},
                                      {"HTTP_IF_MODIFIED_SINCE", "Sun, 06 Nov 1994 08:49:37 GMT"},
                                      {"HTTP_IF_UNMODIFIED_SINCE", "Fri, 31 Dec 2100 23:59:59 GMT"},
                                      {"HTTP_IF_RANGE", tag},
                                      {"HTTP_RANGE", "bytes=5-4"}}) {
        const Sent sent = AnswerOf(kRootsFile, {{name, value}});
        EXPECT_EQ(FastLine(sent), "none") << name;
        EXPECT_EQ(sent.Body(), ReadWholeFile(kRootsFile)) << name;
    }
    EXPECT_EQ(FastLine(AnswerOf(kRootsFile, {{"REQUEST_METHOD", "POST"}})), "none") << "a whole file of a GET alone";
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
    const std::string file = folder + "/a-b";
    WriteFile(file, "content");
    ASSERT_EQ(chmod(file.c_str(), 0644), 0);
    EXPECT_EQ(FastLine(AnswerOf(file)), "/etc/fast-output-test/a-b");
    const std::string linked = "/etc/fast-output-link";
    ASSERT_TRUE(symlink(folder.c_str(), linked.c_str()) == 0 || errno == EEXIST);
    EXPECT_EQ(FastLine(AnswerOf(linked + "/a-b")), "/etc/fast-output-test/a-b") << "where the folder really lies";

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

TEST_F(FastFileOutput, IsNotForWhatAWebServerWithoutRootsRightsCannotRead) {
    Set(kSetting);
    const std::string folder = "/etc/fast-output-private";
    ASSERT_TRUE(mkdir(folder.c_str(), 0755) == 0 || errno == EEXIST);
    const std::string file = folder + "/file";
    WriteFile(file, "content");
    for (const auto& [fileMode, folderMode, isLeft] :
         {std::tuple(0644u, 0755u, true), std::tuple(0640u, 0755u, false), std::tuple(0644u, 0750u, false),
          std::tuple(0644u, 0711u, true)}) {
        ASSERT_EQ(chmod(file.c_str(), fileMode), 0);
        ASSERT_EQ(chmod(folder.c_str(), folderMode), 0);
        const Sent sent = AnswerOf(file);
        EXPECT_EQ(FastLine(sent) != "none", isLeft) << fileMode << " " << folderMode;
        EXPECT_EQ(sent.Body(), isLeft ? "" : "content") << fileMode << " " << folderMode;
    }
}

TEST_F(FastFileOutput, IsNotForAFileThatIsGoneOrWhoseNameIsNoPlainUtf8) {
    Set(kSetting);
    const std::string file = "/etc/fast-output-gone";
    WriteFile(file, "content");
    const Sent gone = Answer({{"REQUEST_METHOD", "GET"}}, [&] {
        FILE* stream = fopen(file.c_str(), "re");
        unlink(file.c_str());
        WriteFile(file, "another");
        chmod(file.c_str(), 0644);
        return HTTPFileOutputer().Output(stream, "", "a/b");
    });
    EXPECT_EQ(FastLine(gone), "none");
    EXPECT_EQ(gone.Body(), "content");
    for (const std::string odd : {"/etc/fast-output-\xff", "/etc/fast-output-\n", "/etc/fast-output-\x7f"}) {
        WriteFile(odd, "content");
        ASSERT_EQ(chmod(odd.c_str(), 0644), 0);
        const Sent sent = AnswerOf(odd);
        EXPECT_EQ(FastLine(sent), "none") << odd;
        EXPECT_EQ(sent.Body(), "content") << odd;
        unlink(odd.c_str());
    }
    unlink(file.c_str());
}

}  // namespace
