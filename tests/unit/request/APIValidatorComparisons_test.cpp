// Comparisons of filled parameters with constants.

#include <cmath>
#include <limits>

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"
#include "webapi/APIValidator.h"

using unit::J;
using ZOVA::APIParameter;
using ZOVA::APIParameterFactoryBasicImpl;
using ZOVA::APIValidator;

namespace {

constexpr double kEps = 2.220446049250313e-16;

using APIValidatorComparisonsTest = unit::FrameworkTest;

/** A parameter that holds the value. */
template <class T>
APIParameter<T> Holding(const T& value) {
    APIParameter<T> parameter;
    EXPECT_TRUE(parameter.SetDefault(value));
    return parameter;
}

/** A parameter that holds the value and is invalid all the same, as after a validator's refusal. */
template <class T>
APIParameter<T> Invalid(const T& value) {
    APIParameter<T> parameter = Holding(value);
    parameter.MarkInvalid();
    return parameter;
}

APIParameter<Json::Value> HoldingJson(const std::string& text) {
    return Holding(J(text));
}

template <class T>
class Integers : public APIValidatorComparisonsTest {};

using IntegerTypes = ::testing::Types<int, unsigned int, long long, unsigned long long>;
TYPED_TEST_SUITE(Integers, IntegerTypes);

TYPED_TEST(Integers, AreEqualOnlyToTheirValue) {
    const auto five = Holding<TypeParam>(5);
    EXPECT_TRUE(APIValidator::IsEqual(five, 5));
    EXPECT_FALSE(APIValidator::IsEqual(five, 4));
    EXPECT_FALSE(APIValidator::IsEqual(five, 6));
}

TYPED_TEST(Integers, LieBetweenEndsThatAreIncluded) {
    const auto five = Holding<TypeParam>(5);
    EXPECT_TRUE(APIValidator::IsBetween(five, 5, 5));
    EXPECT_TRUE(APIValidator::IsBetween(five, 4, 6));
    EXPECT_FALSE(APIValidator::IsBetween(five, 6, 7));
    EXPECT_FALSE(APIValidator::IsBetween(five, 3, 4));
    EXPECT_FALSE(APIValidator::IsBetween(five, 6, 4));
}

TYPED_TEST(Integers, AreGreaterOrLessThanOthersButNotThanThemselves) {
    const auto five = Holding<TypeParam>(5);
    EXPECT_TRUE(APIValidator::IsGreater(five, 4));
    EXPECT_FALSE(APIValidator::IsGreater(five, 5));
    EXPECT_FALSE(APIValidator::IsGreater(five, 6));
    EXPECT_TRUE(APIValidator::IsLess(five, 6));
    EXPECT_FALSE(APIValidator::IsLess(five, 5));
    EXPECT_FALSE(APIValidator::IsLess(five, 4));
}

TYPED_TEST(Integers, AreComparedInTheWholeRangeOfTheirType) {
    constexpr TypeParam low = std::numeric_limits<TypeParam>::min();
    constexpr TypeParam high = std::numeric_limits<TypeParam>::max();
    EXPECT_TRUE(APIValidator::IsEqual(Holding<TypeParam>(high), high));
    EXPECT_TRUE(APIValidator::IsBetween(Holding<TypeParam>(high), low, high));
    EXPECT_TRUE(APIValidator::IsBetween(Holding<TypeParam>(low), low, high));
    EXPECT_TRUE(APIValidator::IsGreater(Holding<TypeParam>(high), low));
    EXPECT_TRUE(APIValidator::IsLess(Holding<TypeParam>(low), high));
    EXPECT_FALSE(APIValidator::IsEqual(Holding<TypeParam>(high), low));
    EXPECT_FALSE(APIValidator::IsLess(Holding<TypeParam>(high), low));
}

TYPED_TEST(Integers, ThatAreInvalidAreNothing) {
    const auto five = Invalid<TypeParam>(5);
    EXPECT_FALSE(APIValidator::IsEqual(five, 5));
    EXPECT_FALSE(APIValidator::IsBetween(five, 5, 5));
    EXPECT_FALSE(APIValidator::IsGreater(five, 4));
    EXPECT_FALSE(APIValidator::IsLess(five, 6));
}

TEST_F(APIValidatorComparisonsTest, AnAbsentOptionalParameterIsComparedByItsStartValue) {
    const ZOVA::APIRequest request{Json::Value()};
    const auto absent = request.GetAndCheckInt("n", ZOVA::APIRequest::PARAM_OPTIONAL);
    ASSERT_FALSE(absent.IsSet());
    EXPECT_TRUE(APIValidator::IsGreater(absent, -1));
    EXPECT_TRUE(APIValidator::IsEqual(absent, 0));
    EXPECT_TRUE(APIValidator::IsBetween(absent, 0, 0));
    EXPECT_TRUE(APIValidator::IsLess(absent, 1));
    const auto text = request.GetAndCheckString("t", ZOVA::APIRequest::PARAM_OPTIONAL);
    EXPECT_TRUE(APIValidator::IsEqual(text, ""));
    EXPECT_TRUE(APIValidator::IsBelong(text, J(R"([""])")));
}

TEST_F(APIValidatorComparisonsTest, AnAbsentRequiredParameterIsNothing) {
    const ZOVA::APIRequest request{Json::Value()};
    const auto absent = request.GetAndCheckInt("n", ZOVA::APIRequest::PARAM_REQUIRED);
    EXPECT_FALSE(APIValidator::IsGreater(absent, -1));
    EXPECT_FALSE(APIValidator::IsEqual(absent, 0));
}

TEST_F(APIValidatorComparisonsTest, TruthValuesTextsAndJsonAreEqualByTheirOwnComparison) {
    EXPECT_TRUE(APIValidator::IsEqual(Holding(true), true));
    EXPECT_FALSE(APIValidator::IsEqual(Holding(true), false));
    EXPECT_TRUE(APIValidator::IsEqual(Holding<std::string>("a"), std::string("a")));
    EXPECT_FALSE(APIValidator::IsEqual(Holding<std::string>("a"), std::string("A")));
    EXPECT_TRUE(APIValidator::IsEqual(Holding<std::string>("a"), "a"));
    EXPECT_FALSE(APIValidator::IsEqual(Holding<std::string>("a"), "ab"));
    EXPECT_TRUE(APIValidator::IsEqual(HoldingJson(R"({"a": [1]})"), J(R"({"a": [1]})")));
    EXPECT_FALSE(APIValidator::IsEqual(HoldingJson(R"({"a": [1]})"), J(R"({"a": [2]})")));
    EXPECT_FALSE(APIValidator::IsEqual(HoldingJson("[]"), J("{}")));
}

TEST_F(APIValidatorComparisonsTest, ATextIsEqualAsAWholeAndNotUpToAZeroByte) {
    const auto text = Holding(std::string("a\0b", 3));
    EXPECT_TRUE(APIValidator::IsEqual(text, std::string("a\0b", 3)));
    EXPECT_FALSE(APIValidator::IsEqual(text, "a"));
}

TEST_F(APIValidatorComparisonsTest, InvalidTruthValuesTextsAndJsonAreNothing) {
    EXPECT_FALSE(APIValidator::IsEqual(Invalid(true), true));
    EXPECT_FALSE(APIValidator::IsEqual(Invalid<std::string>("a"), std::string("a")));
    EXPECT_FALSE(APIValidator::IsEqual(Invalid<std::string>("a"), "a"));
    EXPECT_FALSE(APIValidator::IsEqual(Invalid(J("[1]")), J("[1]")));
    EXPECT_FALSE(APIValidator::IsBelong(Invalid<std::string>("a"), J(R"(["a"])")));
    EXPECT_FALSE(APIValidator::IsBelong(Invalid(J("[]")), J("[]")));
}

// ---- real numbers, with their margin ----

TEST_F(APIValidatorComparisonsTest, ARealNumberIsEqualWithinTheMargin) {
    EXPECT_NE(0.1 + 0.2, 0.3);
    EXPECT_TRUE(APIValidator::IsEqual(Holding(0.1 + 0.2), 0.3));
    EXPECT_TRUE(APIValidator::IsEqual(Holding(0.3), 0.1 + 0.2));
    EXPECT_TRUE(APIValidator::IsEqual(Holding(1.0 + kEps), 1.0));
    EXPECT_TRUE(APIValidator::IsEqual(Holding(1.0), 1.0 + kEps));
    EXPECT_FALSE(APIValidator::IsEqual(Holding(1.0 + 2 * kEps), 1.0));
    EXPECT_FALSE(APIValidator::IsEqual(Holding(1.0), 1.0 + 2 * kEps));
}

TEST_F(APIValidatorComparisonsTest, TheMarginDoesNotGrowWithTheNumbers) {
    EXPECT_TRUE(APIValidator::IsEqual(Holding(1e300), 1e300));
    EXPECT_FALSE(APIValidator::IsEqual(Holding(std::nextafter(1e300, 2e300)), 1e300));
    EXPECT_TRUE(APIValidator::IsEqual(Holding(1e-300), 2e-300));
}

TEST_F(APIValidatorComparisonsTest, AnInvalidRealNumberIsNothingEvenWhenTheValuesMatch) {
    EXPECT_FALSE(APIValidator::IsEqual(Invalid(0.3), 0.3));
    EXPECT_FALSE(APIValidator::IsBetween(Invalid(5.0), 4.0, 6.0));
    EXPECT_FALSE(APIValidator::IsGreater(Invalid(5.0), 4.0));
    EXPECT_FALSE(APIValidator::IsLess(Invalid(5.0), 6.0));
}

TEST_F(APIValidatorComparisonsTest, ARealNumberLiesBetweenEndsThatAreExcludedWithAMargin) {
    EXPECT_FALSE(APIValidator::IsBetween(Holding(5.0), 5.0, 5.0));
    EXPECT_FALSE(APIValidator::IsBetween(Holding(5.0), 5.0, 6.0));
    EXPECT_FALSE(APIValidator::IsBetween(Holding(5.0), 4.0, 5.0));
    EXPECT_TRUE(APIValidator::IsBetween(Holding(5.0), 4.0, 6.0));
    EXPECT_FALSE(APIValidator::IsBetween(Holding(1.0 + kEps), 1.0, 2.0));
    EXPECT_TRUE(APIValidator::IsBetween(Holding(1.0 + 2 * kEps), 1.0, 2.0));
    EXPECT_FALSE(APIValidator::IsBetween(Holding(1.0 - kEps), 0.0, 1.0));
    EXPECT_TRUE(APIValidator::IsBetween(Holding(1.0 - 2 * kEps), 0.0, 1.0));
}

TEST_F(APIValidatorComparisonsTest, ARealNumberIsGreaterOrLessByMoreThanTheMargin) {
    EXPECT_FALSE(APIValidator::IsGreater(Holding(1.0 + kEps), 1.0));
    EXPECT_TRUE(APIValidator::IsGreater(Holding(1.0 + 2 * kEps), 1.0));
    EXPECT_FALSE(APIValidator::IsGreater(Holding(1.0), 2.0));
    EXPECT_FALSE(APIValidator::IsLess(Holding(1.0 - kEps), 1.0));
    EXPECT_TRUE(APIValidator::IsLess(Holding(1.0 - 2 * kEps), 1.0));
    EXPECT_FALSE(APIValidator::IsLess(Holding(2.0), 1.0));
}

TEST_F(APIValidatorComparisonsTest, WhatIsNoNumberCompares) {
    const double nan = std::numeric_limits<double>::quiet_NaN();
    const double infinity = std::numeric_limits<double>::infinity();
    EXPECT_FALSE(APIValidator::IsEqual(Holding(nan), nan));
    EXPECT_FALSE(APIValidator::IsBetween(Holding(nan), -infinity, infinity));
    EXPECT_FALSE(APIValidator::IsGreater(Holding(nan), 0.0));
    EXPECT_FALSE(APIValidator::IsLess(Holding(nan), 0.0));
    EXPECT_TRUE(APIValidator::IsGreater(Holding(infinity), 1e308));
    EXPECT_TRUE(APIValidator::IsLess(Holding(-infinity), -1e308));
}

// ---- lists ----

TEST_F(APIValidatorComparisonsTest, ATextBelongsToAListThatHoldsIt) {
    const Json::Value list = J(R"(["a", "b", 5])");
    EXPECT_TRUE(APIValidator::IsBelong(Holding<std::string>("b"), list));
    EXPECT_FALSE(APIValidator::IsBelong(Holding<std::string>("c"), list));
    EXPECT_FALSE(APIValidator::IsBelong(Holding<std::string>("5"), list));
    EXPECT_FALSE(APIValidator::IsBelong(Holding<std::string>(""), list));
    EXPECT_FALSE(APIValidator::IsBelong(Holding(std::string("a\0", 2)), list));
}

TEST_F(APIValidatorComparisonsTest, NothingBelongsToAListThatIsNoArray) {
    for (const char* list : {"{}", R"({"a": "a"})", "\"a\"", "5", "true"}) {
        EXPECT_FALSE(APIValidator::IsBelong(Holding<std::string>("a"), J(list))) << list;
        EXPECT_FALSE(APIValidator::IsBelong(HoldingJson(R"(["a"])"), J(list))) << list;
        EXPECT_FALSE(APIValidator::IsBelong(HoldingJson("[]"), J(list))) << list;
    }
}

TEST_F(APIValidatorComparisonsTest, ANullListIsAnEmptyArray) {
    EXPECT_FALSE(APIValidator::IsBelong(Holding<std::string>("a"), J("null")));
    EXPECT_FALSE(APIValidator::IsBelong(HoldingJson(R"(["a"])"), J("null")));
    EXPECT_TRUE(APIValidator::IsBelong(HoldingJson("[]"), J("null")));
}

TEST_F(APIValidatorComparisonsTest, AnArrayBelongsIfEachElementDoes) {
    const Json::Value list = J(R"(["a", "b", 5, {"k": [1]}])");
    EXPECT_TRUE(APIValidator::IsBelong(HoldingJson(R"(["b", "a", "a"])"), list));
    EXPECT_TRUE(APIValidator::IsBelong(HoldingJson(R"([{"k": [1]}, 5])"), list));
    EXPECT_FALSE(APIValidator::IsBelong(HoldingJson(R"(["a", "c"])"), list));
    EXPECT_FALSE(APIValidator::IsBelong(HoldingJson(R"(["a", "5"])"), list));
    EXPECT_FALSE(APIValidator::IsBelong(HoldingJson("[null]"), list));
}

TEST_F(APIValidatorComparisonsTest, TheValuesOfAnObjectBelongLikeTheElementsOfAnArray) {
    EXPECT_TRUE(APIValidator::IsBelong(HoldingJson(R"({"x": "a", "y": "b"})"), J(R"(["a", "b"])")));
    EXPECT_FALSE(APIValidator::IsBelong(HoldingJson(R"({"a": "x"})"), J(R"(["a", "b"])")));
}

TEST_F(APIValidatorComparisonsTest, AnEmptyValueBelongsToEveryList) {
    for (const char* value : {"[]", "{}"}) {
        EXPECT_TRUE(APIValidator::IsBelong(HoldingJson(value), J("[]"))) << value;
        EXPECT_TRUE(APIValidator::IsBelong(HoldingJson(value), J("[1]"))) << value;
    }
    EXPECT_TRUE(APIValidator::IsBelong(APIParameter<Json::Value>(), J("[1]")));
}

TEST_F(APIValidatorComparisonsTest, ASingleValueDoesNotBelong) {
    for (const char* value : {"5", "\"a\"", "true", "1.5"}) {
        EXPECT_FALSE(APIValidator::IsBelong(HoldingJson(value), J(R"([5, "a", true, 1.5])"))) << value;
    }
}

}  // namespace
