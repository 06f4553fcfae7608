#pragma once

#include <sys/types.h>

#include <set>
#include <string>
#include <vector>

namespace fake {

/** Real, effective and saved id. */
struct Ids {
    unsigned int real = 0;
    unsigned int effective = 0;
    unsigned int saved = 0;

    bool operator==(const Ids&) const = default;
    bool Holds(unsigned int id) const { return id == real || id == effective || id == saved; }
    std::string Text() const;
};

struct LogLine {
    int priority = 0;
    int facility = 0;
    /** What stands before the first colon: the source's name. */
    std::string source;
    std::string text;
    /** The whole line, for messages of tests and lines of another form. */
    std::string whole;
    /** `errno` as the line was written. */
    int error = 0;
};

/** What the kernel keeps of a process, with the kernel's rules of who may change it. Starts as root. */
class FakeProcess {
public:
    Ids user;
    Ids group;
    std::vector<gid_t> groups = {0};
    int nice = 0;
    std::string threadName;
    int sessionsLed = 0;
    int secondsSlept = 0;

    /** Hats of the profile; the current one, "" outside of any. */
    std::set<std::string> hats;
    std::string hat;
    unsigned long hatToken = 0;
    /** Attempts to change the hat that are answered with ECHILD before one counts. */
    int hatBusy = 0;

    std::string ident;
    std::vector<LogLine> log;

    // Each gives 0, or -1 with `errno` set.
    int SetUser(unsigned int real, unsigned int effective, unsigned int saved);
    int SetGroup(unsigned int real, unsigned int effective, unsigned int saved);
    int SetGroups(const std::vector<gid_t>& list);
    int SetNice(int value);
    int ChangeHat(const char* name, unsigned long token);

    void Log(int priority, const std::string& text, int error);
};

}  // namespace fake
