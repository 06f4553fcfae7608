#include "zovacredential/PeerTable.h"

#include <algorithm>
#include <initializer_list>

#include "Paths.h"
#include "common/Accounts.h"
#include "common/Base64.h"
#include "common/Files.h"
#include "common/JsonText.h"
#include "common/NetAddress.h"

namespace reference {

namespace {

constexpr size_t kLargestTable = 1024 * 1024;
constexpr size_t kLargestAuthority = 1024 * 1024;
constexpr size_t kLongestHost = 253;
constexpr size_t kLongestPath = 1024;
constexpr size_t kTokenDigits = 64;
constexpr size_t kDigestSize = 32;
constexpr int kDefaultPort = 443;
constexpr int kHighestPort = 65535;
constexpr const char* kDefaultPath = "/webapi/front.cgi";
constexpr std::string_view kPinKind = "sha256//";

constexpr std::string_view kLetters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-.";

/** Whether it is an object that has no other members than these: a misspelt check must not be passed over. */
bool HasOnly(const Json::Value& object, std::initializer_list<const char*> names) {
    if (!object.isObject()) {
        return false;
    }
    const Json::Value::Members members = object.getMemberNames();
    return std::all_of(members.begin(), members.end(), [&](const std::string& member) {
        return std::any_of(names.begin(), names.end(), [&](const char* name) { return member == name; });
    });
}

/** An address as it stands in an URL; "" for what is none. */
std::string AddressInUrl(const std::string& text) {
    if (text.find_first_not_of("0123456789abcdefABCDEF.:") != std::string::npos || !NetAddress::Parse(text)) {
        return "";
    }
    return text.find(':') != std::string::npos ? "[" + text + "]" : text;
}

bool IsHostName(std::string_view text) {
    return !text.empty() && text.size() <= kLongestHost && text.front() != '-' && text.front() != '.' &&
           text.find_first_not_of(kLetters) == std::string_view::npos;
}

bool IsPath(std::string_view text) {
    constexpr std::string_view kMore = "/_~";
    return !text.empty() && text.front() == '/' && text.size() <= kLongestPath &&
           std::all_of(text.begin(), text.end(), [&](char byte) {
               return kLetters.find(byte) != std::string_view::npos || kMore.find(byte) != std::string_view::npos;
           });
}

bool IsPin(std::string_view text) {
    std::string digest;
    return text.substr(0, kPinKind.size()) == kPinKind && text.find_first_of("-_") == std::string_view::npos &&
           text.back() == '=' && Base64Decode(text.substr(kPinKind.size()), Base64Alphabet::kAny, digest) &&
           digest.size() == kDigestSize;
}

bool IsToken(std::string_view text) {
    return text.size() == kTokenDigits && text.find_first_not_of("0123456789abcdef") == std::string_view::npos;
}

/** The text under `name`, `fallback` without one; false if something else stands there. */
bool TakeText(const Json::Value& record, const char* name, const char* fallback, std::string& out) {
    out = fallback;
    if (!record.isMember(name)) {
        return true;
    }
    out = JsonTextMember(record, name);
    return !out.empty();
}

bool TakePlace(const Json::Value& record, Peer& peer) {
    std::string host;
    std::string address;
    std::string path;
    const Json::Value port = record.get("port", kDefaultPort);
    if (!TakeText(record, "host", "", host) || !TakeText(record, "address", "", address) ||
        !TakeText(record, "path", kDefaultPath, path) || !IsPath(path) || !port.isInt() || port.asInt() < 1 ||
        port.asInt() > kHighestPort) {
        return false;
    }
    const std::string place = AddressInUrl(host);
    if (place.empty() && !IsHostName(host)) {
        return false;
    }
    peer.url = "https://" + (place.empty() ? host : place) + ":" + std::to_string(port.asInt()) + path;
    if (!address.empty()) {
        address = AddressInUrl(address);
        peer.connectTo = "::" + address + ":";
        return !address.empty();
    }
    return true;
}

/** Pin, authority or both, but not neither. */
bool TakeTrust(const Json::Value& record, Peer& peer) {
    std::string file;
    if (!TakeText(record, "pin", "", peer.pin) || (!peer.pin.empty() && !IsPin(peer.pin)) ||
        !TakeText(record, "ca_file", "", file)) {
        return false;
    }
    if (file.empty()) {
        return !peer.pin.empty();
    }
    return file.front() == '/' && file.find('\0') == std::string::npos &&
           ReadFile(file.c_str(), kLargestAuthority, FileTrust::kRootOnlyWrites, peer.authority) == ReadResult::kGood &&
           !peer.authority.empty();
}

/** The user's token in a list of users. An account that came under the name later has none. */
RelayError TakeToken(const Json::Value& users, const std::string& user, Peer& peer) {
    if (!users.isObject()) {
        return RelayError::kBadRecord;
    }
    if (user.empty() || !users.isMember(user)) {
        return RelayError::kNoCredential;
    }
    const Json::Value& entry = users[user];
    peer.token.text = JsonTextMember(entry, "token");
    if (!HasOnly(entry, {"uid", "token"}) || !entry.isMember("uid") || !entry["uid"].isUInt() ||
        !IsToken(peer.token.text)) {
        return RelayError::kBadRecord;
    }
    return IsInForce(user, entry["uid"].asUInt()) ? RelayError::kNone : RelayError::kNoCredential;
}

}  // namespace

bool ParsePeer(const Json::Value& record, Peer& peer) {
    return HasOnly(record, {"host", "port", "path", "address", "pin", "ca_file", "users"}) && TakePlace(record, peer) &&
           TakeTrust(record, peer);
}

RelayError FindPeer(long number, const std::string& user, Peer& peer) {
    Json::Value table;
    if (ReadJson(paths::kPeers, kLargestTable, FileTrust::kRootOnly, table) != ReadResult::kGood ||
        !HasOnly(table, {"peers"}) || !table.isMember("peers") || !table["peers"].isObject()) {
        return RelayError::kNoTable;
    }
    const std::string name = std::to_string(number);
    if (!table["peers"].isMember(name)) {
        return RelayError::kUnknownPeer;
    }
    const Json::Value& record = table["peers"][name];
    if (!ParsePeer(record, peer)) {
        return RelayError::kBadRecord;
    }
    return TakeToken(record["users"], user, peer);
}

}  // namespace reference
