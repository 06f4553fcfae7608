#include "webapi/APIResponse.h"

#include <cstdlib>
#include <memory>

#include "FrameworkTest.h"
#include "envelope/APIResponsePrivate.h"
#include "webapi/APIRequest.h"

using unit::J;
using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

class APIResponseTest : public unit::FrameworkTest {
protected:
    APIResponseTest() { unsetenv("in_zovaapid"); }

    std::size_t CallbackCount() {
        return static_cast<ZOVA::ResponseCallbackList*>(response.GetCallbackFuncs())->size();
    }

    APIRequest request{Json::Value()};
    APIResponse response{&request};
};

void First(void*) {}
void Second(void*) {}

TEST_F(APIResponseTest, BeginsWithItsContentTypeAndNoBody) {
    EXPECT_JSON(response.Serialize(), R"({"headers": {"Content-type": "application/json; charset=\"UTF-8\""},
        "setCookie": [], "success": {}, "option": {}, "code": 0})");
    EXPECT_JSON(response.GetBody(), "{}");
    EXPECT_EQ(response.GetError(), 0);
    EXPECT_TRUE(response.IsEnableOutput());
    EXPECT_FALSE(response.GetHttpdRestart());
}

// ---- body forms ----

struct BodyCase {
    const char* name;
    int code;
    const char* extra;
    const char* body;
};

class Body : public APIResponseTest, public ::testing::WithParamInterface<BodyCase> {};

TEST_P(Body, HasItsExactForm) {
    const BodyCase& row = GetParam();
    response.SetError(7, "earlier");
    response.SetSuccess("earlier");
    response.SetError(row.code, J(row.extra));
    EXPECT_EQ(Json::toString(response.GetBody()), row.body);
    EXPECT_EQ(response.GetError(), row.code);
    EXPECT_JSON(response.Serialize()["success"], "{}");
    if (row.code == 0) {
        APIResponse other(&request);
        other.SetSuccess(J(row.extra));
        EXPECT_EQ(Json::toString(other.GetBody()), row.body);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Rows, Body,
    ::testing::Values(BodyCase{"SuccessWithoutData", 0, "null", R"({"success":true})"},
                      BodyCase{"EmptyObject", 0, "{}", R"({"data":{},"success":true})"},
                      BodyCase{"EmptyArray", 0, "[]", R"({"data":[],"success":true})"},
                      BodyCase{"EmptyText", 0, "\"\"", R"({"data":"","success":true})"},
                      BodyCase{"Zero", 0, "0", R"({"data":0,"success":true})"},
                      BodyCase{"False", 0, "false", R"({"data":false,"success":true})"},
                      BodyCase{"Data", 0, R"({"a":1})", R"({"data":{"a":1},"success":true})"},
                      BodyCase{"Error", 105, "null", R"({"error":{"code":105},"success":false})"},
                      BodyCase{"ErrorWithExtra", 108, R"({"upload_err":1})",
                               R"({"error":{"code":108,"errors":{"upload_err":1}},"success":false})"},
                      BodyCase{"ErrorWithEmptyExtra", 108, "{}",
                               R"({"error":{"code":108,"errors":{}},"success":false})"},
                      BodyCase{"NegativeCode", -1, "null", R"({"error":{"code":-1},"success":false})"}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(APIResponseTest, AnErrorAfterASuccessLeavesNoData) {
    response.SetSuccess(J(R"({"a": 1})"));
    response.SetError(117, J("[1]"));
    EXPECT_JSON(response.GetBody(), R"({"success": false, "error": {"code": 117, "errors": [1]}})");
    response.SetSuccess(Json::Value());
    EXPECT_JSON(response.GetBody(), R"({"success": true})");
    EXPECT_EQ(response.GetError(), 0);
}

TEST_F(APIResponseTest, ErrorNumbersAreTheirPublishedValues) {
    EXPECT_EQ(ZOVA::WEBAPI_ERR_BAD_REQUEST, 101);
    EXPECT_EQ(ZOVA::WEBAPI_ERR_NOT_AUTHENTICATED, 119);
    EXPECT_EQ(ZOVA::WEBAPI_ERR_METHOD_NOT_IN_TABLE, 121);
    EXPECT_EQ(ZOVA::WEBAPI_ERR_SHARING_APP_DENIED, 127);
    EXPECT_EQ(ZOVA::WEBAPI_ERR_IP_MISMATCH, 150);
    EXPECT_EQ(ZOVA::WEBAPI_ERR_APP_PRIVILEGE, 160);
    EXPECT_EQ(ZOVA::POLLING_ERR_NO_SUCH_TASK, 508);
}

// ---- switches ----

TEST_F(APIResponseTest, SwitchesAreKeptUnderTheirKeys) {
    response.SetEnableOutput(false);
    response.SetHttpdRestart(true);
    EXPECT_FALSE(response.IsEnableOutput());
    EXPECT_TRUE(response.GetHttpdRestart());
    EXPECT_JSON(response.Serialize()["option"], R"({"isDownload": false, "restart_httpd": true})");
}

TEST_F(APIResponseTest, AServerErrorIsThereAlsoWhenItIsEmpty) {
    EXPECT_FALSE(response.HasServerError());
    EXPECT_EQ(response.GetServerError(), "");
    response.SetServerError("");
    EXPECT_TRUE(response.HasServerError());
    EXPECT_EQ(response.GetServerError(), "");
    response.SetServerError("timeout");
    EXPECT_EQ(response.GetHeader("x-request-error", ""), "timeout");
}

TEST_F(APIResponseTest, AServerErrorStaysWhenTheCallSucceeds) {
    response.SetServerError("unauth");
    response.SetSuccess(Json::Value());
    EXPECT_EQ(response.GetServerError(), "unauth");
}

// ---- callbacks ----

TEST_F(APIResponseTest, APairOfFunctionAndArgumentIsRegisteredOnce) {
    int argument = 0;
    response.SetCallbackFunc(First, nullptr);
    response.SetCallbackFunc(First, nullptr);
    EXPECT_EQ(CallbackCount(), 1U);
    response.SetCallbackFunc(First, &argument);
    EXPECT_EQ(CallbackCount(), 2U);
    response.SetCallbackFunc(Second, nullptr);
    EXPECT_EQ(CallbackCount(), 3U);
    response.SetCallbackFunc(nullptr, nullptr);
    EXPECT_EQ(CallbackCount(), 3U);
}

TEST_F(APIResponseTest, CallbacksOfAnotherResponseAreAddedInTheirOrder) {
    APIResponse other(&request);
    other.SetCallbackFunc(First, nullptr);
    other.SetCallbackFunc(Second, nullptr);
    response.SetCallbackFunc(Second, nullptr);
    response.SetCallbackFuncs(other.GetCallbackFuncs());
    response.SetCallbackFuncs(nullptr);
    const auto& list = *static_cast<ZOVA::ResponseCallbackList*>(response.GetCallbackFuncs());
    ASSERT_EQ(list.size(), 2U);
    EXPECT_EQ(list.front().function, Second);
    EXPECT_EQ(list.back().function, First);
    response.SetCallbackFuncs(response.GetCallbackFuncs());
    EXPECT_EQ(CallbackCount(), 2U);
}

TEST_F(APIResponseTest, TheAPIDaemonRefusesCallbacksWithALine) {
    setenv("in_zovaapid", "", 1);
    response.SetCallbackFunc(First, nullptr);
    ExpectLog(LOG_ERR, "cannot use callback function in zovaapid", "APIResponse");
    EXPECT_EQ(CallbackCount(), 0U);
    response.SetCallbackFunc(nullptr, nullptr);
    ExpectLog(LOG_ERR, "cannot use callback function in zovaapid", "APIResponse");
}

TEST_F(APIResponseTest, TheDaemonIsToldByTheProcesssEnvironmentAlone) {
    request.InitEnv(J(R"({"in_zovaapid": "1"})"));
    response.SetCallbackFunc(First, nullptr);
    EXPECT_EQ(CallbackCount(), 1U);
}

// ---- transport ----

TEST_F(APIResponseTest, AfterDeserializeTheArgumentHoldsThePreviousStore) {
    const Json::Value before = response.Serialize();
    Json::Value document = J(R"({"code": 105, "body": {"success": false}})");
    response.Deserialize(document);
    EXPECT_EQ(document, before);
    EXPECT_JSON(response.Serialize(), R"({"code": 105, "body": {"success": false}})");
    EXPECT_EQ(response.GetError(), 105);
}

class ResponseDocument : public APIResponseTest, public ::testing::WithParamInterface<const char*> {};

TEST_P(ResponseDocument, NeverMakesAnOperationThrow) {
    Json::Value document = J(GetParam());
    EXPECT_NO_THROW({
        response.Deserialize(document);
        response.GetError();
        response.GetBody();
        EXPECT_TRUE(response.IsEnableOutput());
        EXPECT_FALSE(response.GetHttpdRestart());
        EXPECT_EQ(response.GetServerError(), "");
        EXPECT_FALSE(response.HasServerError());
        EXPECT_FALSE(response.SetHeader("a", "b"));
        EXPECT_FALSE(response.HasHeader("a"));
        EXPECT_EQ(response.GetHeader("a", "d"), "d");
        EXPECT_JSON(response.GetHeaders(), "{}");
        EXPECT_JSON(response.GetCookies(), "[]");
        EXPECT_EQ(response.GetStatus(), 200);
        EXPECT_FALSE(response.SetStatus(ZOVA::HTTP_STATUS_NOT_FOUND, "m"));
        EXPECT_FALSE(response.Redirect("/x"));
        response.SetEnableOutput(false);
        response.SetHttpdRestart(true);
        response.SetServerError("x");
        response.SetError(105, "extra");
    });
    EXPECT_EQ(response.GetError(), 105);
    EXPECT_JSON(response.GetBody(), R"({"success": false, "error": {"code": 105, "errors": "extra"}})");
}

INSTANTIATE_TEST_SUITE_P(Rows, ResponseDocument,
                         ::testing::Values("null", "[]", "5", "\"x\"", "{}",
                                           R"({"headers": null, "setCookie": null, "option": null, "code": null,
                                               "body": null})",
                                           R"({"headers": 5, "setCookie": {}, "option": [1], "code": {}, "body": 5})",
                                           R"({"headers": [], "setCookie": "x", "option": "x", "code": "x",
                                               "body": []})"));

}  // namespace
