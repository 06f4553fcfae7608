#pragma once

#include <string_view>

namespace reference {

/** Value of the last cookie of that name in a cookie header, as it stands there; "" if there is none. */
std::string_view FindCookie(std::string_view header, std::string_view name);

}  // namespace reference
