#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace reference {

/**
 * Value of a key in the text of an information file: lines of KEY="value", blanks around them allowed, "#" starts a
 * comment line, anything else is skipped. Values hold no quotes and have no escapes. The last line of a key counts.
 */
std::optional<std::string_view> FindKeyValue(std::string_view text, std::string_view key);

/**
 * The text with another value for the key: in the line that counts, or in a new line at the end if there is none. All
 * else stays as it is. The key holds letters, digits and "_" only, the value neither quotes nor control characters.
 */
std::string WithKeyValue(std::string_view text, std::string_view key, std::string_view value);

}  // namespace reference
