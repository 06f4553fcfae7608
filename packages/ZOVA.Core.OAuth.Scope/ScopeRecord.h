#pragma once

#include <optional>

#include "../common/RecordList.h"

namespace package {

/**
 * Whether the record describes a scope and the calls that it opens:
 *
 *     "id"    name of the scope, without blanks, once in the list
 *     "apis"  array, may be empty, of objects with
 *                 "params"    array of filters, at least one; each is a line of name=value pairs that a call has to fit
 *                 "endpoint"  text; a record where it is not empty opens nothing at the web entry; may be absent
 */
std::optional<RecordProblem> CheckScope(const Json::Value& records, Json::ArrayIndex at);

}  // namespace package
