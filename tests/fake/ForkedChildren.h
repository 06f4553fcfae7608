#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include "FakeProcess.h"

namespace fake {

class FakePlatform;

/** What became of a child that the code under test forked. */
struct ForkedChild {
    /** "status N" or "signal N". */
    std::string end;
    /** What it did since its fork; nothing if it ended without leaving through `_exit` or `exit`. */
    std::vector<std::string> calls;
    std::vector<LogLine> log;
};

/**
 * The real children behind `QLIBCProcForkEx`. Each goes on with a copy of the fake platform and writes down, as it
 * leaves, what it did. None outlives half a minute.
 */
class ForkedChildren {
public:
    ForkedChildren();
    ForkedChildren(const ForkedChildren&) = delete;
    ForkedChildren& operator=(const ForkedChildren&) = delete;
    ~ForkedChildren();

    /** As `fork`. The child's descriptors 0 and 1 are /dev/null; 2 stays, for what a sanitizer has to say. */
    pid_t Fork(const FakePlatform& platform);
    bool InChild() const { return parent != 0; }
    /** Parent of this process, if it is a child. */
    pid_t Parent() const { return parent; }
    /** Ends a child, after its own children. */
    [[noreturn]] void Leave(const FakePlatform& platform, int status);

    /** Waits for all; this process's own in the order of their forks, then theirs. */
    std::vector<ForkedChild> Take();

private:
    int reportFd;
    pid_t parent = 0;
    std::vector<pid_t> started;
    std::size_t firstCall = 0;
    std::size_t firstLine = 0;
};

}  // namespace fake
