#include <gtest/gtest.h>
#include <sys/stat.h>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/Base64.h"
#include "common/JsonSyntax.h"
#include "common/JsonText.h"
#include "common/KeyValueText.h"
#include "common/PrintableText.h"

using ZOVA::WebAPIUtil;

namespace {

using ReadJsonFile = DeviceTest;

std::string Array(const char* text, const char* separators) {
    return reference::WriteJson(WebAPIUtil::ParseToArray(text, separators));
}

}  // namespace

TEST(ParseToArray, SplitsAtEachSeparatorAndDropsTheBlanksAround) {
    EXPECT_EQ(Array("a=1; b=2 ;\tc", ";"), R"(["a=1","b=2","c"])");
    EXPECT_EQ(Array("a,b;c", ",;"), R"(["a","b","c"])");
    EXPECT_EQ(Array("a b", ";"), R"(["a b"])");
    EXPECT_EQ(Array("abc", ""), R"(["abc"])");
}

TEST(ParseToArray, PassesOverEmptyElements) {
    EXPECT_EQ(Array(";; a ; ;", ";"), R"(["a"])");
    EXPECT_EQ(Array("", ";"), "[]");
    EXPECT_EQ(Array(" ", ";"), "[]");
}

TEST(ParseToArray, TakesNullAsEmpty) {
    EXPECT_EQ(Array(nullptr, ";"), "[]");
    EXPECT_EQ(Array("a;b", nullptr), R"(["a;b"])");
}

TEST(UrlCoding, DecodesEscapesAndKeepsBrokenOnes) {
    EXPECT_EQ(WebAPIUtil::URLDecode("x%20y%2FZ%2f", true), "x y/Z/");
    EXPECT_EQ(WebAPIUtil::URLDecode("%", true), "%");
    EXPECT_EQ(WebAPIUtil::URLDecode("%4", true), "%4");
    EXPECT_EQ(WebAPIUtil::URLDecode("%%41%", true), "%A%");
    EXPECT_EQ(WebAPIUtil::URLDecode("%g1%1g", true), "%g1%1g");
    EXPECT_EQ(WebAPIUtil::URLDecode("%00", true), std::string(1, '\0'));
    EXPECT_EQ(WebAPIUtil::URLDecode("%2541", true), "%41");
}

TEST(UrlCoding, TurnsPlusIntoABlankOnlyWhenAsked) {
    EXPECT_EQ(WebAPIUtil::URLDecode("a+b", true), "a+b");
    EXPECT_EQ(WebAPIUtil::URLDecode("a+b", false), "a b");
    EXPECT_EQ(WebAPIUtil::URLDecode("a%2Bb", false), "a+b");
}

TEST(UrlCoding, EncodesAllButTheUnreserved) {
    EXPECT_EQ(WebAPIUtil::URLEncode("a b"), "a%20b");
    EXPECT_EQ(WebAPIUtil::URLEncode("AZaz09-_.~"), "AZaz09-_.~");
    EXPECT_EQ(WebAPIUtil::URLEncode("\r\n;,+%\xff"), "%0D%0A%3B%2C%2B%25%FF");
}

TEST(UrlCoding, DecodingReversesEncodingOfEveryByte) {
    std::string all;
    for (int byte = 0; byte < 256; ++byte) {
        all += static_cast<char>(byte);
    }
    EXPECT_EQ(WebAPIUtil::URLDecode(WebAPIUtil::URLEncode(all), true), all);
    EXPECT_EQ(WebAPIUtil::URLDecode(WebAPIUtil::URLEncode(all), false), all);
}

TEST_F(ReadJsonFile, ReadsAWholeValue) {
    Json::Value out;
    WriteFile(InRoot("/scratch/a.lib"), "{\"a\":[1,2]}\n");
    ASSERT_TRUE(WebAPIUtil::ReadJsonFile(out, InRoot("/scratch/a.lib").c_str()));
    EXPECT_EQ(reference::WriteJson(out), R"({"a":[1,2]})");
}

TEST_F(ReadJsonFile, LeavesTheTargetAloneForWhatItCannotRead) {
    WriteFile(InRoot("/scratch/comment"), "{} // x");
    WriteFile(InRoot("/scratch/comma"), "[1,]");
    WriteFile(InRoot("/scratch/more"), "{} {}");
    WriteFile(InRoot("/scratch/empty"), "");
    WriteFile(InRoot("/scratch/deep"), std::string(257, '[') + std::string(257, ']'));
    WriteFile(InRoot("/scratch/abyss"), std::string(100000, '['));
    WriteFile(InRoot("/scratch/nul"), std::string("{}\0", 3));
    ASSERT_EQ(mkfifo(InRoot("/scratch/pipe").c_str(), 0600), 0);
    for (const char* name : {"comment", "comma", "more", "empty", "deep", "abyss", "nul", "pipe", "missing", ""}) {
        Json::Value out("before");
        EXPECT_FALSE(WebAPIUtil::ReadJsonFile(out, InRoot(std::string("/scratch/") + name).c_str())) << name;
        EXPECT_EQ(out.asString(), "before") << name;
    }
    Json::Value out("before");
    EXPECT_FALSE(WebAPIUtil::ReadJsonFile(out, nullptr));
}

TEST(JsonSyntax, AcceptsWhatTheStandardAllows) {
    for (const char* text : {"0", "-0", "1.5e-7", " [ ] ", "{\"a\":{}}", "\"\\u00e9\\n\"", "[true,false,null]",
                             "{\"a\":[],\"b\":[{}]}", "\t\r\n1\n"}) {
        EXPECT_TRUE(reference::IsJsonText(text)) << text;
    }
}

TEST(JsonSyntax, RefusesEverythingElse) {
    for (const char* text :
         {"",         " ",        "-",        "+1",         "01",   "1.",   "1e+", "[1 2]",   "[,1]",
          "{\"a\"}",  "{\"a\":}", "{1:2}",    "{\"a\":1,}", "]",    "[}",   "{]",  "\"\\x\"", "\"\\u12g4\"",
          "\"\\u123", "\"",       "\"a\nb\"", "nul",        "True", "[1]]", "1 2"}) {
        EXPECT_FALSE(reference::IsJsonText(text)) << text;
    }
}

TEST(KeyValueText, FindsTheLastLineOfTheKey) {
    const char* text = "# a=\"0\"\na=\"1\"\nab=\"2\"\r\n  a=\"3\"  \nb=4\nc=\"x\"y\"\nd=\"\"";
    EXPECT_EQ(reference::FindKeyValue(text, "a"), "3");
    EXPECT_EQ(reference::FindKeyValue(text, "ab"), "2");
    EXPECT_EQ(reference::FindKeyValue(text, "d"), "");
    EXPECT_FALSE(reference::FindKeyValue(text, "b"));
    EXPECT_FALSE(reference::FindKeyValue(text, "c"));
    EXPECT_FALSE(reference::FindKeyValue(text, "# a"));
    EXPECT_FALSE(reference::FindKeyValue(text, ""));
    EXPECT_FALSE(reference::FindKeyValue("a=\"", "a"));
}

TEST(Base64, DecodesOnlyTheOneSpellingOfTheBytes) {
    std::string bytes;
    for (const char* text : {"", "Zg", "Zm8", "Zm9v", "-_-_"}) {
        EXPECT_TRUE(reference::Base64Decode(text, reference::Base64Alphabet::kUrl, bytes)) << text;
    }
    for (const char* text : {"Z", "Zh", "Zm9", "Zg==", "+/+/", "Zm9v ", "Zm 9", "Zm9v\n", "Z\xff"}) {
        EXPECT_FALSE(reference::Base64Decode(text, reference::Base64Alphabet::kUrl, bytes)) << text;
    }
    EXPECT_TRUE(reference::Base64Decode("Zg==", reference::Base64Alphabet::kAny, bytes));
    EXPECT_EQ(bytes, "f");
    EXPECT_TRUE(reference::Base64Decode("+/+/", reference::Base64Alphabet::kAny, bytes));
    EXPECT_FALSE(reference::Base64Decode("+/-_", reference::Base64Alphabet::kAny, bytes));
    EXPECT_FALSE(reference::Base64Decode("Zg=", reference::Base64Alphabet::kAny, bytes));
    EXPECT_FALSE(reference::Base64Decode("Z===", reference::Base64Alphabet::kAny, bytes));
}

TEST(PrintableText, LeavesNothingThatCouldSplitALogLine) {
    EXPECT_EQ(reference::PrintableText("a\r\n\\\x7f\xc3"), "a\\x0d\\x0a\\\\\\x7f\\xc3");
    EXPECT_EQ(reference::PrintableText(std::string(1000, 'x')), std::string(64, 'x') + "...");
}
