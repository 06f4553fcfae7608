#include "webapi/APIParameter.h"

#include <limits>

#include "request/ParameterPrivate.h"
#include "webapi/Json.h"

namespace ZOVA {

namespace {

// What each type takes. The 64-bit questions of the JSON library cover the whole range of every integer type.

bool Take(const Json::Value& value, Json::ValueType, int& out) {
    if (!value.isInt64() || value.asInt64() < std::numeric_limits<int>::min() ||
        value.asInt64() > std::numeric_limits<int>::max()) {
        return false;
    }
    out = static_cast<int>(value.asInt64());
    return true;
}

bool Take(const Json::Value& value, Json::ValueType, long long& out) {
    if (!value.isInt64()) {
        return false;
    }
    out = value.asInt64();
    return true;
}

bool Take(const Json::Value& value, Json::ValueType, unsigned int& out) {
    if (!value.isUInt64() || value.asUInt64() > std::numeric_limits<unsigned int>::max()) {
        return false;
    }
    out = static_cast<unsigned int>(value.asUInt64());
    return true;
}

bool Take(const Json::Value& value, Json::ValueType, unsigned long long& out) {
    if (!value.isUInt64()) {
        return false;
    }
    out = value.asUInt64();
    return true;
}

bool Take(const Json::Value& value, Json::ValueType, bool& out) {
    if (!value.isBool()) {
        return false;
    }
    out = value.asBool();
    return true;
}

bool Take(const Json::Value& value, Json::ValueType, double& out) {
    if (!value.isNumeric()) {
        return false;
    }
    out = value.asDouble();
    return true;
}

bool Take(const Json::Value& value, Json::ValueType, std::string& out) {
    if (!value.isString()) {
        return false;
    }
    out = Json::asString(value);
    return true;
}

bool Take(const Json::Value& value, Json::ValueType type, Json::Value& out) {
    if (value.type() != type) {
        return false;
    }
    out = value;
    return true;
}

}  // namespace

template <class T>
APIParameter<T>::APIParameter() : d(new APIParameterPrivate<T>()) {}

template <class T>
APIParameter<T>::APIParameter(const APIParameter& other) : d(new APIParameterPrivate<T>(*other.d)) {}

template <class T>
APIParameter<T>& APIParameter<T>::operator=(const APIParameter& other) {
    *d = *other.d;
    return *this;
}

template <class T>
APIParameter<T>::~APIParameter() {
    delete d;
}

template <class T>
const T& APIParameter<T>::Get() const {
    return d->value;
}

template <class T>
const T& APIParameter<T>::Get(const T& fallback) const {
    return d->set && !d->invalid ? d->value : fallback;
}

template <class T>
bool APIParameter<T>::IsSet() const {
    return d->set;
}

template <class T>
bool APIParameter<T>::IsReset() const {
    return d->reset;
}

template <class T>
bool APIParameter<T>::IsInvalid() const {
    return d->invalid;
}

template <class T>
bool APIParameter<T>::IsDefault() const {
    return d->isDefault;
}

template <class T>
void APIParameter<T>::MarkSet() {
    d->set = true;
}

template <class T>
void APIParameter<T>::MarkReset() {
    d->reset = true;
}

template <class T>
void APIParameter<T>::MarkInvalid() {
    d->invalid = true;
}

template <class T>
void APIParameter<T>::MarkDefault() {
    d->isDefault = true;
}

template <class T>
bool APIParameter<T>::SetDefault(const T& value) {
    if (d->invalid) {
        return false;
    }
    if (!d->set) {
        d->value = value;
        d->set = true;
        d->isDefault = true;
    }
    return true;
}

template <class T>
bool APIParameter<T>::operator==(const T& other) const {
    return d->value == other;
}

template <class T>
bool APIParameter<T>::operator!=(const T& other) const {
    return !(d->value == other);
}

template <class T>
bool APIParameter<T>::operator==(const APIParameter& other) const {
    return d->value == other.d->value;
}

template <class T>
bool APIParameter<T>::operator!=(const APIParameter& other) const {
    return !(d->value == other.d->value);
}

template <class T>
void APIParameter<T>::CheckValueTypeAndGet(const Json::Value& value, Json::ValueType type, Validator validator) {
    d->set = true;
    if (value.isNull()) {
        d->reset = true;
        return;
    }
    if (!ParseValue(value, type) || (validator != nullptr && !validator(d->value))) {
        d->invalid = true;
    }
}

template <class T>
bool APIParameter<T>::ParseValue(const Json::Value& value, Json::ValueType type) {
    return Take(value, type, d->value);
}

template class APIParameter<int>;
template class APIParameter<long long>;
template class APIParameter<unsigned int>;
template class APIParameter<unsigned long long>;
template class APIParameter<bool>;
template class APIParameter<double>;
template class APIParameter<std::string>;
template class APIParameter<Json::Value>;

}  // namespace ZOVA
