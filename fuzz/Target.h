#pragma once

#include <cstddef>
#include <cstdint>

/** One input of a fuzz target; each target defines it once. Returns 0, or ends the process where a check fails. */
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);
