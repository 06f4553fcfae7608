#pragma once

#include <optional>
#include <string_view>

namespace reference {

/**
 * Value of a key in the text of an information file: lines of KEY="value", blanks around them allowed, "#" starts a
 * comment line, anything else is skipped. Values hold no quotes and have no escapes. The last line of a key counts.
 */
std::optional<std::string_view> FindKeyValue(std::string_view text, std::string_view key);

}  // namespace reference
