#pragma once

#include <cstdint>
#include <string_view>
#include <vector>

namespace reference {

/** Part of a file, in bytes; never empty. */
struct ByteRange {
    std::uint64_t first;
    std::uint64_t length;

    bool operator==(const ByteRange&) const = default;
};

enum class RangeResult {
    /** No range, or none that is to be answered as such: the whole file. */
    kWhole,
    /** The ranges, at least one. */
    kRanges,
    /** None of the ranges lies in the file. */
    kUnsatisfiable,
};

/** More ranges than this in one request are answered with the whole file. */
constexpr std::size_t kMostRanges = 64;

/**
 * Reads the value of the header Range for a file of `size` bytes.
 * @param ranges receives those that lie in the file, cut to it and in the order in which they were asked for. Ranges
 * that overlap or touch are one, in the place of the first of them, so that no byte goes out twice.
 */
RangeResult ReadRanges(std::string_view header, std::uint64_t size, std::vector<ByteRange>& ranges);

}  // namespace reference
