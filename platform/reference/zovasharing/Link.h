#pragma once

#include <json/value.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Seam.h"

namespace reference::sharing {

constexpr size_t kHashDigits = 32;
constexpr size_t kMostPaths = 32;
constexpr size_t kLongestPath = 4095;
constexpr size_t kMostUsers = 64;
constexpr size_t kLongestProject = 64;
constexpr size_t kLongestAddresses = 1024;
constexpr size_t kLongestLinkPassword = 256;
constexpr int64_t kMostVisits = 1000000;
/** Furthest end of a link, in seconds from its making. */
constexpr int64_t kLongestLinkTime = int64_t{10} * 365 * 86400;

/** What the store keeps of a link. Times are seconds since the epoch. */
struct Link {
    ZOVA::sharing::record::Entry entry;
    /** Text of `MakePasswordText`, or "". */
    std::string password;
    std::vector<std::string> users;
    /** Networks separated by commas, or "" for every address. */
    std::string addresses;
    int64_t created = 0;
    /** 0: never. */
    int64_t expires = 0;
    int64_t visits = 0;
    /** 0: none. */
    int64_t visitLimit = 0;
    bool enabled = true;

    /** Whether the link serves anybody: switched on, not at its end, its owner's account still good. */
    bool IsOpen(int64_t now) const;
    bool IsUsedUp() const { return visitLimit != 0 && visits >= visitLimit; }
    /** Whether visitors need a session. A public link without conditions does not ask for one. */
    bool NeedsSession() const;
    bool AllowsAddress(std::string_view address) const;
    bool AllowsUser(const std::string& name) const;
};

bool IsHash(std::string_view text);

/** A JSON array of texts; nothing for anything else. */
std::optional<std::vector<std::string>> ParseTexts(const Json::Value& value);
Json::Value TextsJson(const std::vector<std::string>& texts);

}  // namespace reference::sharing
