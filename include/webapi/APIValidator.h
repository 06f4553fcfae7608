#pragma once

#include <json/value.h>

#include <string>

#include "APIParameter.h"
#include "Export.h"

namespace ZOVA {

class APIValidatorPrivate;

/**
 * Checks of what web parameters commonly are, for methods to call, or to pass to `APIRequest::GetAndCheckString` and
 * the like as its validator. All functions are static and none throws; only a broken pattern is logged.
 *
 * The checks of a text refuse one that holds a NUL byte, since what stands behind it would go unseen. Those that match
 * a pattern also refuse a text of more than 65536 bytes. They take a time in proportion to the length of the text.
 *
 * The compiled patterns are kept in one object for the life of the process. Making that object is safe from any
 * thread; the first use of each pattern is not.
 */
class WEBAPI_EXPORT APIValidator {
public:
    APIValidator(const APIValidator&) = delete;
    APIValidator& operator=(const APIValidator&) = delete;
    ~APIValidator() = delete;

    /** The one object, made at the first call and never destroyed; null if there is no memory for it. */
    static APIValidator* GetInstance();

    /**
     * Whether the text matches the POSIX extended expression `pattern`, which is compiled once and then known by its
     * address: it has to be a literal, and never a client's, since an expression can take any time and stack.
     * @return false as well for null and for a broken pattern, which is logged each time as an error.
     */
    static bool CheckRegex(const std::string& text, const char* pattern);

    // ---- plain values; the empty text is refused by all ----

    /** What the system takes for the name of a host. */
    static bool IsHostname(const std::string& text);
    /** What the system takes for the name of a domain. */
    static bool IsDomain(const std::string& text);
    /** The text of an IPv4 or IPv6 address, without port, brackets or zone. */
    static bool IsIP(const std::string& text);
    static bool IsIPv4(const std::string& text);
    static bool IsIPv6(const std::string& text);
    /** 0 to 65535. */
    static bool IsPort(const int& port);
    /**
     * Common characters on both sides of an "@", which may itself be one of them: a mere check of form. Passed are also
     * semicolons, quotes, backslashes and angle brackets. The text is not safe in a header or a command line.
     */
    static bool IsEMail(const std::string& text);
    /** A letter, then up to 254 letters, digits, "_" and "-". */
    static bool IsNetbios(const std::string& text);
    /** Any text but one made of `][;:"<>*+\/|?,` alone. A good character beside forbidden ones is enough. */
    static bool IsWorkGroup(const std::string& text);
    /** Digits only. */
    static bool IsDigit(const std::string& text);
    /** Letters, digits and "-". */
    static bool IsTetherLinkId(const std::string& text);

    // ---- filled parameters: false if invalid; an absent optional one is compared by its start value ----

    /** Whether the value is the same; of `double`, up to 2^-52 apart whatever its size. */
    static bool IsEqual(const APIParameter<int>& parameter, const int& value);
    static bool IsEqual(const APIParameter<long long>& parameter, const long long& value);
    static bool IsEqual(const APIParameter<unsigned int>& parameter, const unsigned int& value);
    static bool IsEqual(const APIParameter<unsigned long long>& parameter, const unsigned long long& value);
    static bool IsEqual(const APIParameter<bool>& parameter, const bool& value);
    static bool IsEqual(const APIParameter<double>& parameter, const double& value);
    static bool IsEqual(const APIParameter<std::string>& parameter, const std::string& value);
    /** `value` must not be null. */
    static bool IsEqual(const APIParameter<std::string>& parameter, const char* value);
    /** The JSON library tells a signed number from an unsigned one: 1 is not equal to 1U. */
    static bool IsEqual(const APIParameter<Json::Value>& parameter, const Json::Value& value);

    /** Whether the array `list` holds the text; false if `list` is no array. */
    static bool IsBelong(const APIParameter<std::string>& parameter, const Json::Value& list);
    /**
     * Whether the array `list` holds every element of the array, or value of the object, in the parameter: true for an
     * empty one, also for null. False if `list` is no array (null is an empty one), or the parameter a single value.
     */
    static bool IsBelong(const APIParameter<Json::Value>& parameter, const Json::Value& list);

    /** Whether the value lies between the ends, both included; of `double`, both excluded, by more than 2^-52. */
    static bool IsBetween(const APIParameter<int>& parameter, int low, int high);
    static bool IsBetween(const APIParameter<unsigned int>& parameter, unsigned int low, unsigned int high);
    static bool IsBetween(const APIParameter<long long>& parameter, long long low, long long high);
    static bool IsBetween(const APIParameter<unsigned long long>& parameter, unsigned long long low,
                          unsigned long long high);
    static bool IsBetween(const APIParameter<double>& parameter, double low, double high);

    /** Whether the value lies above; of `double`, by more than 2^-52. */
    static bool IsGreater(const APIParameter<int>& parameter, int limit);
    static bool IsGreater(const APIParameter<unsigned int>& parameter, unsigned int limit);
    static bool IsGreater(const APIParameter<long long>& parameter, long long limit);
    static bool IsGreater(const APIParameter<unsigned long long>& parameter, unsigned long long limit);
    static bool IsGreater(const APIParameter<double>& parameter, double limit);

    /** Whether the value lies below; of `double`, by more than 2^-52. */
    static bool IsLess(const APIParameter<int>& parameter, int limit);
    static bool IsLess(const APIParameter<unsigned int>& parameter, unsigned int limit);
    static bool IsLess(const APIParameter<long long>& parameter, long long limit);
    static bool IsLess(const APIParameter<unsigned long long>& parameter, unsigned long long limit);
    static bool IsLess(const APIParameter<double>& parameter, double limit);

private:
    WEBAPI_LOCAL explicit APIValidator(APIValidatorPrivate* patterns);

    APIValidatorPrivate* d;
};

}  // namespace ZOVA
