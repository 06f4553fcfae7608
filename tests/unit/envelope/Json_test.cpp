#include <sys/stat.h>

#include <cmath>
#include <limits>

#include "FrameworkTest.h"

using unit::J;

namespace {

class JsonTest : public unit::FrameworkTest {
protected:
    unit::TemporaryDirectory directory;
};

std::string Nested(char open, char close, int depth) {
    return std::string(static_cast<std::size_t>(depth), open) + std::string(static_cast<std::size_t>(depth), close);
}

// ---- reading ----

struct TextCase {
    const char* name;
    std::string text;
    bool good;
};

void PrintTo(const TextCase& row, std::ostream* out) {
    *out << row.name;
}

class JsonText : public JsonTest, public ::testing::WithParamInterface<TextCase> {};

TEST_P(JsonText, IsParsedAsAWholeOrLeavesTheValueAlone) {
    Json::Value value = "untouched";
    EXPECT_NO_THROW(EXPECT_EQ(Json::fromString(value, GetParam().text), GetParam().good));
    if (!GetParam().good) {
        EXPECT_EQ(value, Json::Value("untouched"));
    }
}

INSTANTIATE_TEST_SUITE_P(
    Rows, JsonText,
    ::testing::Values(
        TextCase{"Object", R"({"a":1})", true}, TextCase{"Scalar", "5", true}, TextCase{"Null", "null", true},
        TextCase{"Blanks", " [1] \n", true}, TextCase{"Empty", "", false}, TextCase{"OnlyBlanks", "  ", false},
        TextCase{"TextBehind", "1 2", false}, TextCase{"Truncated", "{\"a\":", false},
        TextCase{"Comment", "/* c */ 1", false}, TextCase{"CommentBehind", "1 // c", false},
        TextCase{"TrailingComma", "[1,]", false}, TextCase{"SingleQuotes", "'a'", false},
        TextCase{"Word", "yes", false}, TextCase{"InvalidUTF8", "\"\xff\xfe\"", true},
        TextCase{"LoneSurrogate", R"("\ud800")", false}, TextCase{"Depth256", Nested('[', ']', 256), true},
        TextCase{"Depth257", Nested('[', ']', 257), false}, TextCase{"Depth100000", Nested('[', ']', 100000), false},
        TextCase{"OpenOnly100000", std::string(100000, '['), false},
        TextCase{"BracketsInAText", "\"" + std::string(1000, '[') + "\"", true},
        TextCase{"NumberOfThousandDigits", std::string(1000, '9'), false}, TextCase{"BeyondDouble", "1e999", false}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(JsonTest, OfTwoMembersOfOneNameTheLaterCounts) {
    EXPECT_JSON(J(R"({"a":1,"a":2})"), R"({"a":2})");
}

// ---- writing ----

TEST_F(JsonTest, WritesCompactSortedAndUnescapedWithoutANewline) {
    EXPECT_EQ(Json::toString(J("{ \"b\" : [ 1 , 2 ], \"a\" : \"\xc3\xa4/\" }")), "{\"a\":\"\xc3\xa4/\",\"b\":[1,2]}");
}

TEST_F(JsonTest, WritesANumberThatJsonCannotHoldAsNull) {
    EXPECT_EQ(Json::toString(std::numeric_limits<double>::quiet_NaN()), "null");
    Json::Value value;
    EXPECT_TRUE(Json::fromString(value, Json::toString(std::numeric_limits<double>::infinity())));
}

TEST_F(JsonTest, InvalidUTF8IsWrittenAsJsonThatCanBeReadAgain) {
    Json::Value value;
    EXPECT_TRUE(Json::fromString(value, Json::toString(Json::Value("\xff\xfe \xc3"))));
    EXPECT_TRUE(value.isString());
}

TEST_F(JsonTest, ControlCharactersAreEscaped) {
    EXPECT_EQ(Json::toString(Json::Value("a\n\"\\")), R"("a\n\"\\")");
    EXPECT_EQ(Json::toString(Json::Value(std::string("\0", 1))), R"("\u0000")");
}

// ---- files ----

TEST_F(JsonTest, AFileIsWrittenForItsOwnerAloneAndReadAgain) {
    const std::string path = directory.Path() + "/new.json";
    EXPECT_TRUE(Json::toFile(J(R"({"a":1})"), path));
    EXPECT_EQ(directory.Read("new.json"), R"({"a":1})");
    struct stat status {};
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0600U);
    Json::Value value;
    EXPECT_TRUE(Json::fromFile(value, path));
    EXPECT_JSON(value, R"({"a":1})");
}

TEST_F(JsonTest, AReplacedFileKeepsItsMode) {
    const std::string path = directory.Path() + "/old.json";
    directory.Write("old.json", "1");
    ASSERT_EQ(chmod(path.c_str(), 0640), 0);
    EXPECT_TRUE(Json::toFile(2, path));
    struct stat status {};
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0640U);
    EXPECT_EQ(directory.List().size(), 1U);
}

TEST_F(JsonTest, AFailedWriteLeavesTheOldFileAndNothingBesideIt) {
    for (const char* call : {"open", "fchmod", "write", "rename"}) {
        directory.Write("old.json", "1");
        platform.StopFailing();
        platform.Fail(call, ENOSPC);
        EXPECT_FALSE(Json::toFile(2, directory.Path() + "/old.json")) << call;
        EXPECT_EQ(directory.Read("old.json"), "1") << call;
        EXPECT_EQ(directory.List().size(), 1U) << call;
    }
}

TEST_F(JsonTest, FilesThatCannotBeReadLeaveTheValueAlone) {
    Json::Value value = "untouched";
    directory.Write("broken.json", "{");
    ASSERT_EQ(mkfifo((directory.Path() + "/fifo").c_str(), 0600), 0);
    for (const std::string name : {"none.json", "broken.json", "fifo", "."}) {
        EXPECT_FALSE(Json::fromFile(value, directory.Path() + "/" + name)) << name;
    }
    EXPECT_EQ(value, Json::Value("untouched"));
}

// ---- total readers ----

struct ReaderCase {
    const char* name;
    const char* text;
    int asInt;
    unsigned long long asUInt64;
    const char* asString;
    bool asBool;
};

class JsonReaders : public JsonTest, public ::testing::WithParamInterface<ReaderCase> {};

void PrintTo(const ReaderCase& row, std::ostream* out) {
    *out << row.name;
}

TEST_P(JsonReaders, AreTotal) {
    const ReaderCase& row = GetParam();
    const Json::Value value = J(row.text);
    EXPECT_NO_THROW({
        EXPECT_EQ(Json::asInt(value), row.asInt);
        EXPECT_EQ(Json::asUInt64(value), row.asUInt64);
        EXPECT_EQ(Json::asString(value), row.asString);
        EXPECT_EQ(Json::asBool(value), row.asBool);
        Json::member(value, "a");
        Json::hasMember(value, "a");
        Json::searchArrayIndex(value, 1);
    });
}

INSTANTIATE_TEST_SUITE_P(
    Rows, JsonReaders,
    ::testing::Values(
        ReaderCase{"Null", "null", 0, 0, "", false}, ReaderCase{"True", "true", 1, 1, "true", true},
        ReaderCase{"False", "false", 0, 0, "false", false}, ReaderCase{"Five", "5", 5, 5, "5", true},
        ReaderCase{"MinusFive", "-5", -5, 0, "-5", true},
        ReaderCase{"BeyondInt", "5000000000", 0, 5000000000ULL, "5000000000", true},
        ReaderCase{"Largest", "18446744073709551615", 0, 18446744073709551615ULL, "18446744073709551615", true},
        ReaderCase{"Real", "2.5", 2, 2, "2.5", true}, ReaderCase{"NegativeReal", "-2.5", -2, 0, "-2.5", true},
        ReaderCase{"HugeReal", "1e300", 0, 0, "1.0000000000000001e+300", true},
        ReaderCase{"DecimalText", "\"42\"", 42, 42, "42", false},
        ReaderCase{"NegativeText", "\"-42\"", -42, 0, "-42", false},
        ReaderCase{"OverlongText", "\"99999999999999999999\"", 0, 0, "99999999999999999999", false},
        ReaderCase{"OtherText", "\"4x\"", 0, 0, "4x", false}, ReaderCase{"EmptyText", "\"\"", 0, 0, "", false},
        ReaderCase{"Array", "[1]", 0, 0, "", false}, ReaderCase{"Object", "{\"a\":1}", 0, 0, "", false}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(JsonTest, ATextKeepsItsNulBytes) {
    const std::string text("a\0b", 3);
    EXPECT_EQ(Json::asString(Json::Value(text)), text);
}

TEST_F(JsonTest, NullCountsAsAnObjectAndAsAnArray) {
    EXPECT_TRUE(Json::isObject(Json::Value()));
    EXPECT_TRUE(Json::isArray(Json::Value()));
    EXPECT_TRUE(Json::isObject(J("{}")));
    EXPECT_FALSE(Json::isObject(J("[]")));
    EXPECT_FALSE(Json::isArray(J("{}")));
    EXPECT_FALSE(Json::isArray(J("\"\"")));
}

TEST_F(JsonTest, SearchesTheFirstEqualElement) {
    EXPECT_EQ(Json::searchArrayIndex(J(R"([1,"a",{"b":2},"a"])"), "a"), 1U);
    EXPECT_EQ(Json::searchArrayIndex(J(R"([1,"a",{"b":2}])"), J(R"({"b":2})")), 2U);
    EXPECT_EQ(Json::searchArrayIndex(J("[1]"), 2), Json::Value::maxUInt);
    EXPECT_EQ(Json::searchArrayIndex(J("{\"a\":1}"), 1), Json::Value::maxUInt);
}

}  // namespace
