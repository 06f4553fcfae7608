#pragma once

#include <optional>

#include "../common/RecordList.h"

namespace package {

/**
 * Whether the record describes a server that can be asked what a bearer token stands for:
 *
 *     "enabled"   true or false
 *     "endpoint"  "https://...", a path of this device, or, as when it is absent, none: "params" then names an API
 *     "header"    lines "Name: value" with a line feed between them; may be absent
 *     "params"    text, or object that is sent as JSON; holds "{access_token}"
 *     "expect"    object that has "{userName}" and "{scope}" where the server's answer has user and scope
 */
std::optional<RecordProblem> CheckServer(const Json::Value& records, Json::ArrayIndex at);

}  // namespace package
