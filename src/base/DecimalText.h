#pragma once

#include <optional>
#include <string_view>

namespace ZOVA::base {

/** A text that is, as a whole, a decimal number with or without a sign; clamped to 64 bits. Nothing for other text. */
std::optional<long long> DecimalNumber(std::string_view text);

/** As `DecimalNumber`, but what does not fit 64 bits is nothing too. */
std::optional<long long> DecimalNumberThatFits(std::string_view text);

/** As `DecimalNumberThatFits`, without a sign bit: up to 18446744073709551615. */
std::optional<unsigned long long> UnsignedDecimalNumberThatFits(std::string_view text);

/** The number, cut to the range of an int. */
int ClampToInt(long long number);

}  // namespace ZOVA::base
