#include "envelope/APIResponsePrivate.h"

#include "webapi/Json.h"

namespace ZOVA {

APIResponsePrivate::APIResponsePrivate(APIRequest* answeredRequest, APIResponse* owner)
    : request(answeredRequest), response(owner), task(nullptr) {
    InitField("headers");
    data["setCookie"] = Json::Value(Json::arrayValue);
    InitField("success");
    InitField("option");
    data["code"] = 0;
    SetData("headers", "Content-type", "application/json; charset=\"UTF-8\"", true);
}

APIResponsePrivate::~APIResponsePrivate() = default;

void APIResponsePrivate::SetOutcome(int code, const Json::Value& extra) {
    Json::Value body(Json::objectValue);
    body["success"] = code == 0;
    if (code != 0) {
        body["error"]["code"] = code;
        if (!extra.isNull()) {
            body["error"]["errors"] = extra;
        }
    } else if (!extra.isNull()) {
        body["data"] = extra;
    }
    if (!data.isObject()) {
        // A foreign document must not keep an error from being reported.
        data = Json::Value(Json::objectValue);
    }
    data["code"] = code;
    data["body"].swap(body);
}

}  // namespace ZOVA
