#pragma once

#include <json/value.h>

#include <string_view>

namespace reference {

/**
 * Adds the pairs of "name=value&name=value" to `out`. Empty pairs are passed over; a pair without "=" is a name with an
 * empty value. A later pair of a name replaces an earlier one, and a member that `out` had.
 * @param out an object or null, which becomes an object.
 */
void DecodeForm(std::string_view pairs, Json::Value& out, bool typed, bool decode);

}  // namespace reference
