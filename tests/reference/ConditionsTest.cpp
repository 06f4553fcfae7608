#include <gtest/gtest.h>

#include "httpfileoutputer/Conditions.h"
#include "httpfileoutputer/HttpDate.h"

using reference::Conditions;
using reference::HttpDateText;
using reference::ReadHttpDate;
using reference::Validators;
using reference::Verdict;

namespace {

// ---- dates ----

constexpr time_t kNow = 1'800'000'000;  // 15 January 2027
constexpr time_t kExample = 784'111'777;

TEST(HttpDate, IsWrittenInItsFixedForm) {
    EXPECT_EQ(HttpDateText(kExample), "Sun, 06 Nov 1994 08:49:37 GMT");
    EXPECT_EQ(HttpDateText(0), "Thu, 01 Jan 1970 00:00:00 GMT");
    EXPECT_EQ(HttpDateText(-1), "Wed, 31 Dec 1969 23:59:59 GMT");
    EXPECT_EQ(HttpDateText(951'782'400), "Tue, 29 Feb 2000 00:00:00 GMT");
    EXPECT_EQ(HttpDateText(253'402'300'800), "") << "the year 10000";
}

TEST(HttpDate, IsReadInEachOfItsThreeForms) {
    EXPECT_EQ(ReadHttpDate("Sun, 06 Nov 1994 08:49:37 GMT", kNow), kExample);
    EXPECT_EQ(ReadHttpDate("Sunday, 06-Nov-94 08:49:37 GMT", kNow), kExample);
    EXPECT_EQ(ReadHttpDate("Sun Nov  6 08:49:37 1994", kNow), kExample);
    EXPECT_EQ(ReadHttpDate("Tue Nov 15 08:49:37 1994", kNow), kExample + 9 * 86'400);
    EXPECT_EQ(ReadHttpDate("Sat, 31 Dec 2016 23:59:60 GMT", kNow), 1'483'228'800) << "a leap second";
}

TEST(HttpDate, AYearOfTwoDigitsIsAtMostFiftyYearsAhead) {
    EXPECT_EQ(ReadHttpDate("Friday, 01-Jan-77 00:00:00 GMT", kNow),
              ReadHttpDate("Fri, 01 Jan 2077 00:00:00 GMT", kNow));
    EXPECT_EQ(ReadHttpDate("Friday, 01-Jan-78 00:00:00 GMT", kNow),
              ReadHttpDate("Fri, 01 Jan 1978 00:00:00 GMT", kNow));
    constexpr time_t kLate = 4'000'000'000;  // 2096
    EXPECT_EQ(ReadHttpDate("Friday, 01-Jan-05 00:00:00 GMT", kLate),
              ReadHttpDate("Fri, 01 Jan 2105 00:00:00 GMT", kLate));
}

TEST(HttpDate, RefusesWhatIsNone) {
    for (const char* text : {"",
                             " ",
                             "now",
                             "784111777",
                             "Sun, 06 Nov 1994 08:49:37",
                             "Sun, 06 Nov 1994 08:49:37 CET",
                             "Sun, 06 Nov 1994 08:49:37 GMT+1",
                             "Sun, 6 Nov 1994 08:49:37 GMT",
                             "sun, 06 nov 1994 08:49:37 gmt",
                             "Sun, 06 Nov 94 08:49:37 GMT",
                             "Sun,06 Nov 1994 08:49:37 GMT",
                             "Xyz, 06 Nov 1994 08:49:37 GMT",
                             "Sun, 06 Xyz 1994 08:49:37 GMT",
                             "Sun, 31 Feb 1994 08:49:37 GMT",
                             "Sun, 00 Nov 1994 08:49:37 GMT",
                             "Sun, 32 Dec 1994 08:49:37 GMT",
                             "Sun, 06 Nov 1994 24:00:00 GMT",
                             "Sun, 06 Nov 1994 08:60:37 GMT",
                             "Sun, 06 Nov 1994 08:49:61 GMT",
                             "Sun, -6 Nov 1994 08:49:37 GMT",
                             "Sun, 06 Nov 1994 8:49:37 GMT",
                             "Sun, 06 Nov 99999 08:49:37 GMT",
                             "Sunday, 06-Nov-1994 08:49:37 GMT",
                             "Sun, ",
                             ",",
                             ",,,,,,,,,",
                             "Sun Nov  6 08:49:37 1994 GMT",
                             "Sun Nov 6 08:49:37 1994",
                             "Sun Nov    08:49:37 1994",
                             "Sunday, "}) {
        EXPECT_EQ(ReadHttpDate(text, kNow), std::nullopt) << text;
    }
}

// ---- validators ----

TEST(Validators, ATagTellsNumberSizeAndTimeApart) {
    struct stat status {};
    status.st_ino = 10;
    status.st_size = 255;
    status.st_mtim = {kNow - 100, 5};
    const std::string tag = reference::ValidatorsOf(status, kNow).tag;
    EXPECT_EQ(tag, "\"a-ff-6b49d19c.5\"");
    for (const auto& change : std::initializer_list<void (*)(struct stat&)>{
             [](struct stat& s) { ++s.st_ino; }, [](struct stat& s) { ++s.st_size; },
             [](struct stat& s) { ++s.st_mtim.tv_sec; }, [](struct stat& s) { ++s.st_mtim.tv_nsec; }}) {
        struct stat other = status;
        change(other);
        EXPECT_NE(reference::ValidatorsOf(other, kNow).tag, tag);
    }
}

TEST(Validators, ATimeOfChangeIsSettledOnlyWhenItsSecondIsOver) {
    struct stat status {};
    for (const auto& [age, settled] :
         {std::pair<long, bool>{3, true}, {2, true}, {1, false}, {0, false}, {-9, false}}) {
        status.st_mtim.tv_sec = kNow - age;
        EXPECT_EQ(reference::ValidatorsOf(status, kNow).isSettled, settled) << age;
    }
}

// ---- conditions ----

constexpr const char* kTag = "\"t1\"";
constexpr const char* kBefore = "Sun, 06 Nov 1994 08:49:36 GMT";
constexpr const char* kExactly = "Sun, 06 Nov 1994 08:49:37 GMT";
constexpr const char* kAfter = "Sun, 06 Nov 1994 08:49:38 GMT";

const Validators kFile = {kTag, kExample, true};

struct Row {
    const char* name;
    Conditions conditions;
    Verdict verdict;
};

void PrintTo(const Row& row, std::ostream* out) {
    *out << row.name;
}

class Judging : public ::testing::TestWithParam<Row> {};

TEST_P(Judging, GivesTheVerdictOfTheRow) {
    EXPECT_EQ(reference::Judge(GetParam().conditions, kFile, kNow), GetParam().verdict) << GetParam().name;
}

Conditions Match(const char* value) {
    return {value, "", "", "", ""};
}

Conditions NoneMatch(const char* value) {
    return {"", value, "", "", ""};
}

constexpr Verdict kSend = Verdict::kSend;
constexpr Verdict kNotModified = Verdict::kNotModified;
constexpr Verdict kFailed = Verdict::kFailed;

const Row kRows[] = {
    {"no condition", {}, kSend},
    {"match", Match("\"t1\""), kSend},
    {"match in a list", Match("\"t0\", \"t1\" ,\"t2\""), kSend},
    {"match with empty places", Match(", ,\"t1\","), kSend},
    {"match any", Match("*"), kSend},
    {"match of another", Match("\"t2\""), kFailed},
    {"match of a weak tag", Match("W/\"t1\""), kFailed},
    {"match of a tag without quotes", Match("t1"), kFailed},
    {"match of an open tag", Match("\"t1"), kFailed},
    {"match of a list without commas", Match("\"t0\" \"t1\""), kFailed},
    {"match with text behind", Match("\"t1\"x"), kFailed},
    {"match of any among others", Match("*, \"t2\""), kFailed},
    {"match of the empty tag", Match("\"\""), kFailed},
    {"match of blanks", Match("  "), kFailed},
    {"match of a tag with a comma", Match("\"a,\"t1\""), kFailed},

    {"unmodified since later", {"", "", "", kAfter, ""}, kSend},
    {"unmodified since exactly", {"", "", "", kExactly, ""}, kSend},
    {"unmodified since before", {"", "", "", kBefore, ""}, kFailed},
    {"unmodified since no date", {"", "", "", "yesterday", ""}, kSend},
    {"match wins over unmodified since", {kTag, "", "", kBefore, ""}, kSend},
    {"failed match wins over unmodified since", {"\"t2\"", "", "", kAfter, ""}, kFailed},

    {"none match", NoneMatch("\"t1\""), kNotModified},
    {"none match of a weak tag", NoneMatch("W/\"t1\""), kNotModified},
    {"none match in a list", NoneMatch("\"t0\",W/\"t1\""), kNotModified},
    {"none match any", NoneMatch("*"), kNotModified},
    {"none match of another", NoneMatch("\"t2\", W/\"t3\""), kSend},
    {"none match of no tag", NoneMatch("t1"), kSend},
    {"none match of a tag in a broken list", NoneMatch("\"t1\" and more"), kSend},
    {"none match of a small w", NoneMatch("w/\"t1\""), kSend},

    {"modified since before", {"", "", kBefore, "", ""}, kSend},
    {"modified since exactly", {"", "", kExactly, "", ""}, kNotModified},
    {"modified since later", {"", "", kAfter, "", ""}, kNotModified},
    {"modified since no date", {"", "", "yesterday", "", ""}, kSend},
    {"none match wins over modified since", {"", "\"t2\"", kAfter, "", ""}, kSend},
    {"none match wins over an old modified since", {"", kTag, kBefore, "", ""}, kNotModified},

    {"match and none match both hold", {kTag, kTag, "", "", ""}, kNotModified},
    {"failed match comes before none match", {"\"t2\"", kTag, "", "", ""}, kFailed},
    {"match, then modified since", {kTag, "", kAfter, "", ""}, kNotModified},
    {"both dates, unmodified first", {"", "", kAfter, kBefore, ""}, kFailed},
    {"both dates hold", {"", "", kAfter, kAfter, ""}, kNotModified},
};

INSTANTIATE_TEST_SUITE_P(Table, Judging, ::testing::ValuesIn(kRows));

TEST(Judging, AFileChangedJustNowIsNeverNotModifiedByItsDate) {
    const Validators fresh = {kTag, kExample, false};
    EXPECT_EQ(reference::Judge({"", "", kAfter, "", ""}, fresh, kExample), kSend);
    EXPECT_EQ(reference::Judge({"", "", "", kBefore, ""}, fresh, kExample), kFailed);
    EXPECT_FALSE(reference::AllowsRange({"", "", "", "", kExactly}, fresh, kExample));
    EXPECT_TRUE(reference::AllowsRange({"", "", "", "", kTag}, fresh, kExample));
}

TEST(Judging, ARangeIsForTheSameStateOnly) {
    const std::pair<const char*, bool> rows[] = {
        {"", true},       {" ", true},      {"\"t1\"", true},    {" \"t1\" ", true},   {"\"t2\"", false},
        {"\"t1", false},  {"t1", false},    {"W/\"t1\"", false}, {"*", false},         {"\"t1\", \"t2\"", false},
        {kExactly, true}, {kBefore, false}, {kAfter, false},     {"yesterday", false},
    };
    for (const auto& [value, allowed] : rows) {
        EXPECT_EQ(reference::AllowsRange({"", "", "", "", value}, kFile, kNow), allowed) << value;
    }
}

}  // namespace
