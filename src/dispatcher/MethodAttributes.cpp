#include "dispatcher/MethodAttributes.h"

#include "envelope/APIRequestPrivate.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"

namespace ZOVA {

const Json::Value& MethodAttributes(APIRunner& runner, const CallName& call) {
    const Json::Value& attributes = runner.GetMethod(call.api, call.version, call.method);
    return Json::isObject(attributes) ? attributes : runner.GetMethod("", 0, "");
}

}  // namespace ZOVA
