#include <algorithm>
#include <limits>

#include "webapi/APIValidator.h"
#include "webapi/Json.h"

namespace ZOVA {

namespace {

constexpr double kMargin = std::numeric_limits<double>::epsilon();

template <class T>
bool Equals(const APIParameter<T>& parameter, const T& value) {
    return !parameter.IsInvalid() && parameter.Get() == value;
}

template <class T>
bool LiesWithin(const APIParameter<T>& parameter, T low, T high) {
    return !parameter.IsInvalid() && low <= parameter.Get() && parameter.Get() <= high;
}

template <class T>
bool LiesAbove(const APIParameter<T>& parameter, T limit) {
    return !parameter.IsInvalid() && parameter.Get() > limit;
}

template <class T>
bool LiesBelow(const APIParameter<T>& parameter, T limit) {
    return !parameter.IsInvalid() && parameter.Get() < limit;
}

bool Holds(const Json::Value& list, const Json::Value& element) {
    return Json::searchArrayIndex(list, element) != Json::Value::maxUInt;
}

}  // namespace

// ---- equal ----

bool APIValidator::IsEqual(const APIParameter<int>& parameter, const int& value) {
    return Equals(parameter, value);
}

bool APIValidator::IsEqual(const APIParameter<long long>& parameter, const long long& value) {
    return Equals(parameter, value);
}

bool APIValidator::IsEqual(const APIParameter<unsigned int>& parameter, const unsigned int& value) {
    return Equals(parameter, value);
}

bool APIValidator::IsEqual(const APIParameter<unsigned long long>& parameter, const unsigned long long& value) {
    return Equals(parameter, value);
}

bool APIValidator::IsEqual(const APIParameter<bool>& parameter, const bool& value) {
    return Equals(parameter, value);
}

bool APIValidator::IsEqual(const APIParameter<std::string>& parameter, const std::string& value) {
    return Equals(parameter, value);
}

bool APIValidator::IsEqual(const APIParameter<Json::Value>& parameter, const Json::Value& value) {
    return Equals(parameter, value);
}

bool APIValidator::IsEqual(const APIParameter<std::string>& parameter, const char* value) {
    return value != nullptr && Equals(parameter, std::string(value));
}

bool APIValidator::IsEqual(const APIParameter<double>& parameter, const double& value) {
    const double difference = parameter.Get() - value;
    return !parameter.IsInvalid() && difference <= kMargin && difference >= -kMargin;
}

// ---- one of many ----

bool APIValidator::IsBelong(const APIParameter<std::string>& parameter, const Json::Value& list) {
    return !parameter.IsInvalid() && Holds(list, Json::Value(parameter.Get()));
}

bool APIValidator::IsBelong(const APIParameter<Json::Value>& parameter, const Json::Value& list) {
    const Json::Value& elements = parameter.Get();
    if (parameter.IsInvalid() || !Json::isArray(list) || !(Json::isArray(elements) || Json::isObject(elements))) {
        return false;
    }
    return std::all_of(elements.begin(), elements.end(),
                       [&list](const Json::Value& element) { return Holds(list, element); });
}

// ---- between: integers with both ends, real numbers without ----

bool APIValidator::IsBetween(const APIParameter<int>& parameter, int low, int high) {
    return LiesWithin(parameter, low, high);
}

bool APIValidator::IsBetween(const APIParameter<unsigned int>& parameter, unsigned int low, unsigned int high) {
    return LiesWithin(parameter, low, high);
}

bool APIValidator::IsBetween(const APIParameter<long long>& parameter, long long low, long long high) {
    return LiesWithin(parameter, low, high);
}

bool APIValidator::IsBetween(const APIParameter<unsigned long long>& parameter, unsigned long long low,
                             unsigned long long high) {
    return LiesWithin(parameter, low, high);
}

bool APIValidator::IsBetween(const APIParameter<double>& parameter, double low, double high) {
    return IsGreater(parameter, low) && IsLess(parameter, high);
}

// ---- above ----

bool APIValidator::IsGreater(const APIParameter<int>& parameter, int limit) {
    return LiesAbove(parameter, limit);
}

bool APIValidator::IsGreater(const APIParameter<unsigned int>& parameter, unsigned int limit) {
    return LiesAbove(parameter, limit);
}

bool APIValidator::IsGreater(const APIParameter<long long>& parameter, long long limit) {
    return LiesAbove(parameter, limit);
}

bool APIValidator::IsGreater(const APIParameter<unsigned long long>& parameter, unsigned long long limit) {
    return LiesAbove(parameter, limit);
}

bool APIValidator::IsGreater(const APIParameter<double>& parameter, double limit) {
    return !parameter.IsInvalid() && parameter.Get() - limit > kMargin;
}

// ---- below ----

bool APIValidator::IsLess(const APIParameter<int>& parameter, int limit) {
    return LiesBelow(parameter, limit);
}

bool APIValidator::IsLess(const APIParameter<unsigned int>& parameter, unsigned int limit) {
    return LiesBelow(parameter, limit);
}

bool APIValidator::IsLess(const APIParameter<long long>& parameter, long long limit) {
    return LiesBelow(parameter, limit);
}

bool APIValidator::IsLess(const APIParameter<unsigned long long>& parameter, unsigned long long limit) {
    return LiesBelow(parameter, limit);
}

bool APIValidator::IsLess(const APIParameter<double>& parameter, double limit) {
    return !parameter.IsInvalid() && parameter.Get() - limit < -kMargin;
}

}  // namespace ZOVA
