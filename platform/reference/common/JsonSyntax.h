#pragma once

#include <string_view>

namespace reference {

/** Deepest nesting of arrays and objects that is read. */
constexpr int kJsonDepth = 256;

/**
 * Whether the text is one JSON value by the letter of the standard, with blanks around it at most, nested no deeper
 * than `kJsonDepth`. Takes linear time and constant stack, whatever the bytes. The encoding of texts is not looked at.
 */
bool IsJsonText(std::string_view text);

}  // namespace reference
