#pragma once

#include <cstdint>
#include <string>

namespace package {

struct LoadAverage {
    double one = 0;
    double five = 0;
    double fifteen = 0;
};

/** Sizes in bytes. */
struct Memory {
    std::uint64_t total = 0;
    std::uint64_t free = 0;
    /** What a new program could use without swapping. */
    std::uint64_t available = 0;
};

/** False if the system does not say; `out` is then left alone. */
bool ReadHostName(std::string& out);
/** Seconds since the system was started. */
bool ReadUptime(std::uint64_t& out);
bool ReadLoad(LoadAverage& out);
bool ReadMemory(Memory& out);

/** Reads the text of /proc/meminfo, in KiB. False unless all three figures are there. */
bool ParseMemory(const std::string& text, Memory& out);

}  // namespace package
