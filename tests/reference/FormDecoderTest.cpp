#include <gtest/gtest.h>

#include <ostream>

#include "Seam.h"
#include "common/JsonText.h"

namespace {

struct FormCase {
    const char* name;
    std::string line;
    bool typed;
    bool decode;
    /** The object as JSON text. */
    std::string expected;
};

std::string NestedArray(size_t depth) {
    return std::string(depth, '[') + std::string(depth, ']');
}

void PrintTo(const FormCase& row, std::ostream* out) {
    *out << row.name;
}

class FormDecoder : public ::testing::TestWithParam<FormCase> {};

std::string NameOf(const ::testing::TestParamInfo<FormCase>& info) {
    return info.param.name;
}

}  // namespace

TEST_P(FormDecoder, GivesTheObject) {
    Json::Value out;
    ASSERT_TRUE(ZOVA::WebAPIUtil::strPairToJsonObj(GetParam().line, out, GetParam().typed, GetParam().decode));
    Json::Value expected;
    ASSERT_TRUE(reference::ParseJson(GetParam().expected, expected)) << GetParam().expected;
    EXPECT_EQ(out, expected) << reference::WriteJson(out);
}

INSTANTIATE_TEST_SUITE_P(
    Lines, FormDecoder,
    ::testing::Values(
        FormCase{"EmptyTextIsAnEmptyObject", "", true, true, "{}"},
        FormCase{"SeparatorsAloneAreAnEmptyObject", "&&&", true, true, "{}"},
        FormCase{"TwoPairs", "a=x&b=y", true, true, R"({"a":"x","b":"y"})"},
        FormCase{"ALaterPairOfANameWins", "a=1&a=2", true, true, R"({"a":2})"},
        FormCase{"APairWithoutEqualsIsEmpty", "a&b", true, true, R"({"a":"","b":""})"},
        FormCase{"ANameMayBeEmpty", "=v", true, true, R"({"":"v"})"},
        FormCase{"OnlyTheFirstEqualsSeparates", "k=v=w", true, true, R"({"k":"v=w"})"},
        FormCase{"PlusAndEscapesAreDecoded", "a+b=c+d%26%3D%2b", true, true, R"({"a b":"c d&=+"})"},
        FormCase{"WithoutDecodingTheyStay", "a+b=c%20d", true, false, R"({"a+b":"c%20d"})"},
        FormCase{"BrokenEscapesStay", "a=%&b=%2&c=%zz&d=%4g", true, true, R"({"a":"%","b":"%2","c":"%zz","d":"%4g"})"},
        FormCase{"WithoutTypesAllIsText", "a=1&b=true&c=[1]", false, true, R"({"a":"1","b":"true","c":"[1]"})"},
        FormCase{"Integers", "a=0&b=-1&c=42&d=-0", true, true, R"({"a":0,"b":-1,"c":42,"d":0})"},
        FormCase{"LargeIntegers", "a=9223372036854775807&b=-9223372036854775808&c=18446744073709551615", true, true,
                 R"({"a":9223372036854775807,"b":-9223372036854775808,"c":18446744073709551615})"},
        FormCase{"Fractions", "a=1.5&b=-2e3", true, true, R"({"a":1.5,"b":-2e3})"},
        FormCase{"Words", "a=true&b=false&c=null", true, true, R"({"a":true,"b":false,"c":null})"},
        FormCase{"QuotesForceText", "a=%2242%22&b=%22%22", true, true, R"({"a":"42","b":""})"},
        FormCase{"Containers", "a=%5B1,%22x%22%5D&b=%7B%22k%22:%5B%5D%7D", true, true, R"({"a":[1,"x"],"b":{"k":[]}})"},
        FormCase{"WhatIsNoValueAsAWholeStaysText", "a=-&b=1a&c=%5B1%5Dx&d=%5B&e=tru&f=truex", true, true,
                 R"({"a":"-","b":"1a","c":"[1]x","d":"[","e":"tru","f":"truex"})"},
        FormCase{"LooseNumbersStayText", "a=01&b=1.&c=.5&d=%2B1&e=1e&f=0x10&g=NaN&h=Infinity&i=-01", true, true,
                 R"({"a":"01","b":"1.","c":".5","d":"+1","e":"1e","f":"0x10","g":"NaN","h":"Infinity","i":"-01"})"},
        FormCase{"LooseContainersStayText", "a=%5B1,%5D&b=%5B01%5D&c=%7Bk:1%7D&d=%5B1/**/%5D&e=%5B'x'%5D", true, true,
                 R"({"a":"[1,]","b":"[01]","c":"{k:1}","d":"[1/**/]","e":"['x']"})"},
        FormCase{"BlanksAroundAValueKeepItText", "a=+1&b=1+&c=%5B%5D+", true, true, R"({"a":" 1","b":"1 ","c":"[] "})"},
        FormCase{"BlanksInsideAContainerAreFine", "a=%5B+1+,+2+%5D", true, true, R"({"a":[1,2]})"},
        FormCase{"Depth257StaysText", "a=" + NestedArray(257), true, true, "{\"a\":\"" + NestedArray(257) + "\"}"},
        FormCase{"Depth100000StaysText", "a=" + NestedArray(100000), true, true,
                 "{\"a\":\"" + NestedArray(100000) + "\"}"},
        FormCase{"UnclosedDepth100000StaysText", "a=" + std::string(100000, '[') + "]", true, true,
                 "{\"a\":\"" + std::string(100000, '[') + "]\"}"},
        FormCase{"ANumberOf1000DigitsStaysText", "a=" + std::string(1000, '9'), true, true,
                 "{\"a\":\"" + std::string(1000, '9') + "\"}"},
        FormCase{"AnOverflowingExponentStaysText", "a=1e999&b=%5B1e999%5D", true, true,
                 R"({"a":"1e999","b":"[1e999]"})"}),
    NameOf);

TEST(FormDecoderLimits, Depth256IsReadAsTheArrayItIs) {
    Json::Value out;
    ASSERT_TRUE(ZOVA::WebAPIUtil::strPairToJsonObj("a=" + NestedArray(256), out, true, true));
    const Json::Value* value = &out["a"];
    int depth = 0;
    while (value->isArray()) {
        ++depth;
        if (value->empty()) {
            break;
        }
        value = &(*value)[0];
    }
    EXPECT_EQ(depth, 256);
}

TEST(FormDecoderLimits, KeepsNulBytesAndInvalidUtf8) {
    Json::Value out;
    const std::string raw("n\0m=v\0w", 7);
    ASSERT_TRUE(ZOVA::WebAPIUtil::strPairToJsonObj(raw + "&%00=%ff%fe&u=\xc3\x28", out, true, true));
    EXPECT_EQ(out[std::string("n\0m", 3)].asString(), std::string("v\0w", 3));
    EXPECT_EQ(out[std::string(1, '\0')].asString(), "\xff\xfe");
    EXPECT_EQ(out["u"].asString(), "\xc3\x28");
    EXPECT_EQ(out.size(), 3u);
}

TEST(FormDecoderLimits, AddsToAnObjectAndReplacesItsMembers) {
    Json::Value out;
    out["kept"] = 1;
    out["old"] = 1;
    ASSERT_TRUE(ZOVA::WebAPIUtil::strPairToJsonObj("old=2&new=3", out, true, true));
    EXPECT_EQ(reference::WriteJson(out), R"({"kept":1,"new":3,"old":2})");
}

TEST(FormDecoderLimits, RefusesATargetThatIsNoObject) {
    for (Json::Value target : {Json::Value(1), Json::Value("x"), Json::Value(Json::arrayValue), Json::Value(true)}) {
        const Json::Value before = target;
        EXPECT_FALSE(ZOVA::WebAPIUtil::strPairToJsonObj("a=1", target, true, true));
        EXPECT_EQ(target, before);
    }
}

TEST(FormDecoderLimits, TakesAHundredThousandPairs) {
    std::string line;
    for (int i = 0; i < 100000; ++i) {
        const std::string number = std::to_string(i);
        line.append("p").append(number).append("=").append(number).append("&");
    }
    Json::Value out;
    ASSERT_TRUE(ZOVA::WebAPIUtil::strPairToJsonObj(line, out, true, true));
    EXPECT_EQ(out.size(), 100000u);
    EXPECT_EQ(out["p99999"], Json::Value(99999));
}

TEST(FormDecoderLimits, TakesAValueOfOneMegabyteOfAnyKind) {
    const size_t kSize = 1 << 20;
    for (const std::string& value :
         {std::string(kSize, 'x'), std::string(kSize, '%'), std::string(kSize, '+'), std::string(kSize, '['),
          std::string("\"").append(kSize, '\\'), std::string(kSize, '1'), std::string(kSize, '='),
          std::string("{").append(kSize, '"').append("}")}) {
        Json::Value out;
        ASSERT_TRUE(ZOVA::WebAPIUtil::strPairToJsonObj("a=" + value, out, true, false));
        EXPECT_TRUE(out["a"].isString());
        EXPECT_EQ(out["a"].asString(), value);
    }
}

TEST(FormDecoderLimits, NeverThrowsForShortTextsOfAwkwardBytes) {
    const std::string alphabet = std::string("\0\"\\{}[]:,-.eE01nut%&=+ \xff", 25);
    std::string line(5, alphabet[0]);
    for (size_t number = 0; number < 400000; ++number) {
        size_t rest = number * 2654435761u;
        for (char& byte : line) {
            byte = alphabet[rest % alphabet.size()];
            rest /= alphabet.size();
        }
        Json::Value out;
        ASSERT_NO_THROW(ZOVA::WebAPIUtil::strPairToJsonObj("a=" + line, out, true, true));
        ASSERT_TRUE(out.isObject());
    }
}
