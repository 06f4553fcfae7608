#pragma once

#include <json/value.h>

#include <string>
#include <string_view>

#include "common/Files.h"

namespace reference {

/**
 * Reads one JSON value by the letter of the standard (no comments, no trailing commas, nothing behind it, at most
 * `kJsonDepth` deep). Never throws.
 * @return false for anything else, and for numbers that no double holds; `out` is then left alone.
 */
bool ParseJson(std::string_view text, Json::Value& out);

/** Compact text, members sorted, no newline at the end. A number that JSON cannot hold (NaN, infinity) becomes null. */
std::string WriteJson(const Json::Value& value);

/** Reads and parses a file; `out` is left alone unless the result is kGood. */
ReadResult ReadJson(const char* path, size_t limit, FileTrust trust, Json::Value& out);

/** The text under `name`; `fallback` if `value` is no object, lacks it or holds something else there. */
std::string JsonTextMember(const Json::Value& value, const char* name, const char* fallback = "");

}  // namespace reference
