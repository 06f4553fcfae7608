#pragma once

#include <sys/types.h>

#include <optional>

#include "Daemon.h"

namespace host {

/** Serves one connection, in a child: checks the peer, receives, answers. Takes the connection over. Logs. */
void Converse(int connection, std::optional<gid_t> group, const Answer& answer);

}  // namespace host
