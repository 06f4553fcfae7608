// Out-of-band calls whose standard output is passed on.

#include <signal.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <iostream>

#include "ChildRun.h"
#include "SubrequestTest.h"
#include "webapi/APIRunner.h"
#include "webapi/ExecParam.h"
#include "webapi/Json.h"

using unit::J;
using ZOVA::APIRequest;
using ZOVA::APIResponse;
using ZOVA::APIRunner;

namespace {

using Texts = std::vector<std::string>;

constexpr const char* kInternal = R"({"success": false, "error": {"code": 117}})";

void WriteAll(int fd, const std::string& text) {
    std::size_t done = 0;
    while (done < text.size()) {
        const ssize_t written = write(fd, text.data() + done, text.size() - done);
        if (written <= 0) {
            fake::Unmodelled("output that cannot be written");
        }
        done += static_cast<std::size_t>(written);
    }
}

class ExecOutput : public unit::SubrequestTest {
protected:
    ExecOutput() {
        const fake::Suspended suspended;
        target = memfd_create("target", MFD_CLOEXEC);
        unit::Hooks()["write"] = [](APIRequest* request, APIResponse* response) {
            for (const Json::Value& part : request->GetParam("parts", Json::Value())) {
                WriteAll(STDOUT_FILENO, Json::asString(part));
            }
            response->SetSuccess("written");
        };
    }

    ~ExecOutput() override { close(target); }

    Json::Value Run(const std::string& method, const std::string& what, const Json::Value& more = Json::Value()) {
        Json::Value result;
        Json::Value params = more.isNull() ? Json::Value(Json::objectValue) : more;
        params["do"] = what;
        APIRunner::Exec(result, target, "ZOVA.Test.Hook", 1, method.c_str(), params, Json::Value(), "alice");
        return result;
    }

    Json::Value Write(const std::string& text) {
        Json::Value more(Json::objectValue);
        more["parts"].append(text);
        return Run("child", "write", more);
    }

    /** All that has reached the target since it was last asked. */
    std::string Taken() {
        const fake::Suspended suspended;
        std::string content(static_cast<std::size_t>(lseek(target, 0, SEEK_END)), '\0');
        EXPECT_EQ(pread(target, content.data(), content.size(), 0), static_cast<ssize_t>(content.size()));
        EXPECT_EQ(ftruncate(target, 0), 0);
        lseek(target, 0, SEEK_SET);
        return content;
    }

    int target;
};

constexpr const char* kHeader = "Status: 200\r\nContent-type: text/plain\r\n\r\n";

// ---- which descriptor captures ----

TEST_F(ExecOutput, ADescriptorCapturesAndTheResultComesBackToo) {
    EXPECT_JSON(Write(std::string(kHeader) + "body"),
                R"({"success": true, "data": "written", "httpd_restart": false})");
    EXPECT_EQ(Taken(), "body");
}

TEST_F(ExecOutput, WithADescriptorAlsoAGrantableMethodRunsInAChild) {
    for (const char* method : {"local", "by_default"}) {
        EXPECT_TRUE(Run(method, "succeed")["success"].asBool());
    }
    EXPECT_EQ(platform.CallsOf({"QLIBCProcForkEx"}), (Texts{"QLIBCProcForkEx(65)", "QLIBCProcForkEx(65)"}));
}

TEST_F(ExecOutput, BelowZeroNothingIsCaptured) {
    for (int fd : {-1, -5}) {
        Json::Value result;
        APIRunner::Exec(result, fd, "ZOVA.Test.Hook", 1, "local", J(R"({"do": "succeed"})"), Json::Value(), "alice");
        EXPECT_TRUE(result["success"].asBool());
    }
    EXPECT_EQ(platform.CountOf("QLIBCProcForkEx") + platform.CountOf("pipe2"), 0);
}

TEST_F(ExecOutput, DescriptorZeroCounts) {
    const unit::ChildResult child = unit::RunInChild("", [this] {
        dup2(target, 0);
        target = 0;
        const Json::Value result = Write(std::string(kHeader) + "to descriptor 0");
        Json::Value report(Json::objectValue);
        report["success"] = result["success"];
        report["text"] = Taken();
        return report;
    });
    EXPECT_TRUE(child.orderly) << child.end;
    EXPECT_JSON(child.report, R"({"success": true, "text": "to descriptor 0"})");
    EXPECT_EQ(child.output, "");
}

// ---- the header ----

struct ChunkRow {
    const char* name;
    std::string text;
    std::string body;
};

TEST_F(ExecOutput, OnlyWhatFollowsTheHeaderIsPassedOn) {
    constexpr std::size_t kChunk = 4095;
    const std::string x(kChunk, 'x');
    const ChunkRow rows[] = {
        {"nothing written", "", ""},
        {"no header", "text without an end of header", ""},
        {"no header in many chunks", x + x + x, ""},
        {"a header alone", "A: b\r\n\r\n", ""},
        {"a header of nothing", "\r\n\r\nbody", "body"},
        {"the end only in newlines", "A: b\n\nbody", ""},
        {"a body in the header's chunk", "A: b\r\n\r\nbody", "body"},
        {"a second end belongs to the body", "A: b\r\n\r\none\r\n\r\ntwo", "one\r\n\r\ntwo"},
        {"an end at a chunk's last bytes", std::string(kChunk - 4, 'x') + "\r\n\r\nbody", "body"},
        {"an end at the next chunk's first bytes", x + "\r\n\r\nbody", "body"},
        {"an end split after one byte", std::string(kChunk - 1, 'x') + "\r\n\r\nbody", ""},
        {"an end split after two bytes", std::string(kChunk - 2, 'x') + "\r\n\r\nbody", ""},
        {"an end split after three bytes", std::string(kChunk - 3, 'x') + "\r\n\r\nbody", ""},
        {"a split end and a whole one behind it", std::string(kChunk - 1, 'x') + "\r\n\r\nbo\r\n\r\ndy", "dy"},
        {"NULs in the body", std::string("A: b\r\n\r\n\0a\0", 11), std::string("\0a\0", 3)},
        {"a NUL before the end hides it", std::string("A\0b\r\n\r\nbody", 11), ""},
    };
    for (const ChunkRow& row : rows) {
        // In one write of less than a pipe's size, so that the reads, and with them the chunks, are full ones.
        EXPECT_TRUE(Write(row.text)["success"].asBool()) << row.name;
        EXPECT_EQ(Taken(), row.body) << row.name;
    }
}

TEST_F(ExecOutput, ABodyLargerThanAPipeArrivesWhole) {
    Json::Value more(Json::objectValue);
    more["parts"].append(kHeader);
    std::string body;
    for (int i = 0; i < 50; ++i) {
        const std::string part(20000 + static_cast<std::size_t>(i), static_cast<char>('a' + i % 26));
        more["parts"].append(part);
        body += part;
    }
    EXPECT_TRUE(Run("child", "write", more)["success"].asBool());
    EXPECT_TRUE(Taken() == body);
}

TEST_F(ExecOutput, WhatTheStreamsHoldBackIsPassedOnBeforeTheResult) {
    unit::Hooks()["print"] = [](APIRequest*, APIResponse* response) {
        std::cout << "A: b\r\n\r\nfrom the stream, ";
        printf("from stdio");
        response->SetSuccess(Json::Value());
    };
    HookAPI()["methods"]["1"].append(J(R"({"gated": {"grantable": true, "allowDownload": true}})"));
    HookAPI()["methods"]["1"].removeIndex(5, nullptr);
    Install();
    EXPECT_TRUE(Run("gated", "print")["success"].asBool());
    EXPECT_EQ(Taken(), "from the stream, from stdio");
}

TEST_F(ExecOutput, TheStreamObjectOfAMethodWithoutDownloadIsNotCaptured) {
    unit::Hooks()["print"] = [](APIRequest*, APIResponse* response) {
        std::cout << "A: b\r\n\r\nbody" << std::flush;
        response->SetSuccess(Json::Value());
    };
    EXPECT_TRUE(Run("local", "print")["success"].asBool());
    EXPECT_EQ(Taken(), "");
}

TEST_F(ExecOutput, WhatTheCallerHasYetToWriteIsNotTheMethods) {
    const unit::ChildResult child = unit::RunInChild("", [this] {
        printf("the caller's\r\n\r\nown");
        Write(std::string(kHeader) + "the method's");
        const std::string taken = Taken();
        fflush(stdout);
        return Json::Value(taken);
    });
    EXPECT_EQ(child.report, "the method's");
    EXPECT_EQ(child.output, "the caller's\r\n\r\nown");
}

TEST_F(ExecOutput, NothingReachesTheCallersOwnOutput) {
    const unit::ChildResult child =
        unit::RunInChild("", [this] { return Write(std::string(kHeader) + "the method's"); });
    EXPECT_TRUE(child.report["success"].asBool());
    EXPECT_EQ(child.output, "");
}

TEST_F(ExecOutput, ATargetThatRefusesDoesNotFailTheCall) {
    close(target);
    EXPECT_TRUE(Write(std::string(kHeader) + "lost")["success"].asBool());
    target = memfd_create("target", MFD_CLOEXEC);
}

// ---- results ----

TEST_F(ExecOutput, AResultThatFillsAPipeComesWhileOutputIsCaptured) {
    EXPECT_EQ(Json::asString(Run("child", "answer_long", J(R"({"size": 65000})"))["data"]).size(), 65000u);
}

TEST_F(ExecOutput, AResultLongerThanAPipeAnswers117AndHangsNobody) {
    unit::Hooks()["write_and_answer_long"] = [](APIRequest*, APIResponse* response) {
        WriteAll(STDOUT_FILENO, std::string(kHeader) + std::string(200000, 'b'));
        response->SetSuccess(std::string(200000, 'x'));
    };
    EXPECT_JSON(Run("child", "write_and_answer_long"), kInternal);
    EXPECT_EQ(Taken(), std::string(200000, 'b'));
    const std::vector<fake::LogLine>& log = platform.process.log;
    EXPECT_TRUE(
        std::any_of(log.begin(), log.end(), [](const fake::LogLine& line) { return line.text == "read json failed"; }));
    EXPECT_EQ(TakeChildren().at(0).end, "signal 13");
    platform.process.log.clear();
}

TEST_F(ExecOutput, AFailedCallIsTheResult) {
    EXPECT_JSON(Run("child", "fail"), R"({"success": false, "error": {"code": 1}, "httpd_restart": false})");
}

TEST_F(ExecOutput, ARefusedForkAnswers117AndLeavesNoDescriptor) {
    platform.Fail("QLIBCProcForkEx", EAGAIN);
    const std::vector<int> before = unit::OpenDescriptorNumbers();
    EXPECT_JSON(Run("child", "succeed"), kInternal);
    ExpectLog(LOG_ERR, "fork failed", "ExecHandler.cpp");
    EXPECT_EQ(unit::OpenDescriptorNumbers(), before);
    EXPECT_EQ(platform.CountOf("pipe2"), 2);
}

TEST_F(ExecOutput, AChildThatDiesAnswers117AndWhatItWroteStands) {
    unit::Hooks()["write_and_die"] = [](APIRequest*, APIResponse*) {
        WriteAll(STDOUT_FILENO, std::string(kHeader) + "half a bo");
        raise(SIGKILL);
    };
    EXPECT_JSON(Run("child", "write_and_die"), kInternal);
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
    ExpectLog(LOG_ERR, "read json failed", "ExecHandler.cpp");
    EXPECT_EQ(Taken(), "half a bo");
    TakeChildren();
}

TEST_F(ExecOutput, ARefusedPipeForTheResultAnswers117) {
    platform.Fail("pipe2", EMFILE, 0, 1);
    EXPECT_JSON(Write(std::string(kHeader) + "body"), kInternal);
    ExpectLog(LOG_ERR, "protocol failed", "Pipe.cpp");
    ExpectLog(LOG_ERR, "read json failed", "ExecHandler.cpp");
    EXPECT_EQ(Taken(), "body");
}

TEST_F(ExecOutput, ARefusedPipeForTheOutputLosesTheOutputOnly) {
    platform.Fail("pipe2", EMFILE, 1, 1);
    EXPECT_TRUE(Write(std::string(kHeader) + "body")["success"].asBool());
    EXPECT_EQ(Taken(), "");
}

TEST_F(ExecOutput, WithoutANullDeviceTheChildClosesItsOutputAllTheSame) {
    unit::Hooks()["break_open"] = [](APIRequest*, APIResponse* response) {
        WriteAll(STDOUT_FILENO, std::string(kHeader) + "body");
        fake::FakePlatform::Required("break_open").Fail("open", EMFILE);
        response->SetSuccess(std::string(60000, 'x'));
    };
    EXPECT_TRUE(Run("child", "break_open")["success"].asBool());
    EXPECT_EQ(Taken(), "body");
}

TEST_F(ExecOutput, TheChildHasClosedItsOutputBeforeItWritesItsResult) {
    Write(kHeader);
    const Texts calls = TakeChildren().at(0).calls;
    const auto closed = std::find(calls.rbegin(), calls.rend(), "dup2(onto 1)");
    const auto written = std::find(calls.rbegin(), calls.rend(), "write(8)");
    ASSERT_NE(closed, calls.rend());
    ASSERT_NE(written, calls.rend());
    EXPECT_GT(closed - calls.rbegin(), written - calls.rbegin());
}

}  // namespace
