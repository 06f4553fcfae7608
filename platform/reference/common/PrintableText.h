#pragma once

#include <string>
#include <string_view>

namespace reference {

/** The text fit for a log line: at most 64 bytes of it, all but printable ASCII as \xNN, a backslash doubled. */
std::string PrintableText(std::string_view text);

}  // namespace reference
