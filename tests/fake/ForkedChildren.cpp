#include "ForkedChildren.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <map>
#include <sstream>

#include "FakePlatform.h"
#include "webapi/Json.h"

namespace fake {

namespace {

constexpr unsigned int kChildSeconds = 30;
constexpr int kLowestFreeDescriptor = 100;

std::string EndOf(int status) {
    return WIFSIGNALED(status) ? "signal " + std::to_string(WTERMSIG(status))
                               : "status " + std::to_string(WEXITSTATUS(status));
}

Json::Value LineToJson(const LogLine& line) {
    Json::Value entry(Json::objectValue);
    entry["priority"] = line.priority | line.facility;
    entry["whole"] = line.whole;
    entry["error"] = line.error;
    return entry;
}

ForkedChild FromReport(const Json::Value& report) {
    ForkedChild child;
    for (const Json::Value& call : Json::member(report, "calls")) {
        child.calls.push_back(Json::asString(call));
    }
    FakeProcess process;
    for (const Json::Value& line : Json::member(report, "log")) {
        process.Log(Json::asInt(line["priority"]), Json::asString(line["whole"]), Json::asInt(line["error"]));
    }
    child.log = process.log;
    return child;
}

}  // namespace

ForkedChildren::ForkedChildren() {
    const int low = memfd_create("forked-children", MFD_CLOEXEC);
    reportFd = fcntl(low, F_DUPFD_CLOEXEC, kLowestFreeDescriptor);
    close(low);
    if (reportFd < 0 || fcntl(reportFd, F_SETFL, O_APPEND) != 0) {
        Unmodelled("no memory file");
    }
}

ForkedChildren::~ForkedChildren() {
    close(reportFd);
}

pid_t ForkedChildren::Fork(const FakePlatform& platform) {
    const Suspended suspended;
    const pid_t self = getpid();
    const pid_t child = fork();
    if (child > 0) {
        started.push_back(child);
    } else if (child == 0) {
        alarm(kChildSeconds);
        parent = self;
        started.clear();
        firstCall = platform.calls.size();
        firstLine = platform.process.log.size();
        const int nothing = open("/dev/null", O_RDWR | O_CLOEXEC);
        dup2(nothing, STDIN_FILENO);
        dup2(nothing, STDOUT_FILENO);
        close(nothing);
    }
    return child;
}

void ForkedChildren::Leave(const FakePlatform& platform, int status) {
    const Suspended suspended;
    Json::Value report(Json::objectValue);
    report["id"] = getpid();
    for (pid_t child : started) {
        int end = 0;
        if (waitpid(child, &end, 0) == child) {
            report["ended"][std::to_string(child)] = EndOf(end);
        }
    }
    for (std::size_t i = firstCall; i < platform.calls.size(); ++i) {
        report["calls"].append(platform.calls[i].Text());
    }
    for (std::size_t i = firstLine; i < platform.process.log.size(); ++i) {
        report["log"].append(LineToJson(platform.process.log[i]));
    }
    const std::string text = Json::toString(report) + "\n";
    if (write(reportFd, text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
        Unmodelled("a memory file cannot be written");
    }
    _exit(status);
}

std::vector<ForkedChild> ForkedChildren::Take() {
    const Suspended suspended;
    std::map<std::string, std::string> ends;
    std::vector<std::string> order;
    for (pid_t child : started) {
        int end = 0;
        if (waitpid(child, &end, 0) == child) {
            order.push_back(std::to_string(child));
            ends[order.back()] = EndOf(end);
        }
    }
    started.clear();
    std::string text(static_cast<std::size_t>(lseek(reportFd, 0, SEEK_END)), '\0');
    if (pread(reportFd, text.data(), text.size(), 0) != static_cast<ssize_t>(text.size()) ||
        ftruncate(reportFd, 0) != 0) {
        Unmodelled("a memory file cannot be read");
    }
    std::map<std::string, ForkedChild> reports;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        Json::Value report;
        if (!Json::fromString(report, line)) {
            Unmodelled("a report that is no JSON");
        }
        const std::string id = Json::asString(report["id"]);
        reports[id] = FromReport(report);
        if (std::find(order.begin(), order.end(), id) == order.end()) {
            order.push_back(id);
        }
        for (const std::string& child : Json::member(report, "ended").getMemberNames()) {
            ends[child] = Json::asString(report["ended"][child]);
        }
    }
    std::vector<ForkedChild> children;
    for (const std::string& id : order) {
        children.push_back(reports[id]);
        children.back().end = ends[id];
    }
    return children;
}

}  // namespace fake
