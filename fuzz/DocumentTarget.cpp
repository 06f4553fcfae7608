// Requests and responses made from any JSON document, as one that came over a pipe or socket.

#include "Accessors.h"
#include "Check.h"
#include "JsonRoundTrip.h"
#include "Target.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"

namespace {

void Fill(const Json::Value& document) {
    ZOVA::APIRequest request(document);
    request.InitEnv(document);
    request.InitParam(document, true);
    request.InitAPIInfo(document);
    request.InitSession(document);
    request.SetAttr("attribute", document);
    request.SetCookie("name", Json::asString(document));
    fuzz::AskEverything(request);
    fuzz::CheckCopies(request);
}

void Rebuild(Json::Value document) {
    const std::string text = Json::toString(document);
    ZOVA::APIRequest request((Json::Value()));
    request.Deserialize(document);
    FUZZ_CHECK(document.type() == Json::objectValue && document.size() == 9);
    FUZZ_CHECK(Json::toString(request.Serialize()) == text);
    fuzz::AskEverything(request);
    request.SetLoginUserName("alice");
    request.SetAuthResult(ZOVA::AUTHORIZED_RESULT_OK);
    request.InitEnv(document);
    request.InitParam(document, false);
    fuzz::AskEverything(request);
}

void RebuildResponse(Json::Value document) {
    ZOVA::APIRequest request((Json::Value()));
    ZOVA::APIResponse response(&request);
    response.Deserialize(document);
    response.GetError();
    response.GetBody();
    response.GetHeaders();
    response.GetCookies();
    response.SetHeader("Name", "value");
    response.AddCookie("name", "value", "/", 0, "", true, true);
    response.GetStatus();
    response.SetSuccess(Json::Value("data"));
    response.SetError(117, Json::Value());
    fuzz::CheckRoundTrip(response.Serialize());
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Json::Value document;
    if (Json::fromString(document, fuzz::TextOf(data, size))) {
        fuzz::CheckRoundTrip(document);
        Fill(document);
        Rebuild(document);
        RebuildResponse(document);
    } else {
        FUZZ_CHECK(document.isNull());
    }
    return 0;
}
