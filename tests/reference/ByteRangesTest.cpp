#include <gtest/gtest.h>

#include "httpfileoutputer/ByteRanges.h"

using reference::ByteRange;
using reference::RangeResult;

namespace {

struct Row {
    const char* name;
    std::string header;
    std::uint64_t size;
    RangeResult result;
    std::vector<ByteRange> ranges;
};

void PrintTo(const Row& row, std::ostream* out) {
    *out << row.name;
}

constexpr RangeResult kWhole = RangeResult::kWhole;
constexpr RangeResult kRanges = RangeResult::kRanges;
constexpr RangeResult kNone = RangeResult::kUnsatisfiable;
constexpr std::uint64_t kHuge = std::uint64_t{1} << 62;

std::string Many(size_t count) {
    std::string header = "bytes=";
    for (size_t i = 0; i < count; ++i) {
        header += (i == 0 ? "" : ",") + std::to_string(i * 3) + "-" + std::to_string(i * 3);
    }
    return header;
}

class ByteRanges : public ::testing::TestWithParam<Row> {};

TEST_P(ByteRanges, AreReadAsTheRowSays) {
    const Row& row = GetParam();
    std::vector<ByteRange> ranges = {{7, 7}};
    EXPECT_EQ(reference::ReadRanges(row.header, row.size, ranges), row.result) << row.name;
    EXPECT_EQ(ranges, row.ranges) << row.name;
}

const Row kRows[] = {
    // One range.
    {"first bytes", "bytes=0-499", 1000, kRanges, {{0, 500}}},
    {"one byte", "bytes=0-0", 1000, kRanges, {{0, 1}}},
    {"last byte", "bytes=999-999", 1000, kRanges, {{999, 1}}},
    {"from a place on", "bytes=600-", 1000, kRanges, {{600, 400}}},
    {"all", "bytes=0-", 1000, kRanges, {{0, 1000}}},
    {"suffix", "bytes=-300", 1000, kRanges, {{700, 300}}},
    {"suffix of all and more", "bytes=-5000", 1000, kRanges, {{0, 1000}}},
    {"end beyond the file", "bytes=900-5000", 1000, kRanges, {{900, 100}}},
    {"leading zeros", "bytes=0000000000000000000000001-002", 1000, kRanges, {{1, 2}}},
    {"unit in other letters", "ByTeS=1-2", 1000, kRanges, {{1, 2}}},
    {"blanks around", " \tbytes=1-2\t ", 1000, kRanges, {{1, 2}}},
    {"file of one byte", "bytes=-1", 1, kRanges, {{0, 1}}},
    {"large file", "bytes=4611686018427387903-", kHuge, kRanges, {{kHuge - 1, 1}}},

    // Outside of the file.
    {"start at the end", "bytes=1000-", 1000, kNone, {}},
    {"start beyond the end", "bytes=5000-6000", 1000, kNone, {}},
    {"suffix of nothing", "bytes=-0", 1000, kNone, {}},
    {"several outside", "bytes=1000-,2000-,-0", 1000, kNone, {}},
    {"number of 64 bits", "bytes=18446744073709551615-", 1000, kNone, {}},
    {"number above 64 bits", "bytes=18446744073709551616-", 1000, kNone, {}},
    {"number of a hundred digits", "bytes=" + std::string(100, '9') + "-", 1000, kNone, {}},
    {"end above 64 bits", "bytes=5-" + std::string(100, '9'), 1000, kRanges, {{5, 995}}},
    {"suffix above 64 bits", "bytes=-" + std::string(100, '9'), 1000, kRanges, {{0, 1000}}},
    {"both above 64 bits", "bytes=" + std::string(50, '9') + "-" + std::string(40, '9'), 1000, kNone, {}},
    {"one outside, one inside", "bytes=5000-,1-2", 1000, kRanges, {{1, 2}}},

    // An empty file.
    {"empty file, from its start", "bytes=0-", 0, kNone, {}},
    {"empty file, one byte", "bytes=0-0", 0, kNone, {}},
    {"empty file, suffix", "bytes=-5", 0, kWhole, {}},
    {"empty file, suffix of nothing", "bytes=-0", 0, kNone, {}},

    // No ranges: the whole file.
    {"nothing", "", 1000, kWhole, {}},
    {"unit alone", "bytes", 1000, kWhole, {}},
    {"no range", "bytes=", 1000, kWhole, {}},
    {"commas alone", "bytes= , ,", 1000, kWhole, {}},
    {"another unit", "lines=1-2", 1000, kWhole, {}},
    {"a longer unit", "kbytes=1-2", 1000, kWhole, {}},
    {"blank before the equals sign", "bytes =1-2", 1000, kWhole, {}},
    {"reversed", "bytes=500-499", 1000, kWhole, {}},
    {"reversed among good ones", "bytes=0-1,500-499", 1000, kWhole, {}},
    {"dash alone", "bytes=-", 1000, kWhole, {}},
    {"two dashes", "bytes=--5", 1000, kWhole, {}},
    {"three numbers", "bytes=1-2-3", 1000, kWhole, {}},
    {"number alone", "bytes=5", 1000, kWhole, {}},
    {"sign", "bytes=+1-2", 1000, kWhole, {}},
    {"hexadecimal", "bytes=0x1-0x2", 1000, kWhole, {}},
    {"blank within", "bytes=1 -2", 1000, kWhole, {}},
    {"blank within, behind the dash", "bytes=1- 2", 1000, kWhole, {}},
    {"letters behind", "bytes=1-2x", 1000, kWhole, {}},
    {"semicolon", "bytes=1-2;3-4", 1000, kWhole, {}},
    {"NUL", std::string("bytes=1-2\0", 10), 1000, kWhole, {}},
    {"byte above ASCII", "bytes=1-\xb2", 1000, kWhole, {}},

    // Several.
    {"two", "bytes=0-0,-1", 1000, kRanges, {{0, 1}, {999, 1}}},
    {"blanks and empty places between", "bytes=0-0 ,\t , 5-6,", 1000, kRanges, {{0, 1}, {5, 2}}},
    {"order of the request", "bytes=500-599,0-99", 1000, kRanges, {{500, 100}, {0, 100}}},
    {"overlapping", "bytes=0-99,50-149", 1000, kRanges, {{0, 150}}},
    {"touching", "bytes=0-99,100-149", 1000, kRanges, {{0, 150}}},
    {"touching from below", "bytes=100-149,0-99", 1000, kRanges, {{0, 150}}},
    {"the same twice", "bytes=5-6,5-6", 1000, kRanges, {{5, 2}}},
    {"one within another", "bytes=0-99,10-19", 1000, kRanges, {{0, 100}}},
    {"a gap of one byte", "bytes=0-1,3-4", 1000, kRanges, {{0, 2}, {3, 2}}},
    {"one that joins two", "bytes=0-9,500-509,20-29,10-19", 1000, kRanges, {{0, 30}, {500, 10}}},
    {"one that joins all", "bytes=0-9,500-509,20-29,0-999", 1000, kRanges, {{0, 1000}}},
    {"as many as are taken", Many(64), 1000, kRanges,
     [] {
         std::vector<ByteRange> ranges;
         for (std::uint64_t i = 0; i < 64; ++i) {
             ranges.push_back({i * 3, 1});
         }
         return ranges;
     }()},
    {"one more", Many(65), 1000, kWhole, {}},
    {"10,000 ranges", Many(10'000), 100'000, kWhole, {}},
    {"10,000 times the same",
     "bytes=0-" +
         [] {
             std::string more;
             for (int i = 0; i < 10'000; ++i) {
                 more += ",0-";
             }
             return more;
         }(),
     1000,
     kWhole,
     {}},
    {"a megabyte of commas", "bytes=1-2" + std::string(1 << 20, ','), 1000, kRanges, {{1, 2}}},
};

INSTANTIATE_TEST_SUITE_P(Table, ByteRanges, ::testing::ValuesIn(kRows));

}  // namespace
