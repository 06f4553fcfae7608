#pragma once

#include <string_view>

namespace reference {

/** Bytes of the UTF-8 character that a text begins with; 0 if it begins with none, or is empty. */
size_t Utf8CharacterLength(std::string_view text);

bool IsUtf8(std::string_view text);

}  // namespace reference
