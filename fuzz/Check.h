#pragma once

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

/** Ends the process, which is how a fuzz target reports, unless the condition holds for every input. */
#define FUZZ_CHECK(condition)                                                              \
    do {                                                                                   \
        if (!(condition)) {                                                                \
            fprintf(stderr, "%s:%d: does not hold: %s\n", __FILE__, __LINE__, #condition); \
            abort();                                                                       \
        }                                                                                  \
    } while (false)

namespace fuzz {

inline std::string TextOf(const uint8_t* data, size_t size) {
    return std::string(reinterpret_cast<const char*>(data), size);
}

}  // namespace fuzz
