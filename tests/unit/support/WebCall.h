#pragma once

#include <json/value.h>

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "ChildRun.h"
#include "FakePlatform.h"

namespace unit {

/** One CGI call: the whole environment of its process, and its standard input. */
struct WebCall {
    std::map<std::string, std::string> environment;
    std::string body;

    static WebCall Get(const std::string& query);
    /** A POST with its CONTENT_LENGTH. */
    static WebCall Post(const std::string& body);
    WebCall With(const std::string& name, const std::string& value) const;
};

struct WebAnswer {
    ChildResult child;
    /** Up to, not including, the empty line; each line without its end. */
    std::vector<std::string> headers;
    std::string bodyText;
    Json::Value body;
    /** Whether the process ended by itself and wrote a header block, an empty line and a JSON object. */
    bool wellFormed = false;
    Json::Value before;
    Json::Value after;
    std::vector<fake::LogLine> log;
    std::vector<std::string> calls;
    /** Environment and request after the call. */
    Json::Value environment;
    Json::Value request;
    std::string failedCall;
    int failedIndex = -1;

    bool HasHeader(const std::string& line) const;
    /** Value of a header, "" if it is not there. */
    std::string Header(const std::string& name) const;
    std::vector<std::string> CallsOf(const std::string& name) const;
    int ErrorCode() const;
};

/**
 * Serves the call with a `WebEntry` in a child process, on the platform as the test has set it up. `prepare` runs in
 * the child just before.
 */
WebAnswer Serve(const WebCall& call, const std::function<void(fake::FakePlatform&)>& prepare = nullptr);

}  // namespace unit
