#pragma once

#include <string>
#include <string_view>

namespace reference {

/** Resolves percent escapes, and "+" as a blank if asked; a broken escape stays as it is. */
std::string PercentDecode(std::string_view text, bool plusIsBlank);

/** Percent-encodes everything but letters, digits, "-", "_", "." and "~". */
std::string PercentEncode(std::string_view text);

}  // namespace reference
