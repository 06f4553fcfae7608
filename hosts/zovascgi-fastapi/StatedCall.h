#pragma once

#include <optional>
#include <string>

namespace host {

/**
 * Runs the call that a run description states: "params" with "api", "version", "method" and the parameters, "runner"
 * with "username", and optionally "env" and "attr". The call is authorised as that user. It runs in this process, whose
 * identity the method may change for good: to be called once, in a process that ends afterwards.
 * @return the body of the answer, error 101 for a description without an API, a method and a user; nothing, with a
 * line in the log, for a text that is no JSON object.
 */
std::optional<std::string> RunStatedCall(const std::string& message);

}  // namespace host
