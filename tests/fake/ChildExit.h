#pragma once

namespace fake {

/** Takes the place of `exit` in a test's child process, which has to report before it ends. */
class ChildExit {
public:
    virtual ~ChildExit() = default;
    [[noreturn]] virtual void Leave(int status) = 0;
};

/** The one in force, or null. */
ChildExit*& CurrentChildExit();

}  // namespace fake
