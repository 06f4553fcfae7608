#pragma once

#include <json/value.h>

#include <string>

#include "Export.h"

/**
 * Total readers and writers over the stock JSON value.
 *
 * The stock library refuses much by an exception: a member of a value that is no object, a number out of range, an
 * array read as text, deep nesting. Whatever can come from outside goes through these functions instead, which never
 * throw and never log: a refusal is a false result or the type's zero. They keep no state and may be called from any
 * thread, and in a forked child.
 */
namespace Json {

/** Deepest nesting that is read, in levels of arrays and objects. A text nested deeper is refused as a whole. */
constexpr int kMaximumDepth = 256;

/**
 * Parses one JSON value and nothing behind it. Comments and trailing commas are refused; what else the stock reader
 * lets pass beyond JSON proper (a number such as 01, a control byte in a text) passes here too. Of two members of one
 * name the later counts. Invalid UTF-8 is kept as it stands.
 * @return false for text that is no JSON or is nested deeper than kMaximumDepth; `value` is then left alone.
 */
WEBAPI_EXPORT bool fromString(Value& value, const std::string& text);

/**
 * Reads a regular file of at most 64 MiB and parses it as `fromString` does.
 * @return false if the file cannot be read or parsed; `value` is then left alone.
 */
WEBAPI_EXPORT bool fromFile(Value& value, const std::string& path);

/**
 * The JSON text: compact, members sorted, UTF-8 unescaped, no newline at the end. A number that JSON cannot hold
 * (NaN, infinity) is written as null.
 */
WEBAPI_EXPORT std::string toString(const Value& value);

/**
 * Replaces the file by the text of `toString`. The new content is written beside the file and renamed over it,
 * so that a reader sees the old text or the new one, never a part; the mode of an existing file is kept, a new file
 * gets 0600.
 * @return false if any step failed; the old file then stands as it was, and nothing is left beside it.
 */
WEBAPI_EXPORT bool toFile(const Value& value, const std::string& path);

/** Index of the first element equal to `element`, or `Json::Value::maxUInt` if there is none or `array` is none. */
WEBAPI_EXPORT ArrayIndex searchArrayIndex(const Value& array, const Value& element);

/** True for an object, and for null, which counts as an empty one. */
WEBAPI_EXPORT bool isObject(const Value& value);

/** True for an array, and for null, which counts as an empty one. */
WEBAPI_EXPORT bool isArray(const Value& value);

/** True if `value` is an object (null is not) and has the member. */
WEBAPI_EXPORT bool hasMember(const Value& value, const std::string& name);

/** The member, or a null value if `value` is no object or lacks it. The reference lives as long as `value` does. */
WEBAPI_EXPORT const Value& member(const Value& value, const std::string& name);

/**
 * A number, cut to an integer; a bool as 0 or 1; a text that is a decimal number as a whole, with or without a sign.
 * Anything else, and what does not fit, is 0.
 */
WEBAPI_EXPORT int asInt(const Value& value);

/** As `asInt`, in 64 bits with a sign. */
WEBAPI_EXPORT long long asInt64(const Value& value);

/** As `asInt`, in 64 bits without a sign; a negative number is 0. */
WEBAPI_EXPORT unsigned long long asUInt64(const Value& value);

/** A text as it is (NUL bytes included), a number or bool as its text; null, arrays and objects are "". */
WEBAPI_EXPORT std::string asString(const Value& value);

/** A bool as it is, a number as whether it differs from 0; anything else is false. */
WEBAPI_EXPORT bool asBool(const Value& value);

}  // namespace Json
