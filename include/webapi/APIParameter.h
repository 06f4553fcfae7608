#pragma once

#include <json/value.h>

#include <string>

#include "Export.h"

namespace ZOVA {

template <class T>
struct APIParameterPrivate;

/** What an absent parameter means. Every value but PARAM_REQUIRED acts as optional. */
enum PARAM_NECESSITY : int { PARAM_REQUIRED = 0, PARAM_OPTIONAL = 1 };

/**
 * A parameter as a method asked for it: its value, and whether it was there (`IsSet`), was sent as null to be cleared
 * (`IsReset`), cannot be used (`IsInvalid`) or is a default (`IsDefault`).
 *
 *     situation                                   set    reset  invalid  value
 *     absent, optional                            false  false  false    start value
 *     absent, required                            false  false  true     start value
 *     null                                        true   true   false    start value
 *     wrong type or out of range                  true   false  true     start value
 *     refused by the validator                    true   false  true     parsed value
 *     good                                        true   false  false    parsed value
 *     absent, optional, then SetDefault(v)        true   false  false    v
 *
 * The start value is 0, false, "" or null. T is one of `int`, `long long`, `unsigned int`, `unsigned long long`,
 * `bool`, `double`, `std::string` and `Json::Value`. Nothing here throws, logs or touches a response: the method looks
 * at the flags and decides. No type converts from a text; a "5" is no number.
 */
template <class T>
class WEBAPI_EXPORT APIParameter {
public:
    /** Called with a value of the right type; false makes the parameter invalid. Null: no further test. */
    using Validator = bool (*)(const T&);

    /** Start value, no flag set. */
    APIParameter();
    /** Copies carry value and flags. */
    APIParameter(const APIParameter& other);
    APIParameter& operator=(const APIParameter& other);
    ~APIParameter();

    /** The value, whatever the flags say. */
    const T& Get() const;
    /** The value if set and not invalid, otherwise `fallback`. A reset parameter gives its start value. */
    const T& Get(const T& fallback) const;

    /** The name was there, or a default was taken. */
    bool IsSet() const;
    /** The client sent null: it asks to clear. */
    bool IsReset() const;
    /** Required and missing, of the wrong type, out of range, or refused by the validator. */
    bool IsInvalid() const;
    /** The value came from `SetDefault`. */
    bool IsDefault() const;

    /** Each sets its one flag and no other. */
    void MarkSet();
    void MarkReset();
    void MarkInvalid();
    void MarkDefault();

    /**
     * Takes `value` if the parameter is neither set nor invalid, and marks it set and default.
     * @return false if the parameter is invalid; nothing changes then, nor if it was set.
     */
    bool SetDefault(const T& value);

    /** Comparisons look at the values only, not at the flags. */
    bool operator==(const T& other) const;
    bool operator!=(const T& other) const;
    bool operator==(const APIParameter& other) const;
    bool operator!=(const APIParameter& other) const;

    /** Fills the parameter from a JSON value that is there; see the table above. */
    void CheckValueTypeAndGet(const Json::Value& value, Json::ValueType type, Validator validator);

    /**
     * Takes the value if it has the right type and range. `type` counts for `Json::Value` only.
     * @return false on refusal; the value held before then stays.
     */
    bool ParseValue(const Json::Value& value, Json::ValueType type);

private:
    APIParameterPrivate<T>* d;
};

extern template class APIParameter<int>;
extern template class APIParameter<long long>;
extern template class APIParameter<unsigned int>;
extern template class APIParameter<unsigned long long>;
extern template class APIParameter<bool>;
extern template class APIParameter<double>;
extern template class APIParameter<std::string>;
// Said once more: the JSON library leaves its types to the visibility of whoever includes it, and an instance is no
// more visible than its argument.
extern template class WEBAPI_EXPORT APIParameter<Json::Value>;

/**
 * Parameters from a JSON object that did not come from a request. Where `json` is no object the parameter is invalid,
 * whatever the necessity; null counts as an object that holds nothing.
 */
template <class T>
class WEBAPI_EXPORT APIParameterFactoryBasicImpl {
public:
    /** The member `key` of `json` as the class says; `validator` may be null. */
    static APIParameter<T> FromJson(const Json::Value& json, const std::string& key, PARAM_NECESSITY necessity,
                                    typename APIParameter<T>::Validator validator = nullptr);
};

extern template class APIParameterFactoryBasicImpl<int>;
extern template class APIParameterFactoryBasicImpl<long long>;
extern template class APIParameterFactoryBasicImpl<unsigned int>;
extern template class APIParameterFactoryBasicImpl<unsigned long long>;
extern template class APIParameterFactoryBasicImpl<bool>;
extern template class APIParameterFactoryBasicImpl<double>;
extern template class APIParameterFactoryBasicImpl<std::string>;

/** As `APIParameterFactoryBasicImpl`, for arrays and objects. */
class WEBAPI_EXPORT APIParameterFactory {
public:
    /** The member `key` if it is an array. */
    static APIParameter<Json::Value> ArrayFromJson(const Json::Value& json, const std::string& key,
                                                   PARAM_NECESSITY necessity,
                                                   APIParameter<Json::Value>::Validator validator = nullptr);
    /** The member `key` if it is an object. */
    static APIParameter<Json::Value> ObjectFromJson(const Json::Value& json, const std::string& key,
                                                    PARAM_NECESSITY necessity,
                                                    APIParameter<Json::Value>::Validator validator = nullptr);
};

}  // namespace ZOVA
