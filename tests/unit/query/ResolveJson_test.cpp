#include "FrameworkTest.h"
#include "webapi/APIUtils.h"

using unit::J;
using ZOVA::APIUtils::ResolveJson;

namespace {

struct Row {
    const char* name;
    const char* source;
    const char* templateText;
    const char* output;
};

class ResolveJsonRow : public unit::FrameworkTest, public ::testing::WithParamInterface<Row> {};

TEST_P(ResolveJsonRow, GivesWhatTheTemplateNames) {
    Json::Value output;
    EXPECT_TRUE(ResolveJson(J(GetParam().source), J(GetParam().templateText), output));
    EXPECT_JSON(output, GetParam().output);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, ResolveJsonRow,
    ::testing::Values(
        Row{"OfAnyDepthIntoAFlatOutput", R"({"data": {"token": "abc"}})", R"({"data": {"token": "{access_token}"}})",
            R"({"access_token": "abc"})"},
        Row{"ValuesOfAnyType", R"({"a": [1], "b": null, "c": {"x": 1}, "d": 1.5, "e": true})",
            R"({"a": "{A}", "b": "{B}", "c": "{C}", "d": "{D}", "e": "{E}"})",
            R"({"A": [1], "B": null, "C": {"x": 1}, "D": 1.5, "E": true})"},
        Row{"NothingForAMemberThatIsNotThere", R"({"a": 1})", R"({"b": "{B}"})", "null"},
        Row{"TheLaterOfTwoUnderOneName", R"({"a": 1, "b": 2})", R"({"a": "{X}", "b": "{X}"})", R"({"X": 2})"},
        Row{"TheEmptyNameForBracesAlone", R"({"a": 1})", R"({"a": "{}"})", R"({"": 1})"},
        Row{"NothingForTextBeforeTheBrace", R"({"a": 1})", R"({"a": "x{A}"})", "null"},
        Row{"NothingForTextBehindTheBrace", R"({"a": 1})", R"({"a": "{A}x"})", "null"},
        Row{"NothingForABlankBehindTheBrace", R"({"a": 1})", R"({"a": "{A} "})", "null"},
        Row{"NothingForTwoNames", R"({"a": 1})", R"({"a": "{A}{B}"})", "null"},
        Row{"NothingForTwoClosingBraces", R"({"a": 1})", R"({"a": "{A}}"})", "null"},
        Row{"AnOpeningBraceWithinTheName", R"({"a": 1})", R"({"a": "{{A}"})", R"({"{A": 1})"},
        Row{"NothingForAnOpenBrace", R"({"a": 1})", R"({"a": "{"})", "null"},
        Row{"NothingForAnOpenName", R"({"a": 1})", R"({"a": "{A"})", "null"},
        Row{"NothingForAClosingBrace", R"({"a": 1})", R"({"a": "}"})", "null"},
        Row{"NothingForAnEmptyText", R"({"a": 1})", R"({"a": ""})", "null"},
        Row{"NothingForPlainText", R"({"a": "x"})", R"({"a": "x"})", "null"},
        Row{"NothingForOtherTemplateValues", R"({"a": 1, "b": 1, "c": [1], "d": 1})",
            R"({"a": 1, "b": null, "c": ["{C}"], "d": true})", "null"},
        Row{"TheRestBesideWhatDoesNotMatch", R"({"a": 1, "b": 2})", R"({"a": 5, "b": "{B}", "c": "{C}"})",
            R"({"B": 2})"},
        Row{"NothingBelowAValueThatIsNoObject", R"({"a": "x", "b": [{"c": 1}], "d": null})",
            R"({"a": {"c": "{A}"}, "b": {"c": "{B}"}, "d": {"c": "{D}"}})", "null"},
        Row{"AnObjectWhereTheTemplateHasAName", R"({"a": {"b": 1}})", R"({"a": "{A}"})", R"({"A": {"b": 1}})"},
        Row{"NothingForATemplateThatIsNoObject", R"({"a": 1})", R"("{A}")", "null"},
        Row{"NothingForAnArrayAsTemplate", R"([1])", R"(["{A}"])", "null"},
        Row{"NothingForANullTemplate", R"({"a": 1})", "null", "null"},
        Row{"NothingFromASourceThatIsNoObject", R"([{"a": 1}])", R"({"a": "{A}"})", "null"},
        Row{"NothingFromANullSource", "null", R"({"a": "{A}"})", "null"},
        Row{"NamesWithNul", R"({"a\u0000b": 1, "a": 2})", R"({"a\u0000b": "{x\u0000y}"})", R"({"x\u0000y": 1})"}),
    [](const auto& row) { return std::string(row.param.name); });

class ResolveJsonTest : public unit::FrameworkTest {};

TEST_F(ResolveJsonTest, OtherMembersOfTheOutputStayAndAnEarlierOneIsReplaced) {
    Json::Value output = J(R"({"kept": 1, "A": {"old": true}})");
    EXPECT_TRUE(ResolveJson(J(R"({"a": 5})"), J(R"({"a": "{A}"})"), output));
    EXPECT_JSON(output, R"({"kept": 1, "A": 5})");
}

TEST_F(ResolveJsonTest, AnOutputOfAnotherTypeIsReplacedOnceThereIsAValue) {
    Json::Value output = J("[1]");
    EXPECT_TRUE(ResolveJson(J(R"({"a": 5})"), J(R"({"b": "{A}"})"), output));
    EXPECT_JSON(output, "[1]");
    EXPECT_TRUE(ResolveJson(J(R"({"a": 5})"), J(R"({"a": "{A}"})"), output));
    EXPECT_JSON(output, R"({"A": 5})");
}

TEST_F(ResolveJsonTest, FollowsATemplateAsDeepAsJsonIsRead) {
    std::string source = "1";
    std::string templateText = R"("{deep}")";
    for (int level = 0; level < Json::kMaximumDepth; ++level) {
        source = R"({"a":)" + source + "}";
        templateText = R"({"a":)" + templateText + "}";
    }
    Json::Value output;
    EXPECT_TRUE(ResolveJson(J(source), J(templateText), output));
    EXPECT_JSON(output, R"({"deep": 1})");
}

}  // namespace
