#pragma once

#include <string>
#include <string_view>

namespace reference {

/** Two lower-case hex digits for each byte. */
std::string HexText(std::string_view bytes);

}  // namespace reference
