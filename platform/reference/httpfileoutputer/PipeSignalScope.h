#pragma once

#include <csignal>

namespace reference {

/**
 * Within it a client that is gone makes writing fail and ends no process, whatever the program does with SIGPIPE. A
 * signal that came meanwhile is taken away at the end. Changes this thread alone, and no `errno`.
 */
class [[nodiscard]] PipeSignalScope {
public:
    PipeSignalScope();
    PipeSignalScope(const PipeSignalScope&) = delete;
    PipeSignalScope& operator=(const PipeSignalScope&) = delete;
    ~PipeSignalScope();

private:
    sigset_t pipeSignal;
    sigset_t saved;
    bool isBlocked = false;
    bool wasPending = false;
};

}  // namespace reference
