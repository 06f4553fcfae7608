#include "HandedOver.h"

#include <cstdlib>
#include <cstring>

namespace host {
namespace {

/** The first of the descriptors, by the protocol. */
constexpr int kFirst = 3;

std::string TakeVariable(const char* name) {
    const char* value = getenv(name);
    std::string text = value == nullptr ? "" : value;
    unsetenv(name);
    return text;
}

}  // namespace

Descriptor TakeHandedOver(std::string& problem) {
    const std::string process = TakeVariable("LISTEN_PID");
    const std::string count = TakeVariable("LISTEN_FDS");
    unsetenv("LISTEN_FDNAMES");
    if (process != std::to_string(getpid())) {
        return Descriptor();
    }
    if (count != "1") {
        problem = "exactly one socket can be handed over";
        return Descriptor();
    }
    return Descriptor(kFirst);
}

}  // namespace host
