#include "ForwardedCall.h"

#include <syslog.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APIRunner.h>
#include <webapi/Json.h>

#include <cstdlib>

namespace host {
namespace {

/** Both parts, each an object. */
bool ReadMessage(const std::string& text, Json::Value& request, Json::Value& response) {
    Json::Value message;
    if (!Json::fromString(message, text) || message.type() != Json::objectValue) {
        return false;
    }
    for (const auto& [name, part] : {std::pair("req", &request), std::pair("resp", &response)}) {
        if (!message.isMember(name) || message[name].type() != Json::objectValue) {
            return false;
        }
        part->swap(message[name]);
    }
    return true;
}

}  // namespace

std::optional<std::string> RunForwardedCall(const std::string& message) {
    Json::Value requestParts;
    Json::Value responseParts;
    if (!ReadMessage(message, requestParts, responseParts)) {
        syslog(LOG_ERR, "a message of %zu bytes is no object with \"req\" and \"resp\"", message.size());
        return std::nullopt;
    }
    if (setenv("in_zovaapid", "1", 1) != 0) {
        syslog(LOG_ERR, "a call cannot be run: %m");
        return std::nullopt;
    }
    ZOVA::APIRequest request{Json::Value()};
    request.Deserialize(requestParts);
    ZOVA::APIResponse response(&request);
    response.Deserialize(responseParts);
    ZOVA::APIRunner runner;
    runner.Process(&request, &response);
    return Json::toString(response.Serialize());
}

}  // namespace host
