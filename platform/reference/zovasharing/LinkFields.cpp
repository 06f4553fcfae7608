#include "zovasharing/LinkFields.h"

#include <algorithm>
#include <iterator>

#include "common/Accounts.h"
#include "common/NetAddress.h"
#include "zovasharing/LinkPassword.h"
#include "zovasharing/SharedPath.h"

namespace reference::sharing {

namespace {

namespace record = ZOVA::sharing::record;

constexpr const char* kAccessFields[] = {"paths", "protect_type", "password", "users", "match_ip"};
constexpr const char* kOtherFields[] = {"addresses", "expires", "visit_limit", "enabled"};

bool IsOneOf(const std::string& name, const char* const* begin, const char* const* end) {
    return std::find(begin, end, name) != end;
}

bool AreKnown(const Json::Value& fields, bool changes) {
    const std::vector<std::string> names = fields.getMemberNames();
    return std::all_of(names.begin(), names.end(), [&](const std::string& name) {
        return IsOneOf(name, std::begin(kAccessFields), std::end(kAccessFields)) ||
               IsOneOf(name, std::begin(kOtherFields), std::end(kOtherFields)) || (!changes && name == "project");
    });
}

bool TakeProject(const Json::Value& value, std::string& project) {
    constexpr const char* kBytes = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_-.";
    project = value.isString() ? value.asString() : "";
    return !project.empty() && project.size() <= kLongestProject && project.front() != '.' &&
           project.find_first_not_of(kBytes) == std::string::npos;
}

bool TakePaths(const Json::Value& value, Link& link) {
    const auto paths = ParseTexts(value);
    if (!paths || paths->empty() || paths->size() > kMostPaths) {
        return false;
    }
    link.entry.paths = *paths;
    return std::all_of(paths->begin(), paths->end(), [&](const std::string& path) {
        return IsPlainPath(path) && OpenOwned(path, link.entry.ownerUid).IsOpen();
    });
}

bool TakePassword(const Json::Value& value, Link& link) {
    const std::string password = value.isString() ? value.asString() : "";
    if (password.empty() || password.size() > kLongestLinkPassword || password.find('\0') != std::string::npos) {
        return false;
    }
    link.password = MakePasswordText(password);
    return true;
}

bool TakeUsers(const Json::Value& value, Link& link) {
    const auto users = ParseTexts(value);
    if (!users || users->empty() || users->size() > kMostUsers) {
        return false;
    }
    link.users = *users;
    return std::all_of(users->begin(), users->end(), [](const std::string& user) {
        const auto account = user.find('\0') == std::string::npos ? FindAccount(user.c_str()) : std::nullopt;
        return account && account->name == user && account->uid != 0;
    });
}

bool TakeProtection(const Json::Value& fields, Link& link) {
    if (fields.isMember("protect_type")) {
        const Json::Value& type = fields["protect_type"];
        if (!type.isInt() || type.asInt() < record::PROTECT_NONE || type.asInt() > record::PROTECT_USERS) {
            return false;
        }
        if (type.asInt() != link.entry.protectType) {
            link.password.clear();
            link.users.clear();
        }
        link.entry.protectType = type.asInt();
    }
    const bool byPassword = link.entry.protectType == record::PROTECT_PASSWORD;
    const bool byUsers = link.entry.protectType == record::PROTECT_USERS;
    if (fields.isMember("password") && (!byPassword || !TakePassword(fields["password"], link))) {
        return false;
    }
    if (fields.isMember("users") && (!byUsers || !TakeUsers(fields["users"], link))) {
        return false;
    }
    const bool passwordGiven = !link.password.empty() || fields.isMember("password");
    return (!byPassword || passwordGiven) && (!byUsers || !link.users.empty());
}

bool TakeAddresses(const Json::Value& fields, Link& link) {
    if (fields.isMember("match_ip")) {
        if (!fields["match_ip"].isBool()) {
            return false;
        }
        link.entry.matchIp = fields["match_ip"].asBool();
    }
    if (!fields.isMember("addresses")) {
        return true;
    }
    const auto addresses = ParseTexts(fields["addresses"]);
    link.addresses.clear();
    if (!addresses) {
        return false;
    }
    for (const std::string& network : *addresses) {
        const auto address = NetAddress::Parse(network.substr(0, network.find('/')));
        if (!address || !address->IsIn(network)) {
            return false;
        }
        link.addresses += (link.addresses.empty() ? "" : ",") + network;
    }
    return link.addresses.size() <= kLongestAddresses;
}

bool TakeNumber(const Json::Value& fields, const char* name, int64_t& out) {
    if (!fields.isMember(name)) {
        return true;
    }
    if (!fields[name].isInt64()) {
        return false;
    }
    out = fields[name].asInt64();
    return out >= 0;
}

bool TakeExpiry(const Json::Value& fields, int64_t now, Link& link) {
    return !fields.isMember("expires") ||
           (TakeNumber(fields, "expires", link.expires) &&
            (link.expires == 0 || (link.expires > now && link.expires - now <= kLongestLinkTime)));
}

Json::Value AddressesJson(const std::string& addresses) {
    Json::Value list(Json::arrayValue);
    for (size_t at = 0; at < addresses.size();) {
        const size_t end = std::min(addresses.find(',', at), addresses.size());
        list.append(addresses.substr(at, end - at));
        at = end + 1;
    }
    return list;
}

}  // namespace

int TakeLinkFields(const Json::Value& fields, bool changes, int64_t now, Link& link) {
    if (!fields.isObject() || !AreKnown(fields, changes)) {
        return ZOVA_LINK_BAD_FIELD;
    }
    if (!changes && !TakeProject(fields["project"], link.entry.projectName)) {
        return ZOVA_LINK_BAD_PROJECT;
    }
    if ((!changes || fields.isMember("paths")) && !TakePaths(fields["paths"], link)) {
        return ZOVA_LINK_BAD_PATHS;
    }
    if (!TakeAddresses(fields, link)) {
        return ZOVA_LINK_BAD_ADDRESSES;
    }
    if (!TakeExpiry(fields, now, link)) {
        return ZOVA_LINK_BAD_TIME;
    }
    if (!TakeNumber(fields, "visit_limit", link.visitLimit) || link.visitLimit > kMostVisits) {
        return ZOVA_LINK_BAD_LIMIT;
    }
    if (fields.isMember("enabled")) {
        if (!fields["enabled"].isBool()) {
            return ZOVA_LINK_BAD_FIELD;
        }
        link.enabled = fields["enabled"].asBool();
    }
    // Last, since a password takes its time.
    if (!TakeProtection(fields, link)) {
        return ZOVA_LINK_BAD_PROTECTION;
    }
    const bool hasPassword = link.entry.protectType != record::PROTECT_PASSWORD || !link.password.empty();
    return hasPassword ? ZOVA_LINK_OK : ZOVA_LINK_FAILED;
}

bool ChangeAccess(const Json::Value& fields) {
    return std::any_of(std::begin(kAccessFields), std::end(kAccessFields),
                       [&](const char* name) { return fields.isMember(name); });
}

Json::Value LinkJson(const Link& link) {
    Json::Value value(Json::objectValue);
    value["hash"] = link.entry.hash;
    value["project"] = link.entry.projectName;
    value["paths"] = TextsJson(link.entry.paths);
    value["protect_type"] = link.entry.protectType;
    value["users"] = TextsJson(link.users);
    value["addresses"] = AddressesJson(link.addresses);
    value["match_ip"] = link.entry.matchIp;
    value["created"] = Json::Int64(link.created);
    value["expires"] = Json::Int64(link.expires);
    value["visits"] = Json::Int64(link.visits);
    value["visit_limit"] = Json::Int64(link.visitLimit);
    value["enabled"] = link.enabled;
    return value;
}

}  // namespace reference::sharing
