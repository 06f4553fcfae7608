#pragma once

#include <cstddef>

namespace reference {

/** Fills the buffer from the kernel's random source. False on failure, never a partly filled success. */
bool FillRandom(void* buffer, size_t size);

}  // namespace reference
