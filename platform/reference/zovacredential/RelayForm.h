#pragma once

#include <json/value.h>

#include <string>

namespace reference {

/** A call of a peer's web API by name. */
struct RelayCall {
    std::string api;
    int version = 0;
    std::string method;
};

/**
 * The text that `TypedValue` reads back as the value: a string that would be read as another value is quoted, any other
 * stays as it is.
 */
std::string TypedText(const Json::Value& value);

/**
 * The form line that names the call in the name of the token's user. It holds nothing but letters, digits, "%", "&",
 * "=" and the bytes that `PercentEncode` leaves alone.
 */
std::string CallForm(const RelayCall& call, const std::string& token);

/**
 * The same with the parameters, but for those by which a web API takes credentials, deciphers or relays: the peer has
 * to act for the token's user and nobody else, and what travels is in clear text inside TLS.
 * @param params an object.
 */
std::string CallForm(const RelayCall& call, const std::string& token, const Json::Value& params);

}  // namespace reference
