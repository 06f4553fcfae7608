#pragma once

#include <json/value.h>
#include <sys/types.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace reference {

constexpr int64_t kShortestTokenTime = 60;
constexpr int64_t kLongestTokenTime = int64_t{10} * 365 * 86400;
constexpr size_t kLongestTokenLabel = 128;
/** Largest text of a record, in bytes. */
constexpr size_t kLargestTokenRecord = 16384;
constexpr size_t kTokenIdDigits = 32;

/** An API that a token may call. */
struct TokenScope {
    std::string api;
    /** Empty: all methods. */
    std::vector<std::string> methods;
};

/** What the store keeps of a token. */
struct TokenRecord {
    std::string id;
    std::string user;
    uid_t uid = 0;
    std::string label;
    /** Seconds since the epoch. */
    int64_t created = 0;
    int64_t expires = 0;
    std::vector<TokenScope> apis;

    /**
     * Whether the token has not expired. One that seems to be from the future, a few minutes aside, has: the clock was
     * put back, and nothing is known of how old the token is.
     */
    bool IsInForce(int64_t now) const;

    /** Whether the token may call the method. Names are compared as a whole. */
    bool Covers(std::string_view api, std::string_view method) const;
};

bool IsTokenId(std::string_view text);
bool IsTokenLabel(std::string_view text);

/**
 * Reads a list of APIs. No token may call the APIs that open sessions or make tokens, nor a batch, of which the gate
 * asks only once for all its entries.
 * @return false unless all of it is good; `scopes` is then left alone.
 */
bool ParseTokenScopes(const Json::Value& apis, std::vector<TokenScope>& scopes);

Json::Value TokenScopesJson(const std::vector<TokenScope>& scopes);

/** Reads the text of a record. Never throws. False, with `record` left alone, unless all members are good. */
bool ParseTokenRecord(std::string_view text, TokenRecord& record);

std::string WriteTokenRecord(const TokenRecord& record);

}  // namespace reference
