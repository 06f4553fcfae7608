// Checks of plain values, and the patterns behind them.

#include "webapi/APIValidator.h"

#include <regex.h>
#include <sys/socket.h>

#include <cstdlib>
#include <thread>

#include "FrameworkTest.h"
#include "request/APIValidatorPrivate.h"
#include "webapi/APIRequest.h"

using ZOVA::APIValidator;
using ZOVA::APIValidatorPrivate;

namespace {

using namespace std::string_literals;

using APIValidatorTest = unit::FrameworkTest;

// ---- what the system judges ----

TEST_F(APIValidatorTest, AHostNameIsWhatTheSystemTakesForOne) {
    platform.hostNames = {"disk"};
    EXPECT_TRUE(APIValidator::IsHostname("disk"));
    EXPECT_FALSE(APIValidator::IsHostname("Disk!"));
    EXPECT_EQ(platform.CallsOf({"BlQLIBIsHostname", "BlQLIBIsDomain", "ZOVANetGetAddrType"}),
              (std::vector<std::string>{"BlQLIBIsHostname(disk)", "BlQLIBIsHostname(Disk!)"}));
}

TEST_F(APIValidatorTest, ADomainIsWhatTheSystemTakesForOne) {
    platform.domainNames = {"example.com"};
    EXPECT_TRUE(APIValidator::IsDomain("example.com"));
    EXPECT_FALSE(APIValidator::IsDomain("example"));
    EXPECT_EQ(platform.CallsOf({"BlQLIBIsHostname", "BlQLIBIsDomain", "ZOVANetGetAddrType"}),
              (std::vector<std::string>{"BlQLIBIsDomain(example.com)", "BlQLIBIsDomain(example)"}));
}

TEST_F(APIValidatorTest, AnAddressIsOfTheFamilyThatTheSystemTells) {
    platform.addressTypes = {{"192.0.2.1", 2}, {"::1", 10}, {"other", 1}};
    EXPECT_TRUE(APIValidator::IsIP("192.0.2.1"));
    EXPECT_TRUE(APIValidator::IsIPv4("192.0.2.1"));
    EXPECT_FALSE(APIValidator::IsIPv6("192.0.2.1"));
    EXPECT_TRUE(APIValidator::IsIP("::1"));
    EXPECT_FALSE(APIValidator::IsIPv4("::1"));
    EXPECT_TRUE(APIValidator::IsIPv6("::1"));
    EXPECT_TRUE(APIValidator::IsIP("other"));
    EXPECT_FALSE(APIValidator::IsIPv4("other"));
    EXPECT_FALSE(APIValidator::IsIPv6("other"));
    EXPECT_FALSE(APIValidator::IsIP("disk"));
}

struct TextCheck {
    const char* name;
    bool (*check)(const std::string&);
    /** A text that passes. */
    const char* good;
};

class TextChecks : public APIValidatorTest, public ::testing::WithParamInterface<TextCheck> {
protected:
    TextChecks() {
        platform.hostNames = {"good", ""};
        platform.domainNames = {"good", ""};
        platform.addressTypes = {{"good4", AF_INET}, {"good6", AF_INET6}, {"", AF_INET}};
    }
};

TEST_P(TextChecks, RefuseTheEmptyTextWithoutAskingTheSystem) {
    EXPECT_FALSE(GetParam().check(""));
    EXPECT_EQ(platform.CountOf("BlQLIBIsHostname") + platform.CountOf("BlQLIBIsDomain") +
                  platform.CountOf("ZOVANetGetAddrType"),
              0);
}

TEST_P(TextChecks, RefuseATextWithAZeroByteInIt) {
    const std::string good = GetParam().good;
    EXPECT_TRUE(GetParam().check(good));
    EXPECT_FALSE(GetParam().check(good + "\0"s));
    EXPECT_FALSE(GetParam().check(good + "\0; x"s));
    EXPECT_FALSE(GetParam().check("\0"s + good));
}

TEST_P(TextChecks, GoWithTheTypedParametersOfARequest) {
    Json::Value init;
    init["postParam"]["good"] = GetParam().good;
    init["postParam"]["bad"] = "";
    const ZOVA::APIRequest request(init);
    const auto necessity = ZOVA::APIRequest::PARAM_REQUIRED;
    EXPECT_FALSE(request.GetAndCheckString("good", necessity, GetParam().check).IsInvalid());
    EXPECT_TRUE(request.GetAndCheckString("bad", necessity, GetParam().check).IsInvalid());
}

INSTANTIATE_TEST_SUITE_P(All, TextChecks,
                         ::testing::Values(TextCheck{"IsHostname", APIValidator::IsHostname, "good"},
                                           TextCheck{"IsDomain", APIValidator::IsDomain, "good"},
                                           TextCheck{"IsIP", APIValidator::IsIP, "good4"},
                                           TextCheck{"IsIPv4", APIValidator::IsIPv4, "good4"},
                                           TextCheck{"IsIPv6", APIValidator::IsIPv6, "good6"},
                                           TextCheck{"IsEMail", APIValidator::IsEMail, "a@b"},
                                           TextCheck{"IsNetbios", APIValidator::IsNetbios, "DISK"},
                                           TextCheck{"IsWorkGroup", APIValidator::IsWorkGroup, "WORKGROUP"},
                                           TextCheck{"IsDigit", APIValidator::IsDigit, "12"},
                                           TextCheck{"IsTetherLinkId", APIValidator::IsTetherLinkId, "a-1"}),
                         [](const auto& row) { return std::string(row.param.name); });

// ---- what a pattern judges ----

struct PatternCase {
    const char* name;
    bool (*check)(const std::string&);
    std::string text;
    bool passes;
};

class Patterns : public APIValidatorTest, public ::testing::WithParamInterface<PatternCase> {};

TEST_P(Patterns, JudgeATextByItsCharacters) {
    EXPECT_EQ(GetParam().check(GetParam().text), GetParam().passes) << GetParam().text;
}

const auto kName = [](const auto& row) { return std::string(row.param.name); };

INSTANTIATE_TEST_SUITE_P(
    EMail, Patterns,
    ::testing::Values(PatternCase{"Ordinary", APIValidator::IsEMail, "alice@example.com", true},
                      PatternCase{"Tag", APIValidator::IsEMail, "alice.b+list@mail.example.com", true},
                      PatternCase{"TwoAtSigns", APIValidator::IsEMail, "a@b@c", true},
                      PatternCase{"AtSignsAlone", APIValidator::IsEMail, "@@@", true},
                      PatternCase{"OneAtSignAlone", APIValidator::IsEMail, "@", false},
                      PatternCase{"NoAtSign", APIValidator::IsEMail, "alice", false},
                      PatternCase{"NoLocalPart", APIValidator::IsEMail, "@example.com", false},
                      PatternCase{"NoDomain", APIValidator::IsEMail, "alice@", false},
                      PatternCase{"TheRangeFromPlusToBackslash", APIValidator::IsEMail,
                                  R"(+,-./09:;<=>?@AZ[\@+,-./09:;<=>?@AZ[\)", true},
                      PatternCase{"AClosingBracket", APIValidator::IsEMail, "a]@b", false},
                      PatternCase{"ACaretOnlyBefore", APIValidator::IsEMail, "a^b@c", true},
                      PatternCase{"NoCaretBehind", APIValidator::IsEMail, "a@b^c", false},
                      PatternCase{"QuotesOnlyBefore", APIValidator::IsEMail, R"("a"'`{|}~()*$@b)", true},
                      PatternCase{"NoQuotesBehind", APIValidator::IsEMail, "a@b\"c", false},
                      PatternCase{"PercentAmpersandHashBehind", APIValidator::IsEMail, "a@%&!#_b", true},
                      PatternCase{"ABlank", APIValidator::IsEMail, "a b@c", false},
                      PatternCase{"ABlankBehind", APIValidator::IsEMail, "a@b ", false},
                      PatternCase{"ALineEnd", APIValidator::IsEMail, "a@b\n", false},
                      PatternCase{"ALineEndInside", APIValidator::IsEMail, "a\n@b", false},
                      PatternCase{"LettersBeyondASCII", APIValidator::IsEMail, "\xc3\xa4@b", false}),
    kName);

INSTANTIATE_TEST_SUITE_P(
    Netbios, Patterns,
    ::testing::Values(PatternCase{"Ordinary", APIValidator::IsNetbios, "Disk_1-a", true},
                      PatternCase{"OneLetter", APIValidator::IsNetbios, "d", true},
                      PatternCase{"ADigitFirst", APIValidator::IsNetbios, "1disk", false},
                      PatternCase{"AHyphenFirst", APIValidator::IsNetbios, "-disk", false},
                      PatternCase{"AnUnderscoreFirst", APIValidator::IsNetbios, "_disk", false},
                      PatternCase{"Has255Characters", APIValidator::IsNetbios, std::string(255, 'a'), true},
                      PatternCase{"Has256Characters", APIValidator::IsNetbios, std::string(256, 'a'), false},
                      PatternCase{"ADot", APIValidator::IsNetbios, "disk.local", false},
                      PatternCase{"ABlank", APIValidator::IsNetbios, "my disk", false},
                      PatternCase{"ALineEnd", APIValidator::IsNetbios, "disk\n", false},
                      PatternCase{"AnotherLine", APIValidator::IsNetbios, "disk\n;x", false}),
    kName);

INSTANTIATE_TEST_SUITE_P(
    WorkGroup, Patterns,
    ::testing::Values(PatternCase{"Ordinary", APIValidator::IsWorkGroup, "WORKGROUP", true},
                      PatternCase{"OneForbiddenCharacterAmongOthers", APIValidator::IsWorkGroup, "a;b", true},
                      PatternCase{"OneGoodCharacterAtTheEnd", APIValidator::IsWorkGroup, ";;;;a", true},
                      PatternCase{"OnlySemicolons", APIValidator::IsWorkGroup, ";;", false},
                      PatternCase{"OnlyForbiddenCharacters", APIValidator::IsWorkGroup, R"(][;:"<>*+\/|?,)", false},
                      PatternCase{"ABlank", APIValidator::IsWorkGroup, " ", true},
                      PatternCase{"ALineEnd", APIValidator::IsWorkGroup, "\n", true}),
    kName);

INSTANTIATE_TEST_SUITE_P(DigitsAndIds, Patterns,
                         ::testing::Values(PatternCase{"Digits", APIValidator::IsDigit, "0123456789", true},
                                           PatternCase{"NoDigits", APIValidator::IsDigit, "", false},
                                           PatternCase{"ALetterBehindDigits", APIValidator::IsDigit, "12a", false},
                                           PatternCase{"ASign", APIValidator::IsDigit, "-1", false},
                                           PatternCase{"ADot", APIValidator::IsDigit, "1.5", false},
                                           PatternCase{"ABlankBeforeDigits", APIValidator::IsDigit, " 1", false},
                                           PatternCase{"ALineEndBehindDigits", APIValidator::IsDigit, "1\n", false},
                                           PatternCase{"DigitsOnTwoLines", APIValidator::IsDigit, "1\n2", false},
                                           PatternCase{"DigitsBeyondASCII", APIValidator::IsDigit, "\xd9\xa1", false},
                                           PatternCase{"AnId", APIValidator::IsTetherLinkId, "aZ-09", true},
                                           PatternCase{"HyphensAlone", APIValidator::IsTetherLinkId, "--", true},
                                           PatternCase{"NoId", APIValidator::IsTetherLinkId, "", false},
                                           PatternCase{"AnUnderscore", APIValidator::IsTetherLinkId, "a_b", false},
                                           PatternCase{"ASlash", APIValidator::IsTetherLinkId, "a/b", false},
                                           PatternCase{"ALineEndBehindAnId", APIValidator::IsTetherLinkId, "a\n",
                                                       false}),
                         kName);

// ---- ports ----

TEST_F(APIValidatorTest, APortIsANumberFrom0To65535) {
    EXPECT_FALSE(APIValidator::IsPort(-1));
    EXPECT_TRUE(APIValidator::IsPort(0));
    EXPECT_TRUE(APIValidator::IsPort(1));
    EXPECT_TRUE(APIValidator::IsPort(65535));
    EXPECT_FALSE(APIValidator::IsPort(65536));
    EXPECT_FALSE(APIValidator::IsPort(2147483647));
    EXPECT_FALSE(APIValidator::IsPort(-2147483647 - 1));
}

TEST_F(APIValidatorTest, APortGoesWithTheTypedParametersOfARequest) {
    const ZOVA::APIRequest request(unit::J(R"({"getParam": {"good": 80, "bad": 65536}})"));
    EXPECT_FALSE(request.GetAndCheckInt("good", ZOVA::APIRequest::PARAM_REQUIRED, APIValidator::IsPort).IsInvalid());
    EXPECT_TRUE(request.GetAndCheckInt("bad", ZOVA::APIRequest::PARAM_REQUIRED, APIValidator::IsPort).IsInvalid());
}

// ---- patterns of others ----

TEST_F(APIValidatorTest, APatternOfAPackageIsExtendedAndTellsCapitalsApart) {
    EXPECT_TRUE(APIValidator::CheckRegex("aab", "^(a|b){3}$"));
    EXPECT_FALSE(APIValidator::CheckRegex("AAB", "^(a|b){3}$"));
    EXPECT_TRUE(APIValidator::CheckRegex("", "^$"));
}

TEST_F(APIValidatorTest, ABrokenPatternIsFalseAndLoggedEachTime) {
    for (int i = 0; i < 3; ++i) {
        ExpectLog(LOG_ERR, "Invalid pattern", "APIValidatorPrivate.cpp");
    }
    static constexpr const char* kBroken = "(a";
    for (int i = 0; i < 3; ++i) {
        EXPECT_FALSE(APIValidator::CheckRegex("a", kBroken));
    }
    EXPECT_EQ(platform.CountOf("calloc"), 3);
}

TEST_F(APIValidatorTest, NoPatternIsFalseAndNotLogged) {
    EXPECT_FALSE(APIValidator::CheckRegex("a", nullptr));
}

TEST_F(APIValidatorTest, TextsUpTo64KiBAreMatchedAndLongerOnesRefused) {
    EXPECT_TRUE(APIValidator::IsDigit(std::string(65536, '1')));
    EXPECT_FALSE(APIValidator::IsDigit(std::string(65537, '1')));
    EXPECT_FALSE(APIValidator::IsWorkGroup(std::string(65537, 'a')));
    EXPECT_FALSE(APIValidator::IsEMail(std::string(65535, '@') + " "));
}

// ---- the compiled patterns ----

TEST_F(APIValidatorTest, APatternIsCompiledOnceAndKnownByItsAddress) {
    APIValidatorPrivate validator;
    const char first[] = "^a$";
    const char second[] = "^a$";
    re_pattern_buffer* compiled[3] = {};
    EXPECT_TRUE(validator.GetRegex(first, &compiled[0]));
    EXPECT_TRUE(validator.GetRegex(first, &compiled[1]));
    EXPECT_TRUE(validator.GetRegex(second, &compiled[2]));
    EXPECT_NE(compiled[0], nullptr);
    EXPECT_EQ(compiled[0], compiled[1]);
    EXPECT_NE(compiled[0], compiled[2]);
    EXPECT_EQ(platform.CountOf("calloc"), 2);
}

TEST_F(APIValidatorTest, WhatStandsAtAnAddressLaterDoesNotCount) {
    APIValidatorPrivate validator;
    char pattern[] = "^a$";
    EXPECT_TRUE(validator.CheckRegex("a", pattern));
    pattern[1] = 'b';
    EXPECT_TRUE(validator.CheckRegex("a", pattern));
    EXPECT_FALSE(validator.CheckRegex("b", pattern));
}

TEST_F(APIValidatorTest, ACompiledPatternReportsNoSubMatches) {
    APIValidatorPrivate validator;
    re_pattern_buffer* compiled = nullptr;
    ASSERT_TRUE(validator.GetRegex("(a)", &compiled));
    EXPECT_TRUE(compiled->no_sub);
}

TEST_F(APIValidatorTest, NullPointersAreRefused) {
    APIValidatorPrivate validator;
    re_pattern_buffer* compiled = nullptr;
    EXPECT_FALSE(validator.GetRegex(nullptr, &compiled));
    EXPECT_FALSE(validator.GetRegex("a", nullptr));
    EXPECT_EQ(compiled, nullptr);
    EXPECT_EQ(platform.CountOf("calloc"), 0);
}

TEST_F(APIValidatorTest, ABrokenPatternLeavesTheCallersPointerAndIsCompiledAgain) {
    ExpectLog(LOG_ERR, "Invalid pattern");
    APIValidatorPrivate validator;
    char pattern[] = "[a";
    re_pattern_buffer* compiled = nullptr;
    EXPECT_FALSE(validator.GetRegex(pattern, &compiled));
    EXPECT_EQ(compiled, nullptr);
    pattern[0] = 'a';
    EXPECT_TRUE(validator.GetRegex(pattern, &compiled));
}

TEST_F(APIValidatorTest, WithoutMemoryForAPatternTheTextIsRefusedUntilThereIsSome) {
    APIValidatorPrivate validator;
    static constexpr const char* kPattern = "^a$";
    platform.Fail("calloc", ENOMEM, 0, 1);
    EXPECT_FALSE(validator.CheckRegex("a", kPattern));
    EXPECT_TRUE(validator.CheckRegex("a", kPattern));
}

// ---- the one object ----

TEST_F(APIValidatorTest, TheInstanceIsTheSameForEveryThread) {
    std::vector<APIValidator*> seen(8);
    std::vector<std::thread> threads;
    for (APIValidator*& instance : seen) {
        threads.emplace_back([&instance] { instance = APIValidator::GetInstance(); });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_NE(APIValidator::GetInstance(), nullptr);
    for (const APIValidator* instance : seen) {
        EXPECT_EQ(instance, APIValidator::GetInstance());
    }
}

/** In a process that has not made the object yet: 0 if it is made as soon as there is memory for it and not before. */
int MakeInstanceWithLittleMemory(fake::FakePlatform& platform) {
    for (int allocation = 0; allocation < 2; ++allocation) {
        platform.Fail("new", ENOMEM, allocation, 1);
        if (APIValidator::GetInstance() != nullptr) {
            return 1;
        }
        platform.Fail("new", ENOMEM, allocation, 1);
        if (APIValidator::IsDigit("1")) {
            return 2;
        }
    }
    platform.StopFailing();
    return APIValidator::IsDigit("1") ? 0 : 3;
}

TEST_F(APIValidatorTest, WithoutMemoryThereIsNoInstanceAndNothingMatches) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(std::quick_exit(MakeInstanceWithLittleMemory(platform)), ::testing::ExitedWithCode(0), "");
}

}  // namespace
