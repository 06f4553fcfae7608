#include <fcntl.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <utility>

#include "base/DecimalText.h"
#include "base/ErrnoGuard.h"
#include "base/Log.h"
#include "base/Printable.h"
#include "base/UniqueFd.h"

using namespace ZOVA::base;

namespace {

TEST(Log, NamesTheSourceFileWithoutItsFolders) {
    EXPECT_STREQ(SourceName("/a/b/Name.cpp"), "Name.cpp");
    EXPECT_STREQ(SourceName("Name.cpp"), "Name.cpp");
    EXPECT_STREQ(SourceName("a/"), "");
}

TEST(ErrnoGuard, PutsErrnoBackAtTheEndOfItsScope) {
    errno = EDOM;
    {
        const ErrnoGuard guard;
        errno = ERANGE;
    }
    EXPECT_EQ(errno, EDOM);
}

TEST(UniqueFd, ClosesOnceAndLeavesErrnoAlone) {
    const int fd = open("/dev/null", O_RDONLY | O_CLOEXEC);
    ASSERT_GE(fd, 0);
    errno = EDOM;
    { const UniqueFd owner(fd); }
    EXPECT_EQ(errno, EDOM);
    EXPECT_EQ(fcntl(fd, F_GETFD), -1);
}

TEST(UniqueFd, MovesAndReleasesItsDescriptor) {
    UniqueFd first(open("/dev/null", O_RDONLY | O_CLOEXEC));
    UniqueFd second(std::move(first));
    EXPECT_FALSE(first.IsOpen());
    ASSERT_TRUE(second.IsOpen());
    const int fd = second.Release();
    EXPECT_FALSE(second.IsOpen());
    EXPECT_EQ(close(fd), 0);
}

TEST(Printable, ReplacesEveryByteThatIsNoPrintableASCII) {
    EXPECT_EQ(Printable(std::string("a\nb\0c\x7f\xff ~!", 10)), "a?b?c?? ~!");
    EXPECT_EQ(Printable(""), "");
}

TEST(Printable, CutsALongText) {
    EXPECT_EQ(Printable(std::string(kPrintableLimit + 1, 'a')), std::string(kPrintableLimit, 'a'));
}

struct DecimalCase {
    const char* name;
    const char* text;
    bool number;
    long long value;
    bool fits;
};

class DecimalText : public ::testing::TestWithParam<DecimalCase> {};

TEST_P(DecimalText, ReadsAWholeDecimalNumberOnly) {
    const DecimalCase& row = GetParam();
    EXPECT_EQ(DecimalNumber(row.text).has_value(), row.number);
    EXPECT_EQ(DecimalNumber(row.text).value_or(0), row.value);
    EXPECT_EQ(DecimalNumberThatFits(row.text).has_value(), row.fits);
    EXPECT_EQ(DecimalNumberThatFits(row.text).value_or(0), row.fits ? row.value : 0);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, DecimalText,
    ::testing::Values(DecimalCase{"Zero", "0", true, 0, true}, DecimalCase{"Plain", "5001", true, 5001, true},
                      DecimalCase{"Minus", "-7", true, -7, true}, DecimalCase{"Plus", "+7", true, 7, true},
                      DecimalCase{"TwoSigns", "+-7", false, 0, false}, DecimalCase{"SignAlone", "-", false, 0, false},
                      DecimalCase{"Empty", "", false, 0, false}, DecimalCase{"Letters", "12a", false, 0, false},
                      DecimalCase{"BlankBefore", " 1", false, 0, false},
                      DecimalCase{"BlankBehind", "1 ", false, 0, false}, DecimalCase{"Hex", "0x10", false, 0, false},
                      DecimalCase{"Point", "1.5", false, 0, false},
                      DecimalCase{"Largest", "9223372036854775807", true, 9223372036854775807LL, true},
                      DecimalCase{"TooLarge", "9223372036854775808", true, 9223372036854775807LL, false},
                      DecimalCase{"TooSmall", "-99999999999999999999", true, -9223372036854775807LL - 1, false}),
    [](const auto& row) { return row.param.name; });

TEST(DecimalNumber, ReadsUnsignedNumbersUpToTheirLargest) {
    EXPECT_EQ(UnsignedDecimalNumberThatFits("18446744073709551615").value_or(0), 18446744073709551615ULL);
    EXPECT_FALSE(UnsignedDecimalNumberThatFits("18446744073709551616").has_value());
    EXPECT_FALSE(UnsignedDecimalNumberThatFits("-1").has_value());
}

TEST(ClampToInt, CutsToTheRangeOfAnInt) {
    EXPECT_EQ(ClampToInt(2147483648LL), 2147483647);
    EXPECT_EQ(ClampToInt(-2147483649LL), -2147483647 - 1);
    EXPECT_EQ(ClampToInt(443), 443);
}

}  // namespace
