#pragma once

#include <json/value.h>

#include <functional>
#include <string>
#include <vector>

#include "FakeProcess.h"

namespace unit {

/** What became of a child process. */
struct ChildResult {
    /** It ended by itself and wrote its report; otherwise `end` says how it ended. */
    bool orderly = false;
    std::string end;
    Json::Value report;
    /** Everything that it wrote to descriptor 1. */
    std::string output;
    /** How the children ended that it forked itself. */
    std::vector<std::string> forked;
    /** What it logged, its own children's lines last. The active fake platform has it too, so that the test's own log
     * holds its lines. */
    std::vector<fake::LogLine> log;
};

/**
 * Runs `body` in a forked child whose standard input holds `input` and whose standard output is kept. The report is
 * what `body` gives, or what `onExit` gives if the code under test ends the process. A child that takes longer than a
 * minute is ended by a signal.
 */
ChildResult RunInChild(const std::string& input, const std::function<Json::Value()>& body,
                       const std::function<Json::Value(int status)>& onExit = nullptr);

/** The calling process as the fake and the system see it: what a call has to leave as it was. */
Json::Value Snapshot();

/** Texts of the active fake platform's calls. */
Json::Value CallsToJson();

}  // namespace unit
