#pragma once

#include "FakePlatform.h"

/**
 * The system calls of the framework's objects are linked as `__wrap_NAME` (the linker's --wrap), so that a test can
 * give them a process of its own and make them fail; `__real_NAME` is the call itself. What libraries outside the test
 * program do is not touched. Without an active fake platform every call passes through.
 */
#define FAKE_EXPORT extern "C" __attribute__((visibility("default")))

namespace fake {

/** A number as a call's argument. */
template <class Number>
std::string Shown(Number number) {
    return std::to_string(static_cast<long long>(number));
}

inline std::string Shown(const char* text) {
    return text == nullptr ? "null" : text;
}

}  // namespace fake
