#include "FrameworkTest.h"

#include <dirent.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>

namespace Json {

void PrintTo(const Value& value, std::ostream* out) {
    *out << toString(value);
}

}  // namespace Json

namespace unit {

Json::Value J(const std::string& text) {
    Json::Value value;
    if (!Json::fromString(value, text)) {
        ADD_FAILURE() << "no JSON: " << text;
    }
    return value;
}

// ---- environment ----

std::map<std::string, std::string> EnvironmentMap() {
    std::map<std::string, std::string> variables;
    // An environment that was cleared is no list at all.
    for (char** entry = environ; entry != nullptr && *entry != nullptr; ++entry) {
        const std::string text = *entry;
        const std::size_t equals = text.find('=');
        if (equals != std::string::npos) {
            variables[text.substr(0, equals)] = text.substr(equals + 1);
        }
    }
    return variables;
}

EnvironmentScope::EnvironmentScope() : saved(EnvironmentMap()) {}

EnvironmentScope::~EnvironmentScope() {
    const fake::Suspended suspended;
    clearenv();
    for (const auto& [name, value] : saved) {
        setenv(name.c_str(), value.c_str(), 1);
    }
}

// ---- directory ----

TemporaryDirectory::TemporaryDirectory() {
    char name[] = "/tmp/webapi-unit-XXXXXX";
    if (mkdtemp(name) == nullptr) {
        fake::Unmodelled("no temporary directory");
    }
    path = name;
}

TemporaryDirectory::~TemporaryDirectory() {
    const fake::Suspended suspended;
    std::error_code ignored;
    std::filesystem::remove_all(path, ignored);
}

void TemporaryDirectory::Write(const std::string& name, const std::string& content) const {
    std::ofstream(path + "/" + name, std::ios::binary) << content;
}

std::optional<std::string> TemporaryDirectory::Read(const std::string& name) const {
    std::ifstream file(path + "/" + name, std::ios::binary);
    if (!file) {
        return std::nullopt;
    }
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

std::vector<std::string> TemporaryDirectory::List() const {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(path)) {
        names.push_back(entry.path().filename());
    }
    std::sort(names.begin(), names.end());
    return names;
}

// ---- log ----

namespace {

bool IsSourceFile(const std::string& source) {
    const std::string stem = source.substr(0, source.rfind('.'));
    return !stem.empty() && std::all_of(stem.begin(), stem.end(), [](unsigned char c) { return isalnum(c) != 0; });
}

bool Matches(const fake::LogLine& line, const ExpectedLine& expected) {
    return line.priority == expected.priority && line.facility == expected.facility && line.text == expected.text &&
           (expected.source.empty() ? IsSourceFile(line.source) : line.source == expected.source);
}

/** Each expected line in its turn; no other one at warning or above. */
void CheckLog(const std::vector<fake::LogLine>& log, std::vector<ExpectedLine> expected) {
    for (const fake::LogLine& line : log) {
        if (!expected.empty() && Matches(line, expected.front())) {
            expected.erase(expected.begin());
        } else {
            EXPECT_GT(line.priority, LOG_WARNING) << "unexpected line: " << line.whole;
        }
    }
    for (const ExpectedLine& line : expected) {
        ADD_FAILURE() << "expected line did not come: " << line.text;
    }
}

}  // namespace

void FrameworkTest::ExpectLog(int priority, const std::string& text, const std::string& source, int facility) {
    expectedLines.push_back({priority, text, source, facility});
}

void FrameworkTest::ExpectAuthLog(int priority, const std::string& text) {
    ExpectLog(priority, text, "IdentityScope.cpp", LOG_AUTH);
}

std::vector<fake::ForkedChild> FrameworkTest::TakeChildren() {
    std::vector<fake::ForkedChild> children = platform.children.Take();
    for (const fake::ForkedChild& child : children) {
        platform.process.log.insert(platform.process.log.end(), child.log.begin(), child.log.end());
    }
    return children;
}

void FrameworkTest::TearDown() {
    for (const fake::ForkedChild& child : TakeChildren()) {
        EXPECT_EQ(child.end, "status 0") << "a forked child";
    }
    CheckLog(platform.process.log, expectedLines);
}

}  // namespace unit
