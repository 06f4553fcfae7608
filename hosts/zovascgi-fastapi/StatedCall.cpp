#include "StatedCall.h"

#include <webapi/ExecParam.h>
#include <webapi/Json.h>

namespace host {

std::optional<std::string> RunStatedCall(const std::string& message) {
    Json::Value description;
    Json::fromString(description, message);
    const ZOVA::ExecParam param(description);
    ZOVA::ExecHandler handler(param);
    if (handler.CheckParams()) {
        handler.PrepareReq();
        handler.Run(true);
    }
    Json::Value body = handler.GetResult();
    // For those who can restart the web server, and no part of the answer.
    body.removeMember("httpd_restart");
    return Json::toString(body);
}

}  // namespace host
