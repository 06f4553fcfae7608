#include "base/DecimalText.h"

#include <charconv>
#include <limits>

namespace ZOVA::base {

namespace {

/** What `from_chars` makes of the whole text; a leading plus sign is taken, two signs are not. */
template <class Number>
std::errc Parse(std::string_view text, Number& number) {
    if (text.size() > 1 && text[0] == '+' && text[1] != '-') {
        text.remove_prefix(1);
    }
    const char* end = text.data() + text.size();
    std::from_chars_result result = std::from_chars(text.data(), end, number);
    return result.ptr == end ? result.ec : std::errc::invalid_argument;
}

}  // namespace

std::optional<long long> DecimalNumberThatFits(std::string_view text) {
    long long number = 0;
    if (Parse(text, number) != std::errc()) {
        return std::nullopt;
    }
    return number;
}

std::optional<long long> DecimalNumber(std::string_view text) {
    long long number = 0;
    std::errc error = Parse(text, number);
    if (error == std::errc::result_out_of_range) {
        return text[0] == '-' ? std::numeric_limits<long long>::min() : std::numeric_limits<long long>::max();
    }
    if (error != std::errc()) {
        return std::nullopt;
    }
    return number;
}

std::optional<unsigned long long> UnsignedDecimalNumberThatFits(std::string_view text) {
    unsigned long long number = 0;
    if (Parse(text, number) != std::errc()) {
        return std::nullopt;
    }
    return number;
}

int ClampToInt(long long number) {
    if (number < std::numeric_limits<int>::min()) {
        return std::numeric_limits<int>::min();
    }
    if (number > std::numeric_limits<int>::max()) {
        return std::numeric_limits<int>::max();
    }
    return static_cast<int>(number);
}

}  // namespace ZOVA::base
