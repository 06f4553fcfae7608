#pragma once

#include <ctime>
#include <optional>
#include <string>
#include <string_view>

namespace reference {

/** "Sun, 06 Nov 1994 08:49:37 GMT", whatever the locale. Empty for a year that has not four digits. */
std::string HttpDateText(time_t time);

/**
 * Reads a date of a header in any of its three forms: the one above, "Sunday, 06-Nov-94 08:49:37 GMT" and
 * "Sun Nov  6 08:49:37 1994". A year of two digits is the one closest to `now` that is at most 50 years ahead.
 * @return nothing for anything else.
 */
std::optional<time_t> ReadHttpDate(std::string_view text, time_t now);

}  // namespace reference
