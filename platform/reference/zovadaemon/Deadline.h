#pragma once

#include <chrono>

namespace reference {

/** A point in time by which a wait has to end, whatever happens meanwhile. */
class Deadline {
public:
    explicit Deadline(std::chrono::milliseconds span) : end(std::chrono::steady_clock::now() + span) {}

    /** For `poll`: milliseconds left, 0 when the time is up. */
    int Left() const {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - std::chrono::steady_clock::now()).count();
        return left > 0 ? static_cast<int>(left) : 0;
    }

private:
    std::chrono::steady_clock::time_point end;
};

}  // namespace reference
