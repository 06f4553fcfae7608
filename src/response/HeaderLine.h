#pragma once

#include <json/value.h>

#include <string>

namespace ZOVA {

/** Appends a header line unless the value is no text. No byte of name or value can end the line. */
void AppendHeaderLine(std::string& block, const std::string& name, const Json::Value& value);

}  // namespace ZOVA
