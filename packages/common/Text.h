#pragma once

#include <string>

namespace package {

/** Whether the text holds a byte below 0x20, NUL among them, or 0x7f. */
bool HasControlBytes(const std::string& text);

/** The text with each byte that is no part of valid UTF-8 replaced by U+FFFD, so that it can stand in a JSON answer. */
std::string ValidUtf8(const std::string& text);

}  // namespace package
