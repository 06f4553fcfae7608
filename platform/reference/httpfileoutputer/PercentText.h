#pragma once

#include <string>
#include <string_view>

namespace reference {

/** Every byte as %XX but letters, digits, "-", ".", "_", "~" and those in `kept`. */
std::string PercentText(std::string_view text, std::string_view kept);

}  // namespace reference
