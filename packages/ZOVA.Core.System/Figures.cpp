#include "Figures.h"

#include <limits.h>
#include <stdlib.h>
#include <time.h>
#include <unistd.h>

#include <sstream>

#include "SystemFile.h"

namespace package {
namespace {

constexpr std::uint64_t kBytesPerKiB = 1024;

struct MemoryLine {
    const char* name;
    std::uint64_t Memory::*figure;
};

constexpr MemoryLine kMemoryLines[] = {
    {"MemTotal:", &Memory::total},
    {"MemFree:", &Memory::free},
    {"MemAvailable:", &Memory::available},
};

/** Reads "name number" from the line of that name. */
bool FindFigure(const std::string& text, const std::string& name, std::uint64_t& out) {
    std::istringstream lines(text);
    std::string line;
    while (std::getline(lines, line)) {
        std::istringstream words(line);
        std::string first;
        std::uint64_t number = 0;
        if (words >> first && first == name) {
            if (!(words >> number) || number > UINT64_MAX / kBytesPerKiB) {
                return false;
            }
            out = number * kBytesPerKiB;
            return true;
        }
    }
    return false;
}

}  // namespace

bool ReadHostName(std::string& out) {
    char name[HOST_NAME_MAX + 1] = {};
    if (gethostname(name, sizeof(name) - 1) != 0) {
        return false;
    }
    out = name;
    return true;
}

bool ReadUptime(std::uint64_t& out) {
    timespec now = {};
    if (clock_gettime(CLOCK_BOOTTIME, &now) != 0) {
        return false;
    }
    out = static_cast<std::uint64_t>(now.tv_sec);
    return true;
}

bool ReadLoad(LoadAverage& out) {
    double averages[3] = {};
    if (getloadavg(averages, 3) != 3) {
        return false;
    }
    out = {averages[0], averages[1], averages[2]};
    return true;
}

bool ReadMemory(Memory& out) {
    std::string text;
    return ReadSystemFile("/proc/meminfo", text) && ParseMemory(text, out);
}

bool ParseMemory(const std::string& text, Memory& out) {
    Memory memory;
    for (const MemoryLine& line : kMemoryLines) {
        if (!FindFigure(text, line.name, memory.*line.figure)) {
            return false;
        }
    }
    out = memory;
    return true;
}

}  // namespace package
