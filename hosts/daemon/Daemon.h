#pragma once

#include <functional>
#include <optional>
#include <string>

#include "../prefork/CommandLine.h"

namespace host {

/**
 * What a daemon answers to one message; runs in a child of its own, in the folder of the description files. Nothing
 * drops the peer, and has been logged then.
 */
using Answer = std::function<std::optional<std::string>(const std::string& message)>;

/**
 * The `main` of a daemon that takes one framed text per connection and sends one back. Serves root, and with --group
 * the members of that group. A peer without the right, or that sends no whole text in time, is dropped with one line in
 * the log; one that says nothing and goes away again, without.
 * @return the exit status.
 */
int RunDaemon(const Program& program, int argc, char** argv, const Answer& answer);

}  // namespace host
