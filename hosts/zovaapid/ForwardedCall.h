#pragma once

#include <optional>
#include <string>

namespace host {

/**
 * Runs a call that another process has admitted and authorised: `message` is an object with the serialised request in
 * "req" and the serialised response in "resp". Sets the variable "in_zovaapid", by which the framework knows not to
 * forward the call again. To be called once, in a process that ends afterwards.
 * @return the serialised response; nothing, with a line in the log, for any other message.
 */
std::optional<std::string> RunForwardedCall(const std::string& message);

}  // namespace host
