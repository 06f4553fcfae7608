#include "ChildRun.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <iostream>

#include "ChildExit.h"
#include "FakePlatform.h"
#include "webapi/Json.h"

namespace unit {

namespace {

constexpr unsigned int kChildSeconds = 60;
constexpr int kLowestFreeDescriptor = 100;

int MemoryFile(const char* name, const std::string& content) {
    const int low = memfd_create(name, MFD_CLOEXEC);
    const int fd = low < 0 ? -1 : fcntl(low, F_DUPFD_CLOEXEC, kLowestFreeDescriptor);
    close(low);
    if (fd < 0 || write(fd, content.data(), content.size()) != static_cast<ssize_t>(content.size()) ||
        lseek(fd, 0, SEEK_SET) != 0) {
        fake::Unmodelled("no memory file");
    }
    return fd;
}

std::string TakeContent(int fd) {
    std::string content(static_cast<std::size_t>(lseek(fd, 0, SEEK_END)), '\0');
    if (pread(fd, content.data(), content.size(), 0) != static_cast<ssize_t>(content.size())) {
        fake::Unmodelled("a memory file cannot be read");
    }
    close(fd);
    return content;
}

/** Lines of the log that the child began with. */
std::size_t logBegin = 0;

Json::Value LogToJson() {
    Json::Value log(Json::arrayValue);
    const std::vector<fake::LogLine>& lines = fake::FakePlatform::Required("the child's log").process.log;
    for (std::size_t i = logBegin; i < lines.size(); ++i) {
        Json::Value entry(Json::objectValue);
        entry["priority"] = lines[i].priority;
        entry["facility"] = lines[i].facility;
        entry["source"] = lines[i].source;
        entry["text"] = lines[i].text;
        entry["whole"] = lines[i].whole;
        log.append(entry);
    }
    return log;
}

void TakeLog(const Json::Value& log, ChildResult& result) {
    for (const Json::Value& entry : log) {
        fake::LogLine line;
        line.priority = entry["priority"].asInt();
        line.facility = entry["facility"].asInt();
        line.source = entry["source"].asString();
        line.text = entry["text"].asString();
        line.whole = entry["whole"].asString();
        result.log.push_back(line);
        fake::FakePlatform::Required("the child's log").process.log.push_back(line);
    }
}

[[noreturn]] void Report(int fd, const Json::Value& report) {
    fake::FakePlatform& platform = fake::FakePlatform::Required("the child's report");
    Json::Value message(Json::objectValue);
    message["report"] = report;
    message["forked"] = Json::Value(Json::arrayValue);
    for (const fake::ForkedChild& child : platform.children.Take()) {
        message["forked"].append(child.end);
        platform.process.log.insert(platform.process.log.end(), child.log.begin(), child.log.end());
    }
    message["log"] = LogToJson();
    const fake::Suspended suspended;
    const std::string text = Json::toString(message);
    const bool written = write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
    _exit(written ? 0 : 1);
}

class ReportingExit : public fake::ChildExit {
public:
    ReportingExit(int reportFd, const std::function<Json::Value(int)>& reportOnExit)
        : fd(reportFd), onExit(reportOnExit) {}

    [[noreturn]] void Leave(int status) override {
        if (!onExit) {
            fprintf(stderr, "the code under test ended the process\n");
            abort();
        }
        Report(fd, onExit(status));
    }

private:
    int fd;
    const std::function<Json::Value(int)>& onExit;
};

[[noreturn]] void RunChild(int input, int output, int reportFd, const std::function<Json::Value()>& body,
                           const std::function<Json::Value(int)>& onExit) {
    ReportingExit exitHandler(reportFd, onExit);
    logBegin = fake::FakePlatform::Required("RunChild").process.log.size();
    {
        const fake::Suspended suspended;
        alarm(kChildSeconds);
        dup2(input, STDIN_FILENO);
        dup2(output, STDOUT_FILENO);
        fake::CurrentChildExit() = &exitHandler;
    }
    Report(reportFd, body());
}

Json::Value OpenDescriptors() {
    Json::Value open(Json::objectValue);
    DIR* directory = opendir("/proc/self/fd");
    while (const dirent* entry = readdir(directory)) {
        const int fd = atoi(entry->d_name);
        if (entry->d_name[0] != '.' && fd != dirfd(directory)) {
            char target[4096] = "";
            const std::string link = std::string("/proc/self/fd/") + entry->d_name;
            const ssize_t size = readlink(link.c_str(), target, sizeof(target) - 1);
            open[entry->d_name] = std::string(target, size < 0 ? 0 : static_cast<std::size_t>(size));
        }
    }
    closedir(directory);
    return open;
}

Json::Value Stream(const std::ios& stream) {
    Json::Value state(Json::objectValue);
    state["buffer"] = static_cast<Json::UInt64>(reinterpret_cast<std::uintptr_t>(stream.rdbuf()));
    state["state"] = static_cast<int>(stream.rdstate());
    return state;
}

}  // namespace

ChildResult RunInChild(const std::string& input, const std::function<Json::Value()>& body,
                       const std::function<Json::Value(int)>& onExit) {
    fflush(nullptr);
    std::cout.flush();
    int inputFd = 0;
    int outputFd = 0;
    int reportFd = 0;
    pid_t child = 0;
    {
        const fake::Suspended suspended;
        inputFd = MemoryFile("unit-input", input);
        outputFd = MemoryFile("unit-output", "");
        reportFd = MemoryFile("unit-report", "");
        child = fork();
    }
    if (child == 0) {
        RunChild(inputFd, outputFd, reportFd, body, onExit);
    }
    ChildResult result;
    int status = 0;
    if (child < 0 || waitpid(child, &status, 0) != child) {
        result.end = "no child";
    } else if (WIFSIGNALED(status)) {
        result.end = "signal " + std::to_string(WTERMSIG(status));
    } else {
        result.end = "status " + std::to_string(WEXITSTATUS(status));
        result.orderly = WEXITSTATUS(status) == 0;
    }
    close(inputFd);
    result.output = TakeContent(outputFd);
    Json::Value message;
    const bool reported = Json::fromString(message, TakeContent(reportFd));
    result.orderly = result.orderly && reported;
    result.report = Json::member(message, "report");
    for (const Json::Value& end : Json::member(message, "forked")) {
        result.forked.push_back(Json::asString(end));
    }
    TakeLog(Json::member(message, "log"), result);
    return result;
}

Json::Value Snapshot() {
    const fake::FakePlatform& platform = fake::FakePlatform::Required("Snapshot");
    Json::Value state(Json::objectValue);
    state["user"] = platform.process.user.Text();
    state["group"] = platform.process.group.Text();
    state["groups"] = Json::Value(Json::arrayValue);
    for (gid_t group : platform.process.groups) {
        state["groups"].append(group);
    }
    state["hat"] = platform.process.hat;
    state["nice"] = platform.process.nice;
    state["cin"] = Stream(std::cin);
    state["cout"] = Stream(std::cout);
    const char* stack = getenv("APPARMOR_HAT_ARRAY");
    state["stack"] = stack == nullptr ? Json::Value() : Json::Value(stack);
    const fake::Suspended suspended;
    char* directory = getcwd(nullptr, 0);
    state["directory"] = directory == nullptr ? "" : directory;
    free(directory);
    state["descriptors"] = OpenDescriptors();
    return state;
}

Json::Value CallsToJson() {
    Json::Value calls(Json::arrayValue);
    for (const fake::Call& call : fake::FakePlatform::Required("CallsToJson").calls) {
        calls.append(call.Text());
    }
    return calls;
}

}  // namespace unit
