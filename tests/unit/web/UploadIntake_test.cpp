// An upload from the first form fields to the parameters of the method, and to the removal of its files.

#include <algorithm>
#include <cerrno>

#include "DeviceTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

using unit::Serve;
using unit::WebAnswer;
using unit::WebCall;

namespace {

class UploadIntakeTest : public unit::DeviceTest {
protected:
    UploadIntakeTest() {
        platform.freeBytes["/tmp"] = 100000000;
        platform.upload.fields = {{"note", "hello"}};
        platform.upload.files = {{"file", "/tmp/part-1"}, {"other", "/tmp/part-2"}};
    }

    static WebCall Call(const std::string& method) {
        return WebCall::Post("body")
            .With("CONTENT_TYPE", "multipart/form-data; boundary=x")
            .With("QUERY_STRING", "api=ZOVA.Test.Good&version=1&method=" + method);
    }

    static Json::Value FilesOf(const WebAnswer& answer) {
        return Json::member(Json::member(answer.request, "attr"), "upload_files");
    }

    static int UploadError(const WebAnswer& answer) {
        EXPECT_EQ(answer.ErrorCode(), 108);
        return Json::member(Json::member(answer.body["error"], "errors"), "upload_err").asInt();
    }

    static std::vector<std::string> Removed() { return {"unlink(/tmp/part-1)", "unlink(/tmp/part-2)"}; }
};

// ---- the files of a call ----

TEST_F(UploadIntakeTest, AMethodFindsFieldsAndPathsAmongItsParameters) {
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_JSON(answer.body, R"({"data": {"api": "ZOVA.Test.Good", "file": "/tmp/part-1", "method": "upload",
        "note": "hello", "other": "/tmp/part-2", "version": 1}, "success": true})");
    EXPECT_EQ(answer.CallsOf("ZovaCgiLoadUploadAll"), std::vector<std::string>{"ZovaCgiLoadUploadAll(/tmp, 0)"});
    EXPECT_EQ(answer.Header("Content-type"), "text/plain; charset=\"UTF-8\"");
}

TEST_F(UploadIntakeTest, TheFilesAreRemovedWhenTheMethodHasReturned) {
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(answer.CallsOf("unlink"), Removed());
    const auto returned = std::find(answer.calls.begin(), answer.calls.end(), "setpriority(0)");
    ASSERT_NE(returned, answer.calls.end());
    EXPECT_NE(std::find(returned, answer.calls.end(), Removed().front()), answer.calls.end());
}

TEST_F(UploadIntakeTest, TheFilesOfAMethodThatAnswersItselfAreRemovedOnceItsCallbacksAreOnTheirWay) {
    const WebAnswer answer = Serve(Call("upload_silent"));
    EXPECT_EQ(answer.child.output, "");
    EXPECT_EQ(answer.CallsOf("unlink"), Removed());
    const auto forked = std::find(answer.calls.begin(), answer.calls.end(), "QLIBCProcFork()");
    ASSERT_NE(forked, answer.calls.end());
    EXPECT_EQ(std::find(answer.calls.begin(), forked, Removed().front()), forked);
}

TEST_F(UploadIntakeTest, TheFilesGoToTheUserThatTheMethodRunsAs) {
    EXPECT_EQ(Serve(Call("upload")).CallsOf("lchown"),
              (std::vector<std::string>{"lchown(/tmp/part-1, 500, 50)", "lchown(/tmp/part-2, 500, 50)"}));
    EXPECT_TRUE(Serve(Call("upload_as_root")).CallsOf("lchown").empty());
    Good()["authLevel"] = 1;
    Install();
    EXPECT_EQ(Serve(Call("upload_lasting").With("HTTP_COOKIE", "id=alice-sid")).CallsOf("lchown"),
              (std::vector<std::string>{"lchown(/tmp/part-1, 1000, 100)", "lchown(/tmp/part-2, 1000, 100)"}));
}

TEST_F(UploadIntakeTest, TheFilesAreRemovedAfterALastingChangeOfIdentityToo) {
    Good()["authLevel"] = 1;
    Install();
    const WebAnswer answer = Serve(Call("upload_lasting").With("HTTP_COOKIE", "id=alice-sid"));
    EXPECT_EQ(answer.ErrorCode(), 0);
    EXPECT_EQ(answer.CallsOf("unlink"), Removed());
}

TEST_F(UploadIntakeTest, TheFilesAreRemovedIfTheMethodDoesNotRun) {
    Good()["runAs"] = "nobody-knows-me";
    Install();
    ExpectLog(LOG_ERR, "grantable failed. [No such file or directory]");
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(answer.ErrorCode(), 117);
    EXPECT_TRUE(answer.CallsOf("lchown").empty());
    EXPECT_EQ(answer.CallsOf("unlink"), Removed());
}

TEST_F(UploadIntakeTest, AFileThatCannotBeHandedOverRefusesTheUpload) {
    platform.Fail("lchown", EPERM, 1);
    ExpectLog(LOG_ERR, "a file of the upload cannot be handed over [Operation not permitted]", "UploadIntake.cpp");
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(UploadError(answer), -4);
    EXPECT_EQ(answer.CallsOf("unlink"), Removed());
}

TEST_F(UploadIntakeTest, ABrokenUploadIsA108AndItsFilesAreRemoved) {
    platform.upload.status = -3;
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(UploadError(answer), -3);
    EXPECT_TRUE(answer.CallsOf("dlopen").empty());
    EXPECT_EQ(answer.CallsOf("unlink"), Removed());
}

TEST_F(UploadIntakeTest, AFieldThatNamesAnotherCallDoesNotChangeWhatRuns) {
    platform.upload.fields = {{"api", "ZOVA.Test.Other"}, {"version", "2"}, {"method", "success"}};
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(answer.ErrorCode(), 0);
    EXPECT_EQ(answer.request["private"]["method"], "upload");
    EXPECT_EQ(answer.request["private"]["version"], 1);
}

TEST_F(UploadIntakeTest, OnlyPathsOfFilesThatWereStoredAreAmongTheUploadedOnes) {
    platform.upload.fields = {{"claimed", "/etc/shadow"}};
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(answer.body["data"]["claimed"], "/etc/shadow");
    EXPECT_JSON(FilesOf(answer), R"({"file": "/tmp/part-1", "other": "/tmp/part-2"})");
}

TEST_F(UploadIntakeTest, AnUploadWithoutFilesIsOne) {
    platform.upload.files.clear();
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(answer.ErrorCode(), 0);
    EXPECT_JSON(FilesOf(answer), "{}");
}

// ---- length and room ----

TEST_F(UploadIntakeTest, ALengthOfZeroIsA108WithMinusSix) {
    for (const char* length : {"0", "", "-1", "12x", " 5", "18446744073709551616"}) {
        const WebAnswer answer = Serve(Call("upload").With("CONTENT_LENGTH", length));
        EXPECT_EQ(UploadError(answer), -6) << length;
        EXPECT_TRUE(answer.CallsOf("ZovaCgiLoadUploadAll").empty()) << length;
    }
}

TEST_F(UploadIntakeTest, AFileOfExactlyTheFreeRoomLessTheMarginFitsAndOneByteMoreDoesNot) {
    platform.freeBytes["/tmp"] = 5242880 + 1000;
    platform.freeBytes["/"] = 0;
    EXPECT_EQ(Serve(Call("upload").With("CONTENT_LENGTH", "1000")).ErrorCode(), 0);
    const WebAnswer answer = Serve(Call("upload").With("CONTENT_LENGTH", "1001"));
    EXPECT_EQ(UploadError(answer), -2);
    EXPECT_TRUE(answer.CallsOf("ZovaCgiLoadUploadAll").empty());
}

TEST_F(UploadIntakeTest, ALengthThatLeavesNoRoomForTheMarginFitsNowhere) {
    platform.freeBytes["/tmp"] = 5000000;
    platform.freeBytes["/"] = 500000000;
    for (const char* length : {"18446744073709551615", "18446744073704308736", "18446744073704308735"}) {
        EXPECT_EQ(UploadError(Serve(Call("upload").With("CONTENT_LENGTH", length))), -2) << length;
    }
}

TEST_F(UploadIntakeTest, ADataVolumeComesFirst) {
    platform.volume = "/volume1";
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(answer.CallsOf("VolumeAvailGet"), std::vector<std::string>{"VolumeAvailGet(5242884, -1, 1)"});
    EXPECT_EQ(answer.CallsOf("ZOVAFSMkdirP"),
              std::vector<std::string>{"ZOVAFSMkdirP(/volume1/@tmp, 0, 1, -1, -1, 511)"});
    EXPECT_EQ(answer.CallsOf("ZovaCgiLoadUploadAll"),
              std::vector<std::string>{"ZovaCgiLoadUploadAll(/volume1/@tmp, 0)"});
}

TEST_F(UploadIntakeTest, AVolumesFolderThatCannotBeMadeIsNoReasonToGoOn) {
    platform.volume = "/volume1";
    platform.Fail("ZOVAFSMkdirP", EACCES);
    EXPECT_EQ(Serve(Call("upload")).CallsOf("ZovaCgiLoadUploadAll"),
              std::vector<std::string>{"ZovaCgiLoadUploadAll(/volume1/@tmp, 0)"});
}

TEST_F(UploadIntakeTest, OnAPortboxNoVolumeIsTried) {
    platform.volume = "/volume1";
    platform.keyValueFiles["/etc.defaults/zovainfo.conf"]["portbox"] = "yes";
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_TRUE(answer.CallsOf("VolumeAvailGet").empty());
    EXPECT_EQ(answer.CallsOf("ZovaCgiLoadUploadAll"), std::vector<std::string>{"ZovaCgiLoadUploadAll(/tmp, 0)"});
    platform.keyValueFiles["/etc.defaults/zovainfo.conf"]["portbox"] = "no";
    EXPECT_EQ(Serve(Call("upload")).CallsOf("VolumeAvailGet").size(), 1U);
}

TEST_F(UploadIntakeTest, WithoutRoomOnTmpTheRootFileSystemKeepsTwoHundredMebibytes) {
    platform.freeBytes["/tmp"] = 0;
    platform.freeBytes["/"] = 209715200 + 5242880 + 4;
    const WebAnswer fits = Serve(Call("upload"));
    EXPECT_EQ(fits.CallsOf("ZOVAFSMkdirP"), std::vector<std::string>{"ZOVAFSMkdirP(/var/tmp, 0, 1, -1, -1, 16832)"});
    EXPECT_EQ(fits.CallsOf("ZovaCgiLoadUploadAll"), std::vector<std::string>{"ZovaCgiLoadUploadAll(/var/tmp, 0)"});
    EXPECT_EQ(UploadError(Serve(Call("upload").With("CONTENT_LENGTH", "5"))), -2);
    platform.freeBytes["/"] = 209715199;
    EXPECT_EQ(UploadError(Serve(Call("upload"))), -2);
}

TEST_F(UploadIntakeTest, AVarTmpThatCannotBeMadeIsNoRoom) {
    platform.freeBytes["/tmp"] = 0;
    platform.freeBytes["/"] = 500000000;
    platform.Fail("ZOVAFSMkdirP", EROFS);
    EXPECT_EQ(UploadError(Serve(Call("upload"))), -2);
}

// ---- a call that the form fields name ----

TEST_F(UploadIntakeTest, TheFirstThreeFieldsNameTheCall) {
    platform.upload.fields = {{"api", "ZOVA.Test.Good"}, {"version", "1"}, {"method", "upload"}};
    platform.upload.readBytes = 300;
    platform.upload.totalBytes = 1000;
    const WebAnswer answer = Serve(Call("upload").With("QUERY_STRING", "api=ZOVA.Test.Good"));
    EXPECT_EQ(answer.ErrorCode(), 0);
    EXPECT_EQ(answer.CallsOf("ZovaCgiLoadUploadNumParams"),
              std::vector<std::string>{"ZovaCgiLoadUploadNumParams(3, 256)"});
    EXPECT_EQ(answer.request["environ"]["CONTENT_LENGTH"], "700");
}

TEST_F(UploadIntakeTest, AnUploadForAMethodThatTakesNoneIs115) {
    platform.upload.fields = {{"api", "ZOVA.Test.Good"}, {"version", "1"}, {"method", "success"}};
    const WebAnswer answer = Serve(Call("success").With("QUERY_STRING", ""));
    EXPECT_EQ(answer.ErrorCode(), 115);
    EXPECT_TRUE(answer.CallsOf("ZovaCgiLoadUploadAll").empty());
}

TEST_F(UploadIntakeTest, AnUploadWithoutALoginStoresNothing) {
    Good()["authLevel"] = 1;
    Install();
    const WebAnswer answer = Serve(Call("upload"));
    EXPECT_EQ(answer.ErrorCode(), 119);
    EXPECT_TRUE(answer.CallsOf("ZovaCgiLoadUploadAll").empty());
}

// ---- deferred ----

TEST_F(UploadIntakeTest, ADeferredUploadStaysOnStandardInputAndLeavesNoFiles) {
    const WebAnswer answer = Serve(Call("upload_deferred"));
    EXPECT_EQ(answer.ErrorCode(), 0);
    for (const char* call : {"ZovaCgiLoadUploadAll", "ZovaCgiLoadUploadParams", "fread", "unlink", "statvfs"}) {
        EXPECT_TRUE(answer.CallsOf(call).empty()) << call;
    }
}

// ---- memory ----

TEST_F(UploadIntakeTest, WithoutMemoryForAHashItIsMinusNineWithALineInTheLog) {
    for (int skip : {0, 1}) {
        platform.Fail("QLIBCSzHashAlloc", ENOMEM, skip, 1);
        const WebAnswer answer = Serve(Call("upload"));
        ExpectLog(LOG_ERR, "cannot alloc memory for hash!", "APIUpload.cpp");
        EXPECT_EQ(UploadError(answer), -9);
    }
}

TEST_F(UploadIntakeTest, AHashThatCannotBeConvertedIsMinusNineWithALineInTheLog) {
    for (int skip : {0, 1}) {
        platform.Fail("SzHashToJsonObj", ENOMEM, skip, 1);
        const WebAnswer answer = Serve(Call("upload"));
        ExpectLog(LOG_ERR, "cannot convert hash to Json object!", "APIUpload.cpp");
        EXPECT_EQ(UploadError(answer), -9);
        EXPECT_EQ(answer.CallsOf("unlink"), Removed());
    }
}

TEST_F(UploadIntakeTest, WithoutMemoryForTheFirstFieldsItIs101) {
    platform.Fail("QLIBCSzHashAlloc", ENOMEM);
    EXPECT_EQ(Serve(Call("upload").With("QUERY_STRING", "")).ErrorCode(), 101);
}

}  // namespace
