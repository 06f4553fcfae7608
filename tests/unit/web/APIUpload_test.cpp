// The step-by-step form of an upload, as a method with "deferUpload" uses it.

#include "webapi/APIUpload.h"

#include <cerrno>

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"

namespace {

unsigned long long toldRead;
unsigned long long toldTotal;

class APIUploadTest : public unit::FrameworkTest {
protected:
    APIUploadTest() : request(unit::J(R"({"environ": {"CONTENT_LENGTH": "1000"}})")) {
        platform.freeBytes["/tmp"] = 100000000;
        platform.upload.fields = {{"note", "hello"}};
        platform.upload.files = {{"file", "/tmp/part-1"}};
        platform.upload.partName = "file";
        platform.upload.partValue = "photo.jpg";
        platform.upload.readBytes = 300;
        platform.upload.totalBytes = 1000;
        platform.upload.status = 0;
    }

    ZOVA::APIRequest request;
    Json::Value out{Json::objectValue};
};

TEST_F(APIUploadTest, GivesTheFieldsAndTheClientsNameOfTheFileThenItsPath) {
    {
        ZOVA::APIUpload upload(&request);
        EXPECT_EQ(upload.GetUploadParam(out), 0);
        EXPECT_JSON(out, R"({"file": "photo.jpg", "note": "hello"})");
        EXPECT_EQ(upload.GetUploadFile(out), 0);
        EXPECT_JSON(out, R"({"file": "/tmp/part-1", "note": "hello"})");
    }
    EXPECT_EQ(platform.CallsOf({"ZovaCgiLoadUploadParams", "ZovaCgiLoadUploadFileToDir", "VolumeAvailGet"}),
              (std::vector<std::string>{"ZovaCgiLoadUploadParams(256, 64, 491)", "VolumeAvailGet(5243880, -1, 1)",
                                        "ZovaCgiLoadUploadFileToDir(/tmp, boundary, file)"}));
    EXPECT_EQ(platform.openHashes, 0);
}

TEST_F(APIUploadTest, HasARecordOfItsOwnThatIsGivenBack) {
    { ZOVA::APIUpload upload(&request); }
    EXPECT_EQ(platform.CallsOf({"ZovaCgiInit", "ZovaCgiFree"}),
              (std::vector<std::string>{"ZovaCgiInit()", "ZovaCgiFree()"}));
}

TEST_F(APIUploadTest, AFileBeforeTheFieldsWereReadIsMinusEight) {
    ZOVA::APIUpload upload(&request);
    EXPECT_EQ(upload.GetUploadFile(out), -8);
    EXPECT_JSON(out, "{}");
}

TEST_F(APIUploadTest, AFileIsMinusEightWithoutAPartThatWasReached) {
    for (std::string* text : {&platform.upload.boundary, &platform.upload.partName, &platform.upload.partValue}) {
        const std::string before = std::exchange(*text, "");
        ZOVA::APIUpload upload(&request);
        Json::Value fields(Json::objectValue);
        upload.GetUploadParam(fields);
        EXPECT_EQ(upload.GetUploadFile(out), -8);
        *text = before;
    }
    EXPECT_EQ(platform.CountOf("ZovaCgiLoadUploadFileToDir"), 0);
}

TEST_F(APIUploadTest, WithoutAPartTheParametersAreTheFieldsAlone) {
    platform.upload.partName = "";
    ZOVA::APIUpload upload(&request);
    platform.upload.status = 1;
    EXPECT_EQ(upload.GetUploadParam(out), 1);
    EXPECT_JSON(out, R"({"note": "hello"})");
}

TEST_F(APIUploadTest, AnEmptyBodyIsMinusSix) {
    platform.upload.totalBytes = 0;
    ZOVA::APIUpload upload(&request);
    upload.GetUploadParam(out);
    EXPECT_EQ(upload.GetUploadFile(out), -6);
}

TEST_F(APIUploadTest, WithoutRoomAFileIsMinusTwoAndTheCoreLibrarysErrorStays) {
    platform.freeBytes["/tmp"] = 5243879;
    platform.freeBytes["/"] = 209715200;
    ZOVA::APIUpload upload(&request);
    upload.GetUploadParam(out);
    EXPECT_EQ(upload.GetUploadFile(out), -2);
    EXPECT_EQ(platform.coreErrors, (std::vector<int>{0x2900, 0x2900}));
    EXPECT_EQ(platform.CountOf("ZovaCgiLoadUploadFileToDir"), 0);
}

TEST_F(APIUploadTest, AVarTmpThatCannotBeMadeLeavesItsOwnError) {
    platform.freeBytes["/tmp"] = 0;
    platform.freeBytes["/"] = 500000000;
    platform.Fail("ZOVAFSMkdirP", EROFS);
    ZOVA::APIUpload upload(&request);
    EXPECT_EQ(upload.GetUploadAll(out, nullptr), -2);
    EXPECT_EQ(platform.coreErrors, (std::vector<int>{0x2900, 0xC00}));
}

TEST_F(APIUploadTest, AFileSystemThatCannotBeAskedStoresNoError) {
    platform.freeBytes.clear();
    ZOVA::APIUpload upload(&request);
    EXPECT_EQ(upload.GetUploadAll(out, nullptr), -2);
    EXPECT_TRUE(platform.coreErrors.empty());
}

TEST_F(APIUploadTest, AFileThatFailsGivesTheStatusAndNoPath) {
    platform.Fail("ZovaCgiLoadUploadFileToDir", EIO);
    ZOVA::APIUpload upload(&request);
    upload.GetUploadParam(out);
    EXPECT_EQ(upload.GetUploadFile(out), -4);
    EXPECT_EQ(out["file"], "photo.jpg");
}

TEST_F(APIUploadTest, FieldsThatFailGiveTheStatusAndNothingElse) {
    platform.Fail("ZovaCgiLoadUploadParams", EIO);
    ZOVA::APIUpload upload(&request);
    EXPECT_EQ(upload.GetUploadParam(out), -1);
    EXPECT_JSON(out, "{}");
}

TEST_F(APIUploadTest, HandsTheProgressCallbackOn) {
    ZOVA::APIUpload upload(&request);
    upload.SetUploadCallback([](unsigned long long read, unsigned long long total) {
        toldRead = read;
        toldTotal = total;
    });
    upload.GetUploadParam(out);
    EXPECT_EQ(toldRead, 300U);
    EXPECT_EQ(toldTotal, 1000U);
}

TEST_F(APIUploadTest, TakesEverythingAtOnceWithAndWithoutAListOfFiles) {
    platform.upload.status = 1;
    ZOVA::APIUpload upload(&request);
    EXPECT_EQ(upload.GetUploadAll(out, nullptr), 1);
    EXPECT_JSON(out, R"({"file": "/tmp/part-1", "note": "hello"})");
    Json::Value list(Json::arrayValue);
    list.append("/tmp/part-0");
    EXPECT_EQ(upload.GetUploadAll(out, &list), 1);
    EXPECT_JSON(list, R"(["/tmp/part-0", "/tmp/part-1"])");
}

TEST_F(APIUploadTest, ListsTheFilesOfABodyThatFailedAndGivesNoParameters) {
    platform.upload.status = -1;
    ZOVA::APIUpload upload(&request);
    Json::Value list(Json::arrayValue);
    EXPECT_EQ(upload.GetUploadAll(out, &list), -1);
    EXPECT_JSON(list, R"(["/tmp/part-1"])");
    EXPECT_JSON(out, "{}");
    EXPECT_EQ(platform.openHashes, 0);
}

TEST_F(APIUploadTest, OutputOfAnotherTypeIsSurvived) {
    Json::Value list(Json::arrayValue);
    ZOVA::APIUpload upload(&request);
    EXPECT_EQ(upload.GetUploadParam(list), -9);
    EXPECT_EQ(upload.GetUploadFile(list), -8);
    EXPECT_JSON(list, "[]");
}

}  // namespace
