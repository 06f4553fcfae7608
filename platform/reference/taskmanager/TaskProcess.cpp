#include "taskmanager/TaskProcess.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "common/UniqueFd.h"

namespace reference {

namespace {

/** Start of the text of /proc/<pid>/<name>: enough of it for both files read here. */
std::string ReadProcessFile(int pid, const char* name) {
    char text[4096];
    const std::string path = "/proc/" + std::to_string(pid) + "/" + name;
    const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
    const ssize_t got = file.IsOpen() ? read(file.Get(), text, sizeof(text)) : -1;
    return got > 0 ? std::string(text, static_cast<size_t>(got)) : std::string();
}

}  // namespace

std::uint64_t ProcessStart(int pid) {
    constexpr int kFieldsUpToStart = 20;
    if (pid < 1) {
        return 0;
    }
    const std::string text = ReadProcessFile(pid, "stat");
    // The second field is the program's name in parentheses, which may hold any byte.
    const size_t name = text.rfind(") ");
    if (name == std::string::npos) {
        return 0;
    }
    const char* field = text.c_str() + name + 2;
    if (*field == 'Z' || *field == 'X') {
        return 0;
    }
    for (int number = 1; number < kFieldsUpToStart; ++number) {
        field = strchr(field, ' ');
        if (field == nullptr) {
            return 0;
        }
        ++field;
    }
    return strtoull(field, nullptr, 10);
}

bool IsProcessRunning(int pid, std::uint64_t start) {
    return start != 0 && ProcessStart(pid) == start;
}

bool HasProcessUser(int pid, uid_t user) {
    const std::string text = ReadProcessFile(pid, "status");
    const size_t line = text.find("\nUid:\t");
    if (line == std::string::npos) {
        return false;
    }
    const char* at = text.c_str() + line + strlen("\nUid:\t");
    for (int number = 0; number < 3; ++number) {
        char* rest = nullptr;
        const unsigned long id = strtoul(at, &rest, 10);
        if (rest == at) {
            return false;
        }
        if (id == user) {
            return true;
        }
        at = rest;
    }
    return false;
}

int OpenProcess(int pid) {
    // The descriptor closes on exec by itself.
    return pid > 0 ? static_cast<int>(syscall(SYS_pidfd_open, pid, 0)) : -1;
}

}  // namespace reference
