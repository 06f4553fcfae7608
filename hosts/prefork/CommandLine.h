#pragma once

#include <string>

#include "Pool.h"

namespace host {

/** What a service's command line has of its own. */
struct Program {
    const char* name;
    /** Lines of the help text that say what it does. */
    const char* purpose;
    /** "" for none: then one has to be given, unless the service gets its socket handed over. */
    const char* defaultSocket;
    /** Whether --group is known. */
    bool hasGroup;
};

struct CommandLine {
    std::string socket;
    std::string group;
    PoolLimits limits;
};

enum class CommandLineResult { kRun, kHelp, kBad };

/**
 * Reads the arguments of `main`. `text` gets the help text, or what is wrong: an unknown option, an argument that is no
 * option, a number that is none or out of range. `out` is whole only for kRun.
 */
CommandLineResult ParseCommandLine(const Program& program, int argc, char** argv, CommandLine& out, std::string& text);

}  // namespace host
