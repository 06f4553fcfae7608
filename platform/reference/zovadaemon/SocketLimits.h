#pragma once

#include <chrono>

namespace reference {

/** How long the ends of a connection wait for each other. */
struct SocketLimits {
    /** For the other end to take a connection. */
    std::chrono::milliseconds connect{5'000};
    /** For one text, from its first byte to its last. */
    std::chrono::milliseconds transfer{60'000};
    /** For the first byte of a text: a method may run for long before it answers. */
    std::chrono::milliseconds answer{600'000};
};

/** Changed by tests alone. */
inline SocketLimits socketLimits;

}  // namespace reference
