#include "envelope/APIRequestPrivate.h"
#include "webapi/APIParameter.h"
#include "webapi/APIRequest.h"
#include "webapi/Json.h"

namespace ZOVA {

// ---- from the request ----

template <class T>
APIParameter<T> APIRequestPrivate::GetAndCheckParam(const std::string& key, bool required, Json::ValueType type,
                                                    typename APIParameter<T>::Validator validator) const {
    APIParameter<T> parameter;
    if (!HasData("param", key)) {
        if (required) {
            parameter.MarkInvalid();
        }
        return parameter;
    }
    const Json::Value none;
    parameter.CheckValueTypeAndGet(GetData("param", key, none), type, validator);
    return parameter;
}

APIParameter<Json::Value> APIRequestPrivate::GetAndCheckUnitArrayParam(
    const std::string& key, bool required, APIParameter<Json::Value>::Validator validator) const {
    const Json::Value none;
    const Json::Value& value = GetData("param", key, none);
    if (!HasData("param", key) || Json::isArray(value)) {
        return GetAndCheckParam<Json::Value>(key, required, Json::arrayValue, validator);
    }
    Json::Value array(Json::arrayValue);
    array.append(value);
    APIParameter<Json::Value> parameter;
    parameter.CheckValueTypeAndGet(array, Json::arrayValue, validator);
    return parameter;
}

APIParameter<int> APIRequest::GetAndCheckInt(const std::string& key, PARAM_NECESSITY necessity,
                                             APIParameter<int>::Validator validator) const {
    return d->GetAndCheckParam<int>(key, necessity == PARAM_REQUIRED, Json::intValue, validator);
}

APIParameter<bool> APIRequest::GetAndCheckBool(const std::string& key, PARAM_NECESSITY necessity,
                                               APIParameter<bool>::Validator validator) const {
    return d->GetAndCheckParam<bool>(key, necessity == PARAM_REQUIRED, Json::booleanValue, validator);
}

APIParameter<double> APIRequest::GetAndCheckReal(const std::string& key, PARAM_NECESSITY necessity,
                                                 APIParameter<double>::Validator validator) const {
    return d->GetAndCheckParam<double>(key, necessity == PARAM_REQUIRED, Json::realValue, validator);
}

APIParameter<std::string> APIRequest::GetAndCheckString(const std::string& key, PARAM_NECESSITY necessity,
                                                        APIParameter<std::string>::Validator validator) const {
    return d->GetAndCheckParam<std::string>(key, necessity == PARAM_REQUIRED, Json::stringValue, validator);
}

APIParameter<Json::Value> APIRequest::GetAndCheckArray(const std::string& key, PARAM_NECESSITY necessity,
                                                       APIParameter<Json::Value>::Validator validator) const {
    return d->GetAndCheckParam<Json::Value>(key, necessity == PARAM_REQUIRED, Json::arrayValue, validator);
}

APIParameter<Json::Value> APIRequest::GetAndCheckObject(const std::string& key, PARAM_NECESSITY necessity,
                                                        APIParameter<Json::Value>::Validator validator) const {
    return d->GetAndCheckParam<Json::Value>(key, necessity == PARAM_REQUIRED, Json::objectValue, validator);
}

template <class T>
APIParameter<T> APIRequest::GetAndCheckIntegral(const std::string& key, PARAM_NECESSITY necessity,
                                                typename APIParameter<T>::Validator validator) const {
    return d->GetAndCheckParam<T>(key, necessity == PARAM_REQUIRED, Json::objectValue, validator);
}

template APIParameter<long long> APIRequest::GetAndCheckIntegral<long long>(const std::string&, PARAM_NECESSITY,
                                                                            APIParameter<long long>::Validator) const;
template APIParameter<unsigned int> APIRequest::GetAndCheckIntegral<unsigned int>(
    const std::string&, PARAM_NECESSITY, APIParameter<unsigned int>::Validator) const;
template APIParameter<unsigned long long> APIRequest::GetAndCheckIntegral<unsigned long long>(
    const std::string&, PARAM_NECESSITY, APIParameter<unsigned long long>::Validator) const;

APIParameter<Json::Value> APIRequest::GetAndCheckUnitArray(const std::string& key, PARAM_NECESSITY necessity,
                                                           APIParameter<Json::Value>::Validator validator) const {
    return d->GetAndCheckUnitArrayParam(key, necessity == PARAM_REQUIRED, validator);
}

// ---- from any JSON object ----

namespace {

template <class T>
APIParameter<T> ParameterFromJson(const Json::Value& json, const std::string& key, PARAM_NECESSITY necessity,
                                  Json::ValueType type, typename APIParameter<T>::Validator validator) {
    APIParameter<T> parameter;
    if (Json::hasMember(json, key)) {
        parameter.CheckValueTypeAndGet(Json::member(json, key), type, validator);
    } else if (!Json::isObject(json) || necessity == PARAM_REQUIRED) {
        parameter.MarkInvalid();
    }
    return parameter;
}

}  // namespace

template <class T>
APIParameter<T> APIParameterFactoryBasicImpl<T>::FromJson(const Json::Value& json, const std::string& key,
                                                          PARAM_NECESSITY necessity,
                                                          typename APIParameter<T>::Validator validator) {
    return ParameterFromJson<T>(json, key, necessity, Json::nullValue, validator);
}

template class APIParameterFactoryBasicImpl<int>;
template class APIParameterFactoryBasicImpl<long long>;
template class APIParameterFactoryBasicImpl<unsigned int>;
template class APIParameterFactoryBasicImpl<unsigned long long>;
template class APIParameterFactoryBasicImpl<bool>;
template class APIParameterFactoryBasicImpl<double>;
template class APIParameterFactoryBasicImpl<std::string>;

APIParameter<Json::Value> APIParameterFactory::ArrayFromJson(const Json::Value& json, const std::string& key,
                                                             PARAM_NECESSITY necessity,
                                                             APIParameter<Json::Value>::Validator validator) {
    return ParameterFromJson<Json::Value>(json, key, necessity, Json::arrayValue, validator);
}

APIParameter<Json::Value> APIParameterFactory::ObjectFromJson(const Json::Value& json, const std::string& key,
                                                              PARAM_NECESSITY necessity,
                                                              APIParameter<Json::Value>::Validator validator) {
    return ParameterFromJson<Json::Value>(json, key, necessity, Json::objectValue, validator);
}

}  // namespace ZOVA
