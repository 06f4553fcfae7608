#include <ctime>

#include "Seam.h"
#include "common/Accounts.h"
#include "zovacgi/ClientAddress.h"
#include "zovasharing/LinkStore.h"
#include "zovasharing/VisitorStore.h"

using namespace reference::sharing;

namespace {

constexpr int kGood = 1;
constexpr int kSessionEnded = -1;
constexpr int kLinkClosed = -2;
constexpr int kNoSuchLink = -4;
constexpr int kNoSession = -5;
constexpr int kCannotTell = -6;
constexpr int kSessionOfAnother = -7;
constexpr int kOtherAddress = -8;

int JudgeSession(Database& database, const Link& link, const char* sid, const std::string& address, int64_t now) {
    const VisitorStore visitors(database);
    Visitor visitor;
    const StoreResult found = sid == nullptr ? StoreResult::kUnknown : visitors.Find(sid, visitor);
    if (found == StoreResult::kUnknown) {
        return link.IsUsedUp() ? kLinkClosed : kNoSession;
    }
    int64_t token = 0;
    const StoreResult tied = found == StoreResult::kGood ? visitors.FindToken(visitor.session.id, link.entry.id, token)
                                                         : StoreResult::kFailed;
    if (tied == StoreResult::kFailed) {
        return kCannotTell;
    }
    if (tied != StoreResult::kGood) {
        return kSessionOfAnother;
    }
    if (visitor.HasEnded(now)) {
        return kSessionEnded;
    }
    if (link.entry.matchIp && (address.empty() || visitor.address != address)) {
        return kOtherAddress;
    }
    const bool forUsers = link.entry.protectType == ZOVA::sharing::record::PROTECT_USERS;
    if (forUsers && !(link.AllowsUser(visitor.session.userName) &&
                      reference::IsInForce(visitor.session.userName, visitor.session.uid))) {
        return kSessionOfAnother;
    }
    return kGood;
}

}  // namespace

int ZovaSharingIsAuthorized(const ZovaSharingCredentials* credentials) {
    if (credentials == nullptr || credentials->sharingId == nullptr || !IsHash(credentials->sharingId)) {
        return kNoSuchLink;
    }
    Database database;
    if (!database.IsGood()) {
        return database.GetState() == Database::State::kMissing ? kNoSuchLink : kCannotTell;
    }
    Link link;
    switch (LinkStore(database).Find(credentials->sharingId, link)) {
        case StoreResult::kGood:
            break;
        case StoreResult::kUnknown:
            return kNoSuchLink;
        default:
            return kCannotTell;
    }
    const int64_t now = time(nullptr);
    if (!link.IsOpen(now)) {
        return kLinkClosed;
    }
    const std::string address = reference::ClientAddressOfRequest();
    if (!link.AllowsAddress(address)) {
        return kOtherAddress;
    }
    return link.NeedsSession() ? JudgeSession(database, link, credentials->sessionId, address, now) : kGood;
}
