// The headers that ask for a part of a file, one a line: its size, Range, then a text that is read as list of tags, as
// date, as file name and as extension. What the ranges cover is that of a second and plainer reading.

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <sstream>
#include <vector>

#include "Check.h"
#include "Target.h"
#include "common/Utf8.h"
#include "httpfileoutputer/ByteRanges.h"
#include "httpfileoutputer/Conditions.h"
#include "httpfileoutputer/ContentDisposition.h"
#include "httpfileoutputer/HttpDate.h"
#include "httpfileoutputer/MimeTypes.h"

namespace {

using reference::ByteRange;
using reference::RangeResult;

/** Files of the plain reading have no more bytes than this. */
constexpr std::uint64_t kSmall = 4096;

void CheckForm(const std::vector<ByteRange>& ranges, std::uint64_t size) {
    FUZZ_CHECK(!ranges.empty() && ranges.size() <= reference::kMostRanges);
    for (const ByteRange& range : ranges) {
        FUZZ_CHECK(range.length > 0 && range.first < size && range.length <= size - range.first);
        for (const ByteRange& other : ranges) {
            FUZZ_CHECK(&range == &other || range.first + range.length < other.first ||
                       other.first + other.length < range.first);
        }
    }
}

/** Digits only, and few enough for 64 bits. */
bool IsPlainNumber(const std::string& text) {
    return text.size() <= 19 && text.find_first_not_of("0123456789") == std::string::npos;
}

/** Marks the bytes that a header in plain form asks for; false if it is in no plain form. */
bool MarkPlainly(const std::string& header, std::vector<bool>& marks, bool& isGood) {
    isGood = false;
    if (header.compare(0, 6, "bytes=") != 0 || header.back() == ',') {
        return false;
    }
    std::istringstream items(header.substr(6));
    size_t count = 0;
    for (std::string item; std::getline(items, item, ',');) {
        const size_t dash = item.find('-');
        if (dash == std::string::npos || !IsPlainNumber(item.substr(0, dash)) ||
            !IsPlainNumber(item.substr(dash + 1)) || item.size() == 1 || ++count > reference::kMostRanges) {
            return false;
        }
        std::uint64_t from = dash == 0 ? 0 : std::stoull(item);
        std::uint64_t to = dash + 1 == item.size() ? marks.size() : std::stoull(item.substr(dash + 1)) + 1;
        if (dash == 0) {
            from = marks.size() - std::min<std::uint64_t>(to - 1, marks.size());
            to = marks.size();
        } else if (dash + 1 < item.size() && from >= to) {
            return false;
        }
        for (std::uint64_t byte = from; byte < std::min<std::uint64_t>(to, marks.size()); ++byte) {
            marks[byte] = true;
        }
    }
    isGood = count > 0;
    return isGood;
}

void CheckCover(const std::string& header, std::uint64_t size, RangeResult result,
                const std::vector<ByteRange>& ranges) {
    std::vector<bool> expected(size);
    bool isGood = false;
    if (!MarkPlainly(header, expected, isGood) || size == 0) {
        return;
    }
    std::vector<bool> got(size);
    for (const ByteRange& range : ranges) {
        for (std::uint64_t byte = range.first; byte < range.first + range.length; ++byte) {
            got[byte] = true;
        }
    }
    FUZZ_CHECK(result != RangeResult::kWhole);
    FUZZ_CHECK(got == expected);
}

void CheckConditions(const std::string& text) {
    constexpr time_t kNow = 1'800'000'000;
    const reference::Validators file = {"\"1-2-3.4\"", 784'111'777, true};
    // The same tag for a condition and its opposite: at most one of them can hold it.
    const bool noneMatches = reference::Judge({"", text, "", "", ""}, file, kNow) == reference::Verdict::kNotModified;
    const bool matches = reference::Judge({text, "", "", "", ""}, file, kNow) == reference::Verdict::kSend;
    FUZZ_CHECK(text.empty() || !matches || noneMatches);
    FUZZ_CHECK(!matches || text.find('*') != std::string::npos || text.empty() ||
               text.find(file.tag) != std::string::npos);
    const auto date = reference::ReadHttpDate(text, kNow);
    if (date) {
        const std::string form = reference::HttpDateText(*date);
        FUZZ_CHECK(form.empty() || reference::ReadHttpDate(form, kNow) == date);
        FUZZ_CHECK(reference::AllowsRange({"", "", "", "", text}, file, kNow) == (*date == file.modified));
    }
}

void CheckNames(const std::string& text) {
    const std::string value = reference::AttachmentNamed(text);
    size_t quotes = 0;
    for (const char byte : value) {
        FUZZ_CHECK(byte >= 0x20 && byte < 0x7f && byte != '\\');
        quotes += byte == '"' ? 1 : 0;
    }
    FUZZ_CHECK(value.empty() || quotes == 2);
    FUZZ_CHECK(value.size() < 2048);
    const std::string_view type = reference::FindMimeType(text, "txt");
    FUZZ_CHECK(type.empty() || (type.find('/') != std::string_view::npos && reference::IsUtf8(type)));
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::istringstream lines(fuzz::TextOf(data, size));
    std::string number;
    std::string header;
    std::getline(lines, number);
    std::getline(lines, header);
    std::string rest((std::istreambuf_iterator<char>(lines)), {});

    const std::uint64_t length = strtoull(number.c_str(), nullptr, 10) & INT64_MAX;
    std::vector<ByteRange> ranges = {{1, 1}};
    const RangeResult result = reference::ReadRanges(header, length, ranges);
    if (result == RangeResult::kRanges) {
        CheckForm(ranges, length);
    } else {
        FUZZ_CHECK(ranges.empty());
    }
    if (length <= kSmall && !header.empty()) {
        CheckCover(header, length, result, ranges);
    }
    CheckConditions(rest);
    CheckNames(rest);
    return 0;
}
