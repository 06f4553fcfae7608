#include "envelope/APIResponsePrivate.h"

#include "taskmanager.h"
#include "webapi/APIRequest.h"
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

APIResponsePrivate::~APIResponsePrivate() {
    delete task;
}

void APIResponsePrivate::SetOutcome(int code, const Json::Value& extra) {
    if (task == nullptr && request != nullptr && request->IsPollingTask()) {
        const std::string owner = Json::asString(request->GetEnv("task_user", ""));
        const std::string id = Json::asString(request->GetEnv("task_id", ""));
        task = new ZELM::Task(owner.c_str(), id.c_str());
    }
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
    if (task != nullptr) {
        task->beginUpdate();
        task->setProperty("body", data["body"]);
        task->setProperty("task_run", true);
        task->endUpdate();
    }
}

}  // namespace ZOVA
