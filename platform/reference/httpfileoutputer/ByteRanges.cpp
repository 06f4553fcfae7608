#include "httpfileoutputer/ByteRanges.h"

#include <strings.h>

#include <algorithm>
#include <optional>

#include "common/WithoutBlanks.h"

namespace reference {

namespace {

constexpr std::string_view kUnit = "bytes=";
/** No file is that long. */
constexpr std::uint64_t kFarBeyond = UINT64_MAX;

/** The number; `kFarBeyond` for a greater one. Nothing if the text holds anything but digits, or nothing at all. */
std::optional<std::uint64_t> Number(std::string_view text) {
    if (text.empty()) {
        return std::nullopt;
    }
    std::uint64_t number = 0;
    for (char digit : text) {
        if (digit < '0' || digit > '9') {
            return std::nullopt;
        }
        if (__builtin_mul_overflow(number, std::uint64_t{10}, &number) ||
            __builtin_add_overflow(number, static_cast<std::uint64_t>(digit - '0'), &number)) {
            number = kFarBeyond;
        }
    }
    return number;
}

/** One range as it was asked for: "first-last", "first-" or "-suffix". */
struct AskedRange {
    std::optional<std::uint64_t> first;
    std::optional<std::uint64_t> last;
};

std::optional<AskedRange> ReadRange(std::string_view text) {
    const size_t dash = text.find('-');
    if (dash == std::string_view::npos) {
        return std::nullopt;
    }
    const std::string_view before = text.substr(0, dash);
    const std::string_view behind = text.substr(dash + 1);
    const AskedRange range{Number(before), Number(behind)};
    const bool isGood = (range.first || before.empty()) && (range.last || behind.empty()) &&
                        (range.first || range.last) && (!range.first || !range.last || *range.first <= *range.last);
    return isGood ? std::optional(range) : std::nullopt;
}

/** The part of the file that is meant; nothing if it lies beyond its end. */
std::optional<ByteRange> WithinFile(const AskedRange& asked, std::uint64_t size) {
    if (!asked.first) {
        const std::uint64_t length = std::min(*asked.last, size);
        return length > 0 ? std::optional(ByteRange{size - length, length}) : std::nullopt;
    }
    if (*asked.first >= size) {
        return std::nullopt;
    }
    const std::uint64_t last = std::min(asked.last.value_or(kFarBeyond), size - 1);
    return ByteRange{*asked.first, last - *asked.first + 1};
}

bool Touch(const ByteRange& one, const ByteRange& other) {
    return one.first <= other.first + other.length && other.first <= one.first + one.length;
}

ByteRange Together(const ByteRange& one, const ByteRange& other) {
    const std::uint64_t first = std::min(one.first, other.first);
    return {first, std::max(one.first + one.length, other.first + other.length) - first};
}

/** The ranges held are apart from each other, and stay so. */
void Add(ByteRange range, std::vector<ByteRange>& ranges) {
    size_t place = ranges.size();
    for (size_t i = ranges.size(); i-- > 0;) {
        if (Touch(ranges[i], range)) {
            range = Together(ranges[i], range);
            ranges.erase(ranges.begin() + static_cast<std::ptrdiff_t>(i));
            place = i;
        }
    }
    ranges.insert(ranges.begin() + static_cast<std::ptrdiff_t>(std::min(place, ranges.size())), range);
}

}  // namespace

RangeResult ReadRanges(std::string_view header, std::uint64_t size, std::vector<ByteRange>& ranges) {
    ranges.clear();
    header = WithoutBlanks(header);
    if (header.size() < kUnit.size() || strncasecmp(header.data(), kUnit.data(), kUnit.size()) != 0) {
        return RangeResult::kWhole;
    }
    std::string_view rest = header.substr(kUnit.size());
    std::vector<ByteRange> found;
    size_t asked = 0;
    bool wantsEndOfEmpty = false;
    while (!rest.empty()) {
        const size_t end = std::min(rest.find(','), rest.size());
        const std::string_view item = WithoutBlanks(rest.substr(0, end));
        rest.remove_prefix(std::min(end + 1, rest.size()));
        if (item.empty()) {
            continue;
        }
        const auto range = ReadRange(item);
        if (!range || ++asked > kMostRanges) {
            return RangeResult::kWhole;
        }
        if (const auto part = WithinFile(*range, size)) {
            Add(*part, found);
        }
        // The last bytes of nothing are there, but no answer can name them.
        wantsEndOfEmpty = wantsEndOfEmpty || (size == 0 && !range->first && *range->last > 0);
    }
    if (asked == 0 || wantsEndOfEmpty) {
        return RangeResult::kWhole;
    }
    ranges.swap(found);
    return ranges.empty() ? RangeResult::kUnsatisfiable : RangeResult::kRanges;
}

}  // namespace reference
