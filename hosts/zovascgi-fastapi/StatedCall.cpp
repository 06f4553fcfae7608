#include "StatedCall.h"

#include <syslog.h>
#include <webapi/ExecParam.h>
#include <webapi/Json.h>

namespace host {

std::optional<std::string> RunStatedCall(const std::string& message) {
    Json::Value description;
    if (!Json::fromString(description, message) || description.type() != Json::objectValue) {
        syslog(LOG_ERR, "a message of %zu bytes is no run description", message.size());
        return std::nullopt;
    }
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
