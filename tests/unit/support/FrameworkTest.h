#pragma once

#include <gtest/gtest.h>
#include <json/value.h>
#include <syslog.h>

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "FakePlatform.h"
#include "webapi/Json.h"

/** For the messages of failed comparisons. */
namespace Json {
void PrintTo(const Value& value, std::ostream* out);
}

namespace unit {

/** A JSON value from its text; a text that is none fails the test. */
Json::Value J(const std::string& text);

/** Compares by the JSON texts: a signed and an unsigned number of one value are the same there. */
#define EXPECT_JSON(value, text) EXPECT_EQ(Json::toString(value), Json::toString(unit::J(text)))

/** The process's environment. */
std::map<std::string, std::string> EnvironmentMap();

/** Variables of the test process's environment, put back at the end of the scope. */
class [[nodiscard]] EnvironmentScope {
public:
    EnvironmentScope();
    EnvironmentScope(const EnvironmentScope&) = delete;
    EnvironmentScope& operator=(const EnvironmentScope&) = delete;
    ~EnvironmentScope();

private:
    std::map<std::string, std::string> saved;
};

/** An empty directory that goes with its content. */
class [[nodiscard]] TemporaryDirectory {
public:
    TemporaryDirectory();
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;
    ~TemporaryDirectory();

    const std::string& Path() const { return path; }
    void Write(const std::string& name, const std::string& content) const;
    /** Nothing if there is no such file. */
    std::optional<std::string> Read(const std::string& name) const;
    std::vector<std::string> List() const;

private:
    std::string path;
};

/** A line that a test counts on. */
struct ExpectedLine {
    int priority;
    std::string text;
    std::string source = "";
    int facility = 0;
};

/**
 * Everything around one test: the fake platform, the environment, and the log. A test names the lines it counts on; a
 * line at warning or above that it did not name fails it, and so does a named one that did not come.
 */
class FrameworkTest : public ::testing::Test {
protected:
    void TearDown() override;

    /** In the order in which they have to come; `source` "" takes any source file. */
    void ExpectLog(int priority, const std::string& text, const std::string& source = "", int facility = 0);
    void ExpectAuthLog(int priority, const std::string& text);

    /**
     * Waits for the children that the code under test forked; their log lines follow this process's own in the log.
     * Those that a test does not take have to end by themselves with status 0.
     */
    std::vector<fake::ForkedChild> TakeChildren();

    EnvironmentScope environment;
    fake::FakePlatform platform;

private:
    std::vector<ExpectedLine> expectedLines;
};

}  // namespace unit
