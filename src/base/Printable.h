#pragma once

#include <string>

namespace ZOVA::base {

/** Longest text that `Printable` gives, in bytes; what goes beyond is cut. */
constexpr std::size_t kPrintableLimit = 512;

/** The text with every byte that is no printable ASCII character as "?", so that it cannot forge a log line. */
std::string Printable(const std::string& text);

}  // namespace ZOVA::base
