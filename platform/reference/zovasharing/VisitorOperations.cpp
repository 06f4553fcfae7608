#include <syslog.h>

#include <algorithm>
#include <cstring>
#include <ctime>

#include "Seam.h"
#include "common/Accounts.h"
#include "common/NetAddress.h"
#include "login/LoginFailures.h"
#include "zovacgi/SessionId.h"
#include "zovasharing/LinkPassword.h"
#include "zovasharing/LinkStore.h"
#include "zovasharing/VisitorStore.h"

using namespace reference::sharing;
using reference::LoginFailures;
namespace record = ZOVA::sharing::record;

namespace {

/** Begins with a byte that no account's name may hold, so that a link's failures are never an account's. */
constexpr const char* kFailuresOfLinks = "\x01link:";

int CheckLinkPassword(const Link& link, const char* password, const char* address) {
    const auto parsed = reference::NetAddress::Parse(address);
    const std::string source = parsed ? parsed->SourceKey() : "unknown";
    const LoginFailures failures(kFailuresOfLinks + link.entry.hash, source);
    switch (failures.Charge()) {
        case LoginFailures::Result::kMayTry:
            break;
        case LoginFailures::Result::kBlocked:
            syslog(LOG_AUTH | LOG_WARNING, "sharing link of %s: visit from %s blocked after too many failures",
                   link.entry.ownerName.c_str(), source.c_str());
            return ZOVA_LINK_BLOCKED;
        case LoginFailures::Result::kFailed:
            return ZOVA_LINK_FAILED;
    }
    const bool possible = strnlen(password, kLongestLinkPassword + 1) <= kLongestLinkPassword;
    switch (possible ? CheckPassword(password, link.password) : PasswordResult::kWrong) {
        case PasswordResult::kGood:
            return failures.Succeed() ? ZOVA_LINK_OK : ZOVA_LINK_FAILED;
        case PasswordResult::kWrong:
            syslog(LOG_AUTH | LOG_NOTICE, "sharing link of %s: visit from %s refused", link.entry.ownerName.c_str(),
                   source.c_str());
            return ZOVA_LINK_REFUSED;
        case PasswordResult::kFailed:
            break;
    }
    failures.TakeBack();
    return ZOVA_LINK_FAILED;
}

/** The user's own password, and then whether the link is for this user. */
int CheckUser(const Link& link, const ZovaLinkVisit& visit, record::Session& session) {
    switch (ZovaLoginCheckPassword(visit.user, visit.password, visit.address)) {
        case ZOVA_LOGIN_OK:
            break;
        case ZOVA_LOGIN_REFUSED:
            return ZOVA_LINK_REFUSED;
        case ZOVA_LOGIN_BLOCKED:
            return ZOVA_LINK_BLOCKED;
        default:
            return ZOVA_LINK_FAILED;
    }
    const auto account = reference::FindAccount(visit.user);
    if (!account || !link.AllowsUser(account->name)) {
        return ZOVA_LINK_REFUSED;
    }
    session.uid = account->uid;
    session.userName = account->name;
    return ZOVA_LINK_OK;
}

int CheckVisitor(const Link& link, const ZovaLinkVisit& visit, record::Session& session) {
    switch (link.entry.protectType) {
        case record::PROTECT_NONE:
            return ZOVA_LINK_OK;
        case record::PROTECT_PASSWORD:
            return CheckLinkPassword(link, visit.password != nullptr ? visit.password : "",
                                     visit.address != nullptr ? visit.address : "");
        case record::PROTECT_USERS:
            return CheckUser(link, visit, session);
        default:
            return ZOVA_LINK_FAILED;
    }
}

int FindOpen(Database& database, const char* hash, const std::string& address, int64_t now, Link& link) {
    switch (LinkStore(database).Find(hash, link)) {
        case StoreResult::kGood:
            break;
        case StoreResult::kUnknown:
            return ZOVA_LINK_UNKNOWN;
        default:
            return ZOVA_LINK_FAILED;
    }
    return link.IsOpen(now) && !link.IsUsedUp() && link.AllowsAddress(address) ? ZOVA_LINK_OK : ZOVA_LINK_UNKNOWN;
}

bool IsSameProtection(const Link& one, const Link& other) {
    return one.entry.protectType == other.entry.protectType && one.password == other.password &&
           one.users == other.users;
}

/** Counts the visit and makes the session, if the link is still what was checked. */
int Admit(Database& database, const Link& checked, Visitor& visitor, const std::string& sid) {
    Transaction transaction(database);
    Link link;
    if (!transaction.IsOpen()) {
        return ZOVA_LINK_FAILED;
    }
    if (const int closed = FindOpen(database, checked.entry.hash.c_str(), visitor.address, visitor.created, link);
        closed != ZOVA_LINK_OK) {
        return closed;
    }
    if (!IsSameProtection(checked, link)) {
        return ZOVA_LINK_REFUSED;
    }
    const StoreResult counted = LinkStore(database).CountVisit(link);
    if (counted != StoreResult::kGood) {
        return counted == StoreResult::kUnknown ? ZOVA_LINK_UNKNOWN : ZOVA_LINK_FAILED;
    }
    switch (sid.empty() ? StoreResult::kGood : VisitorStore(database).Add(sid, visitor, link.entry.id)) {
        case StoreResult::kGood:
            return transaction.Commit() ? ZOVA_LINK_OK : ZOVA_LINK_FAILED;
        case StoreResult::kTooMany:
            return ZOVA_LINK_TOO_MANY;
        default:
            return ZOVA_LINK_FAILED;
    }
}

}  // namespace

int ZovaLinkOpen(const char* hash, const ZovaLinkVisit* visit, char* sid, int sidSize, long long* expires) {
    if (hash == nullptr || !IsHash(hash) || visit == nullptr) {
        return ZOVA_LINK_UNKNOWN;
    }
    if (sid == nullptr || sidSize <= static_cast<int>(reference::kSecretDigits) || expires == nullptr) {
        return ZOVA_LINK_FAILED;
    }
    Database database;
    if (!database.IsGood()) {
        return database.GetState() == Database::State::kMissing ? ZOVA_LINK_UNKNOWN : ZOVA_LINK_FAILED;
    }
    const auto parsed = reference::NetAddress::Parse(visit->address != nullptr ? visit->address : "");
    Visitor visitor;
    visitor.address = parsed ? parsed->Text() : "";
    visitor.created = time(nullptr);
    Link link;
    int result = FindOpen(database, hash, visitor.address, visitor.created, link);
    if (result == ZOVA_LINK_OK) {
        result = CheckVisitor(link, *visit, visitor.session);
    }
    if (result != ZOVA_LINK_OK) {
        return result;
    }
    const std::string secret = link.NeedsSession() ? reference::MakeSecret() : "";
    if (link.NeedsSession() && (secret.empty() || (link.entry.matchIp && visitor.address.empty()))) {
        return ZOVA_LINK_FAILED;
    }
    const int64_t longest = visitor.created + kVisitTime;
    visitor.session.timeout = link.expires == 0 ? longest : std::min(longest, link.expires);
    result = Admit(database, link, visitor, secret);
    if (result == ZOVA_LINK_OK) {
        memcpy(sid, secret.c_str(), secret.size() + 1);
        *expires = visitor.session.timeout;
    }
    return result;
}
