#include "webapi/APIRequest.h"

#include <functional>

#include "FrameworkTest.h"
#include "zovasharing.h"

using unit::J;
using ZOVA::APIRequest;

namespace {

constexpr const char* kEmptySections = R"({"environ": {}, "cookie": {}, "reqLib": {}, "session": {}, "param": {},
    "attr": {}, "url": {}, "userAgent": {}, "private": {"requestMethod": 0}})";

class APIRequestTest : public unit::FrameworkTest {
protected:
    APIRequest request{Json::Value()};
};

// ---- construction ----

TEST_F(APIRequestTest, NothingAndAnEmptyObjectGiveNineEmptySections) {
    for (const char* init : {"null", "{}", "[]", "5", "\"x\"", "[1]"}) {
        APIRequest made(J(init));
        EXPECT_JSON(made.Serialize(), kEmptySections) << init;
        EXPECT_EQ(made.GetRequestMethod(), 0) << init;
    }
}

TEST_F(APIRequestTest, IsBuiltFromItsMembersAndIgnoresOthers) {
    APIRequest made(J(R"({"environ": {"REQUEST_METHOD": "POST"}, "getParam": {"a": 1, "api": "A"},
        "postParam": {"a": 2, "version": 3, "method": "m"}, "reqLib": {"lib": "x"}, "session": {"username": "u"},
        "attr": {"x": 1}, "other": 5})"));
    EXPECT_EQ(made.GetRequestMethod(), 2);
    EXPECT_EQ(made.GetParam("a", 0).asInt(), 2);
    EXPECT_EQ(made.GetAPIClass(), "A");
    EXPECT_EQ(made.GetAPIVersion(), 3);
    EXPECT_EQ(made.GetAPIMethod(), "m");
    EXPECT_EQ(made.GetAPIInfo("lib", "").asString(), "x");
    EXPECT_EQ(made.GetLoginUserName(), "u");
    EXPECT_FALSE(made.HasAttr("x"));
    EXPECT_EQ(made.Serialize().size(), 9U);
}

// ---- filling ----

TEST_F(APIRequestTest, TheEnvironmentDropsNumbersAndKeepsTexts) {
    request.InitEnv(J(R"({"A": "1", "B": 2, "C": null, "D": {}})"));
    EXPECT_JSON(request.GetEnv("", "d"), R"({"A": "1"})");
    EXPECT_TRUE(request.HasEnv("A"));
    EXPECT_FALSE(request.HasEnv("B"));
}

TEST_F(APIRequestTest, VariablesAddUpAndAreOverwrittenOneByOne) {
    request.InitEnv(J(R"({"A": "1", "B": "1"})"));
    request.InitEnv(J(R"({"B": "2", "C": "2"})"));
    EXPECT_JSON(request.GetEnv("", "d"), R"({"A": "1", "B": "2", "C": "2"})");
}

TEST_F(APIRequestTest, AnEmptyKeyYieldsTheWholeEnvironmentAndNeverTheDefault) {
    EXPECT_JSON(request.GetEnv("", "d"), "{}");
    EXPECT_FALSE(request.HasEnv(""));
}

TEST_F(APIRequestTest, APostParameterWinsOverAGetParameter) {
    request.InitParam(J(R"({"getParam": {"a": 1, "b": 1, "api": "G", "version": 1, "method": "g"},
                            "postParam": {"a": 2, "api": "P", "method": "p"}})"),
                      false);
    EXPECT_JSON(request.GetParam("a", 0), "2");
    EXPECT_JSON(request.GetParam("b", 0), "1");
    EXPECT_EQ(request.GetAPIClass(), "P");
    EXPECT_EQ(request.GetAPIVersion(), 1);
    EXPECT_EQ(request.GetAPIMethod(), "p");
}

TEST_F(APIRequestTest, ClearingRemovesEarlierParametersButNotTheCallsName) {
    request.InitParam(J(R"({"getParam": {"a": 1, "api": "A"}})"), false);
    request.InitParam(J(R"({"postParam": {"b": 2}})"), false);
    EXPECT_JSON(request.GetParam("", 0), R"({"a": 1, "api": "A", "b": 2})");
    request.InitParam(J("{}"), true);
    EXPECT_JSON(request.GetParam("", 0), "{}");
    EXPECT_EQ(request.GetAPIClass(), "A");
}

TEST_F(APIRequestTest, TheCallersValueIsNotChanged) {
    const Json::Value init = J(R"({"getParam": {"a": 1}, "postParam": {"a": 2}})");
    const Json::Value before = init;
    request.InitParam(init, false);
    EXPECT_EQ(init, before);
}

TEST_F(APIRequestTest, SessionAndDescriptionAreReplacedAndNotMerged) {
    request.InitSession(J(R"({"a": 1})"));
    request.InitSession(J(R"({"b": 2})"));
    request.InitAPIInfo(J(R"({"a": 1})"));
    request.InitAPIInfo(J(R"({"b": 2})"));
    EXPECT_JSON(request.Serialize()["session"], R"({"b": 2})");
    EXPECT_JSON(request.GetAPIInfo("", 0), R"({"b": 2})");
    for (const char* empty : {"null", "{}", "5", "[1]", "\"x\""}) {
        request.InitSession(J(R"({"a": 1})"));
        request.InitAPIInfo(J(R"({"a": 1})"));
        request.InitSession(J(empty));
        request.InitAPIInfo(J(empty));
        EXPECT_JSON(request.Serialize()["session"], "{}") << empty;
        EXPECT_JSON(request.Serialize()["reqLib"], "{}") << empty;
    }
}

struct NameCase {
    const char* name;
    const char* value;
    const char* text;
    int number;
};

class CallName : public APIRequestTest, public ::testing::WithParamInterface<NameCase> {};

TEST_P(CallName, OfAnyTypeIsReadWithoutThrowing) {
    const NameCase& row = GetParam();
    Json::Value init(Json::objectValue);
    for (const char* key : {"api", "version", "method"}) {
        init["postParam"][key] = J(row.value);
    }
    EXPECT_NO_THROW(request.InitParam(init, false));
    EXPECT_EQ(request.GetAPIClass(), row.text);
    EXPECT_EQ(request.GetAPIMethod(), row.text);
    EXPECT_EQ(request.GetAPIVersion(), row.number);
}

INSTANTIATE_TEST_SUITE_P(Rows, CallName,
                         ::testing::Values(NameCase{"Text", "\"A\"", "A", 0}, NameCase{"Number", "5", "5", 5},
                                           NameCase{"DecimalText", "\"5\"", "5", 5}, NameCase{"Array", "[]", "", 0},
                                           NameCase{"Object", "{}", "", 0}, NameCase{"Null", "null", "", 0},
                                           NameCase{"Bool", "true", "true", 1},
                                           NameCase{"Huge", "18446744073709551615", "18446744073709551615", 0},
                                           NameCase{"Real", "1.5", "1.5", 1}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_F(APIRequestTest, AskingForANameThatNeverArrivedCreatesItWithNull) {
    EXPECT_EQ(request.GetAPIClass(), "");
    EXPECT_JSON(request.Serialize()["private"], R"({"api": null, "requestMethod": 0})");
    EXPECT_EQ(request.GetAPIVersion(), 0);
    EXPECT_EQ(request.GetAPIMethod(), "");
    EXPECT_JSON(request.Serialize()["private"],
                R"({"api": null, "method": null, "requestMethod": 0, "version": null})");
}

// ---- transport ----

TEST_F(APIRequestTest, AfterDeserializeTheArgumentHoldsThePreviousStore) {
    Json::Value in = J(R"({"param": {"a": 1}, "private": {"requestMethod": 2}, "environ": {"HTTP_COOKIE": "x=1"}})");
    request.Deserialize(in);
    EXPECT_JSON(in, kEmptySections);
    EXPECT_EQ(request.GetRequestMethod(), 2);
    EXPECT_EQ(request.GetParam("a", 0).asInt(), 1);
    EXPECT_FALSE(request.HasCookie("x")) << "cookies travel in their own section";
}

TEST_F(APIRequestTest, ACopyAnswersLikeItsSourceWithoutAskingTheSharingDatabase) {
    platform.sharingEntries["hash"] = {};
    platform.sharingSession.id = 3;
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": "hash", "HTTP_COOKIE": "sharing_sid=s"})"));
    ASSERT_TRUE(request.IsSharing());
    platform.calls.clear();
    const APIRequest copy(request);
    EXPECT_TRUE(platform.calls.empty());
    EXPECT_TRUE(copy.IsSharing());
    EXPECT_EQ(copy.GetSharingID(), "hash");
    EXPECT_EQ(copy.GetSharingSID(), "s");
    EXPECT_EQ(copy.GetSharingEntry().hash, "hash");
    EXPECT_EQ(copy.GetSharingSession().id, 3);
    EXPECT_EQ(copy.GetSharingToken().id, 3);
    EXPECT_EQ(copy.Serialize(), request.Serialize());
}

TEST_F(APIRequestTest, ADeserialisedRequestReadsTheSharingDatabaseAgain) {
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": "hash"})"));
    Json::Value travelled = request.Serialize();
    platform.calls.clear();
    APIRequest received{Json::Value()};
    received.Deserialize(travelled);
    EXPECT_TRUE(received.IsSharing());
    EXPECT_EQ(platform.CountOf("EntryDB::GetByHash"), 1);
}

TEST_F(APIRequestTest, ACopyIsIndependent) {
    request.SetAttr("a", 1);
    APIRequest copy(request);
    copy.SetAttr("a", 2);
    EXPECT_EQ(request.GetAttr("a", 0).asInt(), 1);
}

// ---- documents of any shape ----

class RequestDocument : public APIRequestTest, public ::testing::WithParamInterface<const char*> {};

TEST_P(RequestDocument, NeverMakesAnOperationThrow) {
    Json::Value document = J(GetParam());
    EXPECT_NO_THROW({
        request.Deserialize(document);
        EXPECT_EQ(request.GetAPIClass(), "");
        EXPECT_EQ(request.GetAPIVersion(), 0);
        EXPECT_EQ(request.GetAPIMethod(), "");
        EXPECT_EQ(request.GetRequestMethod(), 0);
        EXPECT_EQ(request.GetParam("a", 7), Json::Value(7));
        EXPECT_EQ(request.GetAPIInfo("a", 7), Json::Value(7));
        EXPECT_EQ(request.GetEnv("a", 7), Json::Value(7));
        EXPECT_EQ(request.GetCookie("a", "d"), "d");
        EXPECT_EQ(request.GetAttr("a", 7), Json::Value(7));
        EXPECT_FALSE(request.HasParam("a"));
        EXPECT_FALSE(request.HasCookie("a"));
        EXPECT_FALSE(request.SetCookie("a", "b"));
        request.SetAttr("a", 1);
        EXPECT_EQ(request.GetURLProto("d"), "d");
        EXPECT_EQ(request.GetURLHost("d"), "d");
        EXPECT_EQ(request.GetURLPort(9), 9);
        EXPECT_EQ(request.GetURLPath("d"), "d");
        EXPECT_EQ(request.GetURLName("d"), "d");
        EXPECT_EQ(request.GetLoginUserName(), "");
        EXPECT_EQ(request.GetLoginUID(), 4294967295U);
        EXPECT_EQ(request.GetAllowUser(), 0);
        EXPECT_EQ(request.GetAuthResult(), -4);
        request.SetAuthResult(ZOVA::AUTHORIZED_RESULT_OK);
        EXPECT_FALSE(request.IsUploadRequest());
        EXPECT_FALSE(request.IsPollingTask());
        EXPECT_TRUE(request.IsTimeout());
        EXPECT_FALSE(request.IsAdmin());
        EXPECT_EQ(request.GetZovaAccessTokenID(), nullptr);
        EXPECT_TRUE(request.GetAndCheckInt("a", APIRequest::PARAM_REQUIRED).IsInvalid());
        request.InitEnv(J(R"({"HTTP_COOKIE": "a=b", "REQUEST_METHOD": "GET"})"));
        request.InitParam(J(R"({"postParam": {"api": "A"}})"), true);
        request.InitSession(J(R"({"username": "u"})"));
        request.InitAPIInfo(J(R"({"lib": "x"})"));
        const APIRequest copy(request);
    });
}

INSTANTIATE_TEST_SUITE_P(
    Rows, RequestDocument,
    ::testing::Values("null", "{}", "[]", "5", "\"x\"", "true",
                      R"({"environ": null, "cookie": null, "reqLib": null, "session": null, "param": null,
                          "attr": null, "url": null, "userAgent": null, "private": null})",
                      R"({"environ": 5, "cookie": 5, "reqLib": 5, "session": 5, "param": 5, "attr": 5, "url": 5,
                          "userAgent": 5, "private": 5})",
                      R"({"environ": [1], "cookie": "x", "reqLib": [], "session": "x", "param": [1], "attr": true,
                          "url": [1], "userAgent": [], "private": []})"));

// ---- accessors ----

TEST_F(APIRequestTest, CookiesAreTextsWithACallersDefault) {
    EXPECT_TRUE(request.SetCookie("a", "1"));
    EXPECT_FALSE(request.SetCookie("", "1"));
    EXPECT_TRUE(request.HasCookie("a"));
    EXPECT_EQ(request.GetCookie("a", "d"), "1");
    EXPECT_EQ(request.GetCookie("b", "d"), "d");
    Json::Value odd = J(R"({"cookie": {"n": 5, "o": {}, "z": null}})");
    request.Deserialize(odd);
    for (const char* key : {"n", "o", "z"}) {
        EXPECT_TRUE(request.HasCookie(key));
        EXPECT_EQ(request.GetCookie(key, "d"), "d") << key;
    }
}

TEST_F(APIRequestTest, ParametersCanBeReadWithoutACopy) {
    request.InitParam(J(R"({"getParam": {"a": [1]}})"), false);
    const Json::Value fallback;
    EXPECT_EQ(&request.GetParamRef("a", fallback), &request.Serialize()["param"]["a"]);
    EXPECT_EQ(&request.GetParamRef("b", fallback), &fallback);
}

TEST_F(APIRequestTest, AttributesTakeAnyTypeButNoEmptyKey) {
    request.SetAttr("a", J(R"({"b": [1]})"));
    request.SetAttr("", 1);
    EXPECT_JSON(request.GetAttr("", 0), R"({"a": {"b": [1]}})");
    EXPECT_TRUE(request.HasAttr("a"));
}

TEST_F(APIRequestTest, TheAuthorisationResultIsMinusFourBeforeAuthorisation) {
    EXPECT_EQ(request.GetAuthResult(), -4);
    request.SetAuthResult(ZOVA::AUTHORIZED_RESULT_OK_ALSO);
    EXPECT_EQ(request.GetAuthResult(), 2);
    EXPECT_JSON(request.Serialize()["session"], R"({"authResult": 2})");
}

TEST_F(APIRequestTest, DefaultsOfPlainAccessors) {
    EXPECT_EQ(request.GetRemoteIP(), "");
    EXPECT_EQ(request.GetUILanguage(), "enu");
    EXPECT_FALSE(request.IsTokenEnable());
    EXPECT_FALSE(request.IsDemoMode());
    EXPECT_EQ(request.GetPollingTaskId(), "");
}

TEST_F(APIRequestTest, TheTokenSettingIsAnIntReadAsABool) {
    request.InitSession(J(R"({"tokenEnable": 1})"));
    EXPECT_TRUE(request.IsTokenEnable());
    request.InitSession(J(R"({"tokenEnable": 0})"));
    EXPECT_FALSE(request.IsTokenEnable());
}

TEST_F(APIRequestTest, APollingTaskHasTaskIdAndTaskUser) {
    request.InitEnv(J(R"({"task_id": "1"})"));
    EXPECT_FALSE(request.IsPollingTask());
    request.InitEnv(J(R"({"task_user": "u", "full_task_id": "u/1"})"));
    EXPECT_TRUE(request.IsPollingTask());
    EXPECT_EQ(request.GetPollingTaskId(), "u/1");
}

struct UploadCase {
    const char* name;
    const char* environment;
    bool upload;
    bool slice;
};

class UploadKind : public APIRequestTest, public ::testing::WithParamInterface<UploadCase> {};

TEST_P(UploadKind, IsToldByTypeAndHeader) {
    request.InitEnv(J(GetParam().environment));
    EXPECT_EQ(request.IsUploadRequest(), GetParam().upload);
    EXPECT_EQ(request.IsSliceUploadRequest(), GetParam().slice);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, UploadKind,
    ::testing::Values(UploadCase{"Nothing", "{}", false, false},
                      UploadCase{"Multipart", R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})", true, false},
                      UploadCase{"MultipartAnywhere", R"({"CONTENT_TYPE": "a/b; multipart/form-data"})", true, false},
                      UploadCase{"Capitals", R"({"CONTENT_TYPE": "MULTIPART/FORM-DATA; boundary=x"})", false, false},
                      UploadCase{"CapitalsAndSlice",
                                 R"({"CONTENT_TYPE": "MULTIPART/FORM-DATA", "HTTP_X_TYPE_NAME": "SliceUpload"})", true,
                                 true},
                      UploadCase{"Slice", R"({"HTTP_X_TYPE_NAME": "SLICEUPLOAD"})", true, true},
                      UploadCase{"SliceInSmallLetters", R"({"HTTP_X_TYPE_NAME": "sliceupload"})", true, true},
                      UploadCase{"OtherName", R"({"HTTP_X_TYPE_NAME": "SLICEUPLOADS"})", false, false},
                      UploadCase{"Form", R"({"CONTENT_TYPE": "application/x-www-form-urlencoded"})", false, false}),
    [](const auto& row) { return std::string(row.param.name); });

}  // namespace
