#pragma once

#include <sys/types.h>

#include <functional>

#include "ListeningSocket.h"

namespace host {

/**
 * Serves one connection, in a child that ends when this returns. The connection is its to close, but not before its
 * last fork: a child of it closes its copy of that descriptor by number. An exception is logged and ends the child.
 */
using Serve = std::function<void(int connection)>;

/** What a child needs of its parent. */
struct WaitingPlace {
    ListeningSocket& socket;
    /** Readable when the parent wants no waiting children any more, and when it has ended. */
    Descriptor& retired;
    /** Takes the child's process id, once, when it has got a connection. */
    Descriptor& reporting;
    pid_t parent;
};

/**
 * The life of a child: waits, serves one connection with default signal handling and in a session of its own, ends.
 * Dies with its parent, unless the call has changed its user meanwhile, which makes the kernel forget that.
 */
[[noreturn]] void WaitAndServe(const WaitingPlace& place, const Serve& serve);

/** Makes every child that a serving child forks let go of the connection. To be called once, by the parent. */
bool KeepConnectionFromForks();

}  // namespace host
