#pragma once

#include <string>

namespace ZOVA {

class APIRequest;
class APIRunner;

/** Size of the buffer for process title and syslog ident, in bytes, terminator included. */
constexpr std::size_t kTitleSize = 1024;

/**
 * The name under which the process shows: its title (the text of `argv[0]`), its thread name and its syslog ident.
 * Title buffer and ident are shared by all runners of a process; the last one's count.
 */
class APIRunnerPrivate {
public:
    explicit APIRunnerPrivate(APIRunner* runner);
    APIRunnerPrivate(const APIRunnerPrivate&) = delete;
    APIRunnerPrivate& operator=(const APIRunnerPrivate&) = delete;
    ~APIRunnerPrivate();

    /** Prefix of the title. */
    const std::string& GetProcName() const { return procName; }
    /** The name that the process started with. */
    const std::string& GetOrigProcName() const { return origProcName; }

    /** Makes `argv[0]` the place of the title; a start name with "__" is shown only up to its first "_". */
    void SetArgs(int argc, char** argv);
    /** Writes the title, cut to the room that `argv[0]` had. */
    void SetArgv0(const std::string& name);
    /** Title, ident and thread name after the call; false if the thread name was refused, which it logs. */
    bool SetCallName(const std::string& api, int version, const std::string& method);
    /** Title, ident and thread name as they were. */
    void RestoreName();

private:
    APIRunner* runner;
    char* argv0Address;
    std::size_t argv0Size;
    std::string procName;
    std::string origProcName;
};

}  // namespace ZOVA
