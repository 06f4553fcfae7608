#pragma once

#include <cstdlib>

namespace ZOVA::base {

/** For a `std::unique_ptr` that owns memory of `malloc` or `calloc`. */
struct FreeDeleter {
    void operator()(void* memory) const { free(memory); }
};

}  // namespace ZOVA::base
