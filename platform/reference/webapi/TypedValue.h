#pragma once

#include <json/value.h>

#include <string_view>

namespace reference {

/**
 * The JSON value that the whole text is (no blanks around it), or else the text itself. Never throws, takes linear
 * time; values nested deeper than `kJsonDepth` and numbers that no double holds stay text.
 */
Json::Value TypedValue(std::string_view text);

}  // namespace reference
