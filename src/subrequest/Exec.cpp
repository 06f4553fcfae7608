#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"

namespace ZOVA {

// Out-of-band execution is not served yet: every form answers as one whose child could not be started.

namespace {

Json::Value NotStarted() {
    Json::Value result(Json::objectValue);
    result["success"] = false;
    result["error"]["code"] = static_cast<int>(WEBAPI_ERR_INTERNAL);
    return result;
}

}  // namespace

Json::Value APIRunner::Exec(const ExecParam&) {
    return NotStarted();
}

void APIRunner::Exec(Json::Value& result, int, const char*, int, const char*, const Json::Value&, const Json::Value&,
                     const char*) {
    result = NotStarted();
}

void APIRunner::Exec(Json::Value& result, const char* api, int version, const char* method, const Json::Value& params,
                     const Json::Value& attr, const char* runner) {
    Exec(result, -1, api, version, method, params, attr, runner);
}

void APIRunner::Exec(Json::Value& result, const char* api, int version, const char* method, const Json::Value& params,
                     const char* runner) {
    Exec(result, -1, api, version, method, params, Json::Value(), runner);
}

}  // namespace ZOVA
