#include "zovasharing/Link.h"

#include <algorithm>

#include "common/Accounts.h"
#include "common/NetAddress.h"

namespace reference::sharing {

namespace {

/** How far the clock may be put back without an effect on links, in seconds. */
constexpr int64_t kClockCorrection = 300;

}  // namespace

bool Link::IsOpen(int64_t now) const {
    return enabled && (expires == 0 || now < expires) && created <= now + kClockCorrection &&
           IsInForce(entry.ownerName, entry.ownerUid);
}

bool Link::NeedsSession() const {
    return entry.protectType != ZOVA::sharing::record::PROTECT_NONE || entry.matchIp || visitLimit != 0;
}

bool Link::AllowsAddress(std::string_view address) const {
    if (addresses.empty()) {
        return true;
    }
    const auto parsed = NetAddress::Parse(address);
    return parsed && IsInNetworkList(*parsed, addresses);
}

bool Link::AllowsUser(const std::string& name) const {
    return std::find(users.begin(), users.end(), name) != users.end();
}

bool IsHash(std::string_view text) {
    return text.size() == kHashDigits && text.find_first_not_of("0123456789abcdef") == std::string_view::npos;
}

std::optional<std::vector<std::string>> ParseTexts(const Json::Value& value) {
    if (!value.isArray()) {
        return std::nullopt;
    }
    std::vector<std::string> texts;
    for (const Json::Value& text : value) {
        if (!text.isString()) {
            return std::nullopt;
        }
        texts.push_back(text.asString());
    }
    return texts;
}

Json::Value TextsJson(const std::vector<std::string>& texts) {
    Json::Value value(Json::arrayValue);
    for (const std::string& text : texts) {
        value.append(text);
    }
    return value;
}

}  // namespace reference::sharing
