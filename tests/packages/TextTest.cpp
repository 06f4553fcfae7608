#include "../../packages/common/Text.h"

#include <gtest/gtest.h>

namespace {

constexpr char kReplacement[] = "\xEF\xBF\xBD";

TEST(Text, SeesControlBytes) {
    EXPECT_FALSE(package::HasControlBytes("plain \xC3\xA4 text"));
    EXPECT_TRUE(package::HasControlBytes(std::string("a\0b", 3)));
    EXPECT_TRUE(package::HasControlBytes("a\x1F"));
    EXPECT_TRUE(package::HasControlBytes("\x7F"));
    EXPECT_FALSE(package::HasControlBytes(""));
}

TEST(Text, KeepsValidUtf8) {
    const std::string text =
        "a \xC2\x80 \xDF\xBF \xE0\xA0\x80 \xED\x9F\xBF \xEF\xBF\xBF \xF0\x90\x80\x80 \xF4\x8F\xBF\xBF";
    EXPECT_EQ(package::ValidUtf8(text), text);
}

struct Invalid {
    const char* name;
    const char* bytes;
    int replacements;
};

class InvalidUtf8 : public testing::TestWithParam<Invalid> {};

TEST_P(InvalidUtf8, IsReplacedByteByByte) {
    std::string expected = "<";
    for (int count = 0; count < GetParam().replacements; ++count) {
        expected += kReplacement;
    }
    expected += ">";
    EXPECT_EQ(package::ValidUtf8("<" + std::string(GetParam().bytes) + ">"), expected);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, InvalidUtf8,
    testing::Values(Invalid{"LoneContinuation", "\x80", 1}, Invalid{"OverlongSlash", "\xC0\xAF", 2},
                    Invalid{"OverlongOfThree", "\xE0\x80\xAF", 3}, Invalid{"OverlongOfFour", "\xF0\x80\x80\xAF", 4},
                    Invalid{"Surrogate", "\xED\xA0\x80", 3}, Invalid{"AboveTheLastCharacter", "\xF4\x90\x80\x80", 4},
                    Invalid{"NoSuchFirstByte", "\xFF", 1}, Invalid{"CutSequence", "\xE2\x82", 2}),
    [](const testing::TestParamInfo<Invalid>& row) { return std::string(row.param.name); });

TEST(Text, ReplacesASequenceThatTheEndCuts) {
    EXPECT_EQ(package::ValidUtf8("a\xF0\x9F\x98"), std::string("a") + kReplacement + kReplacement + kReplacement);
}

}  // namespace
