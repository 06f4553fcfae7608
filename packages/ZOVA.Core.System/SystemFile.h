#pragma once

#include <string>

namespace package {

/** Reads a file of the kernel, of at most 4 MiB; a longer one is refused. False on failure; `out` is then left alone.
 */
bool ReadSystemFile(const char* path, std::string& out);

}  // namespace package
