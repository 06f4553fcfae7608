#include <cmath>
#include <limits>

#include "FrameworkTest.h"
#include "webapi/APIParameter.h"
#include "webapi/APIRequest.h"

using unit::J;
using ZOVA::APIParameter;
using ZOVA::APIParameterFactory;
using ZOVA::APIParameterFactoryBasicImpl;
using ZOVA::APIRequest;

namespace {

class TypedParametersTest : public unit::FrameworkTest {
protected:
    void Set(const std::string& key, const Json::Value& value) {
        Json::Value init(Json::objectValue);
        init["postParam"][key] = value;
        request.InitParam(init, false);
    }

    APIRequest request{Json::Value()};
};

int validatorCalls = 0;

template <class T>
bool Refuse(const T&) {
    ++validatorCalls;
    return false;
}

template <class T>
bool Accept(const T&) {
    ++validatorCalls;
    return true;
}

/** The flags in the order set, reset, invalid, default. */
template <class T>
std::string Flags(const APIParameter<T>& parameter) {
    std::string flags;
    flags += parameter.IsSet() ? 'S' : '-';
    flags += parameter.IsReset() ? 'R' : '-';
    flags += parameter.IsInvalid() ? 'I' : '-';
    flags += parameter.IsDefault() ? 'D' : '-';
    return flags;
}

// ---- states ----

TEST_F(TypedParametersTest, AbsentAndRequiredIsInvalid) {
    APIParameter<int> n = request.GetAndCheckInt("n", APIRequest::PARAM_REQUIRED);
    EXPECT_EQ(Flags(n), "--I-");
    EXPECT_EQ(n.Get(7), 7);
    EXPECT_EQ(n.Get(), 0);
    EXPECT_FALSE(n.SetDefault(7));
    EXPECT_EQ(Flags(n), "--I-");
    EXPECT_EQ(n.Get(), 0);
}

TEST_F(TypedParametersTest, AbsentAndOptionalTakesADefault) {
    APIParameter<int> n = request.GetAndCheckInt("n", APIRequest::PARAM_OPTIONAL);
    EXPECT_EQ(Flags(n), "----");
    EXPECT_EQ(n.Get(9), 9);
    EXPECT_TRUE(n.SetDefault(7));
    EXPECT_EQ(Flags(n), "S--D");
    EXPECT_EQ(n.Get(), 7);
    EXPECT_EQ(n.Get(9), 7);
    EXPECT_TRUE(n.SetDefault(8));
    EXPECT_EQ(n.Get(), 7) << "it is set by then";
}

TEST_F(TypedParametersTest, EveryNecessityButRequiredIsOptional) {
    EXPECT_EQ(Flags(request.GetAndCheckInt("n", static_cast<APIRequest::PARAM_NECESSITY>(5))), "----");
    EXPECT_EQ(Flags(request.GetAndCheckInt("n", static_cast<APIRequest::PARAM_NECESSITY>(-1))), "----");
}

TEST_F(TypedParametersTest, NullIsSetAndResetAndTakesNoDefault) {
    Set("n", Json::Value());
    validatorCalls = 0;
    for (const auto necessity : {APIRequest::PARAM_REQUIRED, APIRequest::PARAM_OPTIONAL}) {
        APIParameter<int> n = request.GetAndCheckInt("n", necessity, Refuse<int>);
        EXPECT_EQ(Flags(n), "SR--");
        EXPECT_EQ(n.Get(7), 0);
        EXPECT_TRUE(n.SetDefault(7));
        EXPECT_EQ(n.Get(), 0);
        EXPECT_EQ(Flags(n), "SR--");
    }
    EXPECT_EQ(validatorCalls, 0);
}

TEST_F(TypedParametersTest, ARefusingValidatorLeavesTheParsedValue) {
    Set("n", 5);
    const APIParameter<int> n = request.GetAndCheckInt("n", APIRequest::PARAM_REQUIRED, Refuse<int>);
    EXPECT_EQ(Flags(n), "S-I-");
    EXPECT_EQ(n.Get(), 5);
    EXPECT_EQ(n.Get(9), 9);
    EXPECT_TRUE(n == 5) << "a comparison looks at the value alone";
    EXPECT_FALSE(n != 5);
}

TEST_F(TypedParametersTest, AnAcceptingValidatorIsCalledOnce) {
    Set("n", 5);
    validatorCalls = 0;
    EXPECT_EQ(Flags(request.GetAndCheckInt("n", APIRequest::PARAM_REQUIRED, Accept<int>)), "S---");
    EXPECT_EQ(validatorCalls, 1);
}

TEST_F(TypedParametersTest, AWrongTypeKeepsTheStartValueAndAsksNoValidator) {
    Set("n", "5");
    validatorCalls = 0;
    const APIParameter<int> n = request.GetAndCheckInt("n", APIRequest::PARAM_REQUIRED, Accept<int>);
    EXPECT_EQ(Flags(n), "S-I-");
    EXPECT_EQ(n.Get(), 0);
    EXPECT_EQ(validatorCalls, 0);
}

TEST_F(TypedParametersTest, EachMarkSetsItsFlagAlone) {
    APIParameter<int> set, reset, invalid, isDefault;
    set.MarkSet();
    reset.MarkReset();
    invalid.MarkInvalid();
    isDefault.MarkDefault();
    EXPECT_EQ(Flags(set) + Flags(reset) + Flags(invalid) + Flags(isDefault), "S----R----I----D");
}

TEST_F(TypedParametersTest, ACopyIsIndependent) {
    Set("t", "text");
    APIParameter<std::string> first = request.GetAndCheckString("t", APIRequest::PARAM_REQUIRED);
    APIParameter<std::string> second(first);
    second.MarkInvalid();
    EXPECT_EQ(Flags(first), "S---");
    EXPECT_EQ(second.Get(), "text");
    first = second;
    EXPECT_EQ(Flags(first), "S-I-");
    first = *&first;
    EXPECT_EQ(first.Get(), "text");
}

TEST_F(TypedParametersTest, ParametersCompareByTheirValues) {
    APIParameter<int> a, b;
    b.MarkInvalid();
    EXPECT_TRUE(a == b);
    EXPECT_FALSE(a != b);
    b = APIParameter<int>();
    b.SetDefault(1);
    EXPECT_FALSE(a == b);
    EXPECT_TRUE(a != b);
}

TEST_F(TypedParametersTest, NaNEqualsNothing) {
    APIParameter<double> nan;
    nan.SetDefault(std::numeric_limits<double>::quiet_NaN());
    EXPECT_FALSE(nan == nan);
    EXPECT_TRUE(nan != nan);
    EXPECT_FALSE(nan == std::numeric_limits<double>::quiet_NaN());
}

TEST_F(TypedParametersTest, TextsCompareByLengthAndBytes) {
    APIParameter<std::string> text;
    text.SetDefault(std::string("a\0b", 3));
    EXPECT_TRUE(text == std::string("a\0b", 3));
    EXPECT_FALSE(text == std::string("a"));
}

TEST_F(TypedParametersTest, ARefusedValueKeepsTheOneThatWasHeld) {
    APIParameter<int> n;
    EXPECT_TRUE(n.ParseValue(5, Json::intValue));
    EXPECT_FALSE(n.ParseValue("x", Json::intValue));
    EXPECT_EQ(n.Get(), 5);
}

// ---- types ----

struct TypeCase {
    const char* name;
    const char* text;
    /** What each type makes of it; "" for a refusal. */
    const char* asInt;
    const char* asLongLong;
    const char* asUnsigned;
    const char* asUnsignedLongLong;
};

class IntegralTypes : public TypedParametersTest, public ::testing::WithParamInterface<TypeCase> {};

template <class T>
std::string Outcome(const APIParameter<T>& parameter) {
    if (parameter.IsInvalid()) {
        return parameter.Get() == T() ? "" : "refused, but not empty";
    }
    return std::to_string(parameter.Get());
}

TEST_P(IntegralTypes, TakeTheirWholeRangeAndNothingElse) {
    const TypeCase& row = GetParam();
    Set("n", J(row.text));
    EXPECT_EQ(Outcome(request.GetAndCheckInt("n", APIRequest::PARAM_REQUIRED)), row.asInt);
    EXPECT_EQ(Outcome(request.GetAndCheckIntegral<long long>("n", APIRequest::PARAM_REQUIRED)), row.asLongLong);
    EXPECT_EQ(Outcome(request.GetAndCheckIntegral<unsigned int>("n", APIRequest::PARAM_REQUIRED)), row.asUnsigned);
    EXPECT_EQ(Outcome(request.GetAndCheckIntegral<unsigned long long>("n", APIRequest::PARAM_REQUIRED)),
              row.asUnsignedLongLong);
    const Json::Value& params = request.Serialize()["param"];
    EXPECT_EQ(Outcome(APIParameterFactoryBasicImpl<int>::FromJson(params, "n", ZOVA::PARAM_REQUIRED)), row.asInt);
    EXPECT_EQ(Outcome(APIParameterFactoryBasicImpl<long long>::FromJson(params, "n", ZOVA::PARAM_REQUIRED)),
              row.asLongLong);
    EXPECT_EQ(Outcome(APIParameterFactoryBasicImpl<unsigned int>::FromJson(params, "n", ZOVA::PARAM_REQUIRED)),
              row.asUnsigned);
    EXPECT_EQ(Outcome(APIParameterFactoryBasicImpl<unsigned long long>::FromJson(params, "n", ZOVA::PARAM_REQUIRED)),
              row.asUnsignedLongLong);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, IntegralTypes,
    ::testing::Values(TypeCase{"Five", "5", "5", "5", "5", "5"}, TypeCase{"Zero", "0", "0", "0", "0", "0"},
                      TypeCase{"MinusOne", "-1", "-1", "-1", "", ""},
                      TypeCase{"LargestInt", "2147483647", "2147483647", "2147483647", "2147483647", "2147483647"},
                      TypeCase{"BeyondInt", "2147483648", "", "2147483648", "2147483648", "2147483648"},
                      TypeCase{"SmallestInt", "-2147483648", "-2147483648", "-2147483648", "", ""},
                      TypeCase{"BelowInt", "-2147483649", "", "-2147483649", "", ""},
                      TypeCase{"LargestUnsigned", "4294967295", "", "4294967295", "4294967295", "4294967295"},
                      TypeCase{"BeyondUnsigned", "4294967296", "", "4294967296", "", "4294967296"},
                      TypeCase{"LargestLongLong", "9223372036854775807", "", "9223372036854775807", "",
                               "9223372036854775807"},
                      TypeCase{"BeyondLongLong", "9223372036854775808", "", "", "", "9223372036854775808"},
                      TypeCase{"SmallestLongLong", "-9223372036854775808", "", "-9223372036854775808", "", ""},
                      TypeCase{"LargestUnsignedLongLong", "18446744073709551615", "", "", "", "18446744073709551615"},
                      TypeCase{"BeyondUnsignedLongLong", "18446744073709551616", "", "", "", ""},
                      TypeCase{"HugeReal", "1e300", "", "", "", ""}, TypeCase{"Fraction", "1.5", "", "", "", ""},
                      TypeCase{"Text", "\"5\"", "", "", "", ""}, TypeCase{"Bool", "true", "", "", "", ""},
                      TypeCase{"Array", "[5]", "", "", "", ""}, TypeCase{"Object", "{}", "", "", "", ""}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(TypedParametersTest, ABoolTakesABoolOnly) {
    for (const char* text : {"0", "1", "\"true\"", "[]", "{}"}) {
        Set("b", J(text));
        EXPECT_TRUE(request.GetAndCheckBool("b", APIRequest::PARAM_OPTIONAL).IsInvalid()) << text;
    }
    Set("b", true);
    EXPECT_TRUE(request.GetAndCheckBool("b", APIRequest::PARAM_REQUIRED).Get());
}

TEST_F(TypedParametersTest, ARealTakesEveryNumber) {
    Set("x", 5);
    const APIParameter<double> x = request.GetAndCheckReal("x", APIRequest::PARAM_REQUIRED);
    EXPECT_EQ(Flags(x), "S---");
    EXPECT_EQ(x.Get(), 5.0);
    Set("x", J("18446744073709551615"));
    EXPECT_EQ(request.GetAndCheckReal("x", APIRequest::PARAM_REQUIRED).Get(), 18446744073709551615.0);
    for (const char* text : {"\"5\"", "[5]", "{}"}) {
        Set("x", J(text));
        EXPECT_TRUE(request.GetAndCheckReal("x", APIRequest::PARAM_REQUIRED).IsInvalid()) << text;
    }
}

TEST_F(TypedParametersTest, ATextTakesATextOnlyWithAllItsBytes) {
    Set("t", std::string("a\0b", 3));
    EXPECT_EQ(request.GetAndCheckString("t", APIRequest::PARAM_REQUIRED).Get(), std::string("a\0b", 3));
    for (const char* text : {"5", "true", "[]", "{}"}) {
        Set("t", J(text));
        EXPECT_TRUE(request.GetAndCheckString("t", APIRequest::PARAM_REQUIRED).IsInvalid()) << text;
    }
}

TEST_F(TypedParametersTest, ArraysAndObjectsAreTakenByTheirExactType) {
    Set("a", J("[1]"));
    Set("o", J("{\"k\":1}"));
    EXPECT_JSON(request.GetAndCheckArray("a", APIRequest::PARAM_REQUIRED).Get(), "[1]");
    EXPECT_JSON(request.GetAndCheckObject("o", APIRequest::PARAM_REQUIRED).Get(), "{\"k\":1}");
    EXPECT_TRUE(request.GetAndCheckArray("o", APIRequest::PARAM_REQUIRED).IsInvalid());
    EXPECT_TRUE(request.GetAndCheckObject("a", APIRequest::PARAM_REQUIRED).IsInvalid());
    Set("a", "single");
    EXPECT_TRUE(request.GetAndCheckArray("a", APIRequest::PARAM_REQUIRED).IsInvalid());
}

// ---- a single value in place of an array ----

TEST_F(TypedParametersTest, AUnitArrayTakesASingleValueAsItsOneElement) {
    for (const char* text : {"\"x\"", "5", "true", "{\"k\":1}"}) {
        Set("a", J(text));
        EXPECT_JSON(request.GetAndCheckUnitArray("a", APIRequest::PARAM_REQUIRED).Get(), std::string("[") + text + "]");
    }
    Set("a", J("[1,2]"));
    EXPECT_JSON(request.GetAndCheckUnitArray("a", APIRequest::PARAM_REQUIRED).Get(), "[1,2]");
}

TEST_F(TypedParametersTest, AnEmptyUnitArrayGoesToTheValidatorAsItIs) {
    Set("a", J("[]"));
    validatorCalls = 0;
    const auto a = request.GetAndCheckUnitArray("a", APIRequest::PARAM_REQUIRED, Refuse<Json::Value>);
    EXPECT_EQ(validatorCalls, 1);
    EXPECT_EQ(Flags(a), "S-I-");
    EXPECT_JSON(a.Get(), "[]");
}

TEST_F(TypedParametersTest, ANullUnitArrayIsSetAndResetAndAsksNoValidator) {
    Set("a", Json::Value());
    validatorCalls = 0;
    EXPECT_EQ(Flags(request.GetAndCheckUnitArray("a", APIRequest::PARAM_REQUIRED, Refuse<Json::Value>)), "SR--");
    EXPECT_EQ(validatorCalls, 0);
}

TEST_F(TypedParametersTest, AnAbsentUnitArrayIsAsAnyAbsentParameter) {
    EXPECT_EQ(Flags(request.GetAndCheckUnitArray("a", APIRequest::PARAM_REQUIRED)), "--I-");
    EXPECT_EQ(Flags(request.GetAndCheckUnitArray("a", APIRequest::PARAM_OPTIONAL)), "----");
}

// ---- factories ----

TEST_F(TypedParametersTest, AFactoryNeedsAnObjectWhateverTheNecessity) {
    for (const char* text : {"5", "\"x\"", "[1]", "true"}) {
        for (const auto necessity : {ZOVA::PARAM_REQUIRED, ZOVA::PARAM_OPTIONAL}) {
            const Json::Value json = J(text);
            EXPECT_EQ(Flags(APIParameterFactory::ArrayFromJson(json, "a", necessity)), "--I-") << text;
            EXPECT_EQ(Flags(APIParameterFactory::ObjectFromJson(json, "a", necessity)), "--I-") << text;
            EXPECT_EQ(Flags(APIParameterFactoryBasicImpl<int>::FromJson(json, "a", necessity)), "--I-") << text;
        }
    }
}

TEST_F(TypedParametersTest, AFactoryTakesNullAsAnObjectThatHoldsNothing) {
    EXPECT_EQ(Flags(APIParameterFactory::ArrayFromJson(Json::Value(), "a", ZOVA::PARAM_OPTIONAL)), "----");
    EXPECT_EQ(Flags(APIParameterFactory::ArrayFromJson(Json::Value(), "a", ZOVA::PARAM_REQUIRED)), "--I-");
}

TEST_F(TypedParametersTest, AFactoryReadsAMember) {
    const Json::Value json = J(R"({"a": [1], "o": {"k": 1}, "s": "t", "b": true, "d": 1.5, "n": null})");
    EXPECT_JSON(APIParameterFactory::ArrayFromJson(json, "a", ZOVA::PARAM_REQUIRED).Get(), "[1]");
    EXPECT_JSON(APIParameterFactory::ObjectFromJson(json, "o", ZOVA::PARAM_REQUIRED).Get(), "{\"k\":1}");
    EXPECT_EQ(APIParameterFactoryBasicImpl<std::string>::FromJson(json, "s", ZOVA::PARAM_REQUIRED).Get(), "t");
    EXPECT_TRUE(APIParameterFactoryBasicImpl<bool>::FromJson(json, "b", ZOVA::PARAM_REQUIRED).Get());
    EXPECT_EQ(APIParameterFactoryBasicImpl<double>::FromJson(json, "d", ZOVA::PARAM_REQUIRED).Get(), 1.5);
    EXPECT_EQ(Flags(APIParameterFactory::ArrayFromJson(json, "n", ZOVA::PARAM_REQUIRED)), "SR--");
    EXPECT_EQ(Flags(APIParameterFactory::ArrayFromJson(json, "o", ZOVA::PARAM_OPTIONAL, Accept<Json::Value>)), "S-I-");
    EXPECT_EQ(Flags(APIParameterFactory::ArrayFromJson(json, "a", ZOVA::PARAM_OPTIONAL, Refuse<Json::Value>)), "S-I-");
}

}  // namespace
