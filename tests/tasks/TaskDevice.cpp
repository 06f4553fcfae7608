#include "TaskDevice.h"

#include <dirent.h>
#include <fcntl.h>
#include <ftw.h>
#include <grp.h>
#include <sched.h>
#include <signal.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdarg>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <thread>

#include "common/Hex.h"
#include "taskmanager/TaskProcess.h"
#include "webapi/Json.h"

namespace {

std::vector<std::string>& Log() {
    static std::vector<std::string> lines;
    return lines;
}

void Record(const char* format, va_list arguments) {
    char line[4096];
    vsnprintf(line, sizeof(line), format, arguments);
    Log().push_back(line);
}

int RemoveEntry(const char* path, const struct stat*, int, struct FTW* walk) {
    return walk->level == 0 ? 0 : remove(path);
}

void MakeEmpty(const std::string& folder, mode_t mode) {
    nftw(folder.c_str(), RemoveEntry, 64, FTW_DEPTH | FTW_PHYS | FTW_MOUNT);
    ASSERT_TRUE(mkdir(folder.c_str(), mode) == 0 || errno == EEXIST) << folder;
    ASSERT_EQ(chmod(folder.c_str(), mode), 0) << folder;
}

}  // namespace

// Stand in front of the C library's, for the framework's objects and the reference library's.
extern "C" void syslog(int, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    Record(format, arguments);
    va_end(arguments);
}

extern "C" void __syslog_chk(int, int, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    Record(format, arguments);
    va_end(arguments);
}

void TaskMachine::SetUp() {
    ASSERT_EQ(geteuid(), 0u) << "these tests need root";
    ASSERT_EQ(unshare(CLONE_NEWNS), 0) << "these tests need a mount namespace of their own";
    ASSERT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), 0);
    ASSERT_EQ(mount("tmpfs", ZOVA_REFERENCE_ROOT, "tmpfs", MS_NOSUID | MS_NODEV, "mode=0755"), 0);
    std::string passwd = "root:x:0:0:root:/root:/bin/sh\n";
    std::string group = "root:x:0:\nadministrators:x:61100:boss\n";
    for (const TestUser& user : {kAlice, kBob, kBoss}) {
        const std::string ids = std::to_string(user.uid) + ":" + std::to_string(user.uid);
        passwd += std::string(user.name) + ":x:" + ids + "::/:/bin/sh\n";
        group += std::string(user.name) + ":x:" + std::to_string(user.uid) + ":\n";
    }
    ASSERT_EQ(mkdir(InRoot("/etc").c_str(), 0755), 0);
    WriteFile(InRoot("/etc/passwd"), passwd, 0, 0644);
    WriteFile(InRoot("/etc/group"), group, 0, 0644);
    WriteFile(InRoot("/etc/nsswitch.conf"), "passwd: files\ngroup: files\n", 0, 0644);
    ASSERT_EQ(mount(InRoot("/etc").c_str(), "/etc", nullptr, MS_BIND, nullptr), 0);
}

void TaskTest::SetUp() {
    MakeEmpty(InRoot("/run"), 0755);
    MakeEmpty(InRoot("/tree"), 0755);
    // As at boot.
    ASSERT_EQ(mkdir(InRoot("/run/zova").c_str(), 0755), 0);
    ASSERT_EQ(mkdir(TaskFolder().c_str(), 0755), 0);
    ASSERT_EQ(chmod(TaskFolder().c_str(), 01733), 0);
    Log().clear();
}

std::string InRoot(const std::string& path) {
    return ZOVA_REFERENCE_ROOT + path;
}

std::string TaskFolder() {
    return InRoot("/run/zova/tasks");
}

std::string RecordPath(const std::string& owner, const std::string& id) {
    return TaskFolder() + "/" + reference::HexText(owner) + "." + id;
}

void WriteFile(const std::string& path, std::string_view content, uid_t owner, mode_t mode) {
    std::ofstream file(path, std::ios::binary | std::ios::trunc);
    file.write(content.data(), static_cast<std::streamsize>(content.size()));
    file.close();
    ASSERT_TRUE(file.good()) << path;
    ASSERT_EQ(chown(path.c_str(), owner, owner), 0);
    ASSERT_EQ(chmod(path.c_str(), mode), 0);
}

std::string ReadWholeFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(file), {});
}

bool Exists(const std::string& path) {
    struct stat status;
    return lstat(path.c_str(), &status) == 0;
}

void MakeOlder(const std::string& path, long seconds) {
    const struct timespec times[2] = {{time(nullptr) - seconds, 0}, {time(nullptr) - seconds, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, path.c_str(), times, AT_SYMLINK_NOFOLLOW), 0) << path;
}

std::vector<std::string> FilesIn(const std::string& folder) {
    std::vector<std::string> names;
    DIR* directory = opendir(folder.c_str());
    while (const struct dirent* entry = directory == nullptr ? nullptr : readdir(directory)) {
        const std::string name = entry->d_name;
        if (name != "." && name != "..") {
            names.push_back(name);
        }
    }
    if (directory != nullptr) {
        closedir(directory);
    }
    std::sort(names.begin(), names.end());
    return names;
}

const std::vector<std::string>& LogLines() {
    return Log();
}

int LoggedTimes(const std::string& text) {
    return static_cast<int>(std::count_if(
        Log().begin(), Log().end(), [&](const std::string& line) { return line.find(text) != std::string::npos; }));
}

int StatusOfChild(const std::function<int()>& body, uid_t uid) {
    const pid_t child = fork();
    if (child == 0) {
        if (uid != 0 &&
            (setgroups(0, nullptr) != 0 || setresgid(uid, uid, uid) != 0 || setresuid(uid, uid, uid) != 0)) {
            _exit(99);
        }
        _exit(body());
    }
    int status = 0;
    if (child < 0 || waitpid(child, &status, 0) != child || !WIFEXITED(status)) {
        return -1;
    }
    return WEXITSTATUS(status);
}

bool Eventually(const std::function<bool()>& holds) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (!holds()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    return true;
}

bool IsRunning(pid_t pid) {
    return reference::ProcessStart(pid) != 0;
}

double SecondsOf(const std::function<void()>& body) {
    const auto begin = std::chrono::steady_clock::now();
    body();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
}

Json::Value Parse(const std::string& text) {
    Json::Value value;
    if (!Json::fromString(value, text)) {
        throw std::invalid_argument("no JSON: " + text);
    }
    return value;
}

Json::Value RequestOf(const std::string& user, const std::string& params) {
    Json::Value init(Json::objectValue);
    init["postParam"] = Parse(params);
    if (!user.empty()) {
        init["session"]["username"] = user;
        init["session"]["isAdmin"] = user == kBoss.name;
    }
    return init;
}
