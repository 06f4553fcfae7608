#pragma once

#include <json/value.h>

namespace fuzz {

/** Levels of arrays and objects, at least 0. */
int Depth(const Json::Value& value);

/** Checks that the value's text reads back as the same text, or is refused if it is nested too deep to be read. */
void CheckRoundTrip(const Json::Value& value);

}  // namespace fuzz
