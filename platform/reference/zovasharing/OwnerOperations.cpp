#include <ctime>

#include "Seam.h"
#include "common/Accounts.h"
#include "common/Hex.h"
#include "common/RandomBytes.h"
#include "zovasharing/LinkFields.h"
#include "zovasharing/LinkStore.h"

using namespace reference::sharing;

namespace {

int ResultOf(StoreResult result) {
    switch (result) {
        case StoreResult::kGood:
            return ZOVA_LINK_OK;
        case StoreResult::kUnknown:
            return ZOVA_LINK_UNKNOWN;
        case StoreResult::kTooMany:
            return ZOVA_LINK_TOO_MANY;
        case StoreResult::kFailed:
            break;
    }
    return ZOVA_LINK_FAILED;
}

/** Begins with a letter, so that no notation takes it for a number; "" if the random source fails. */
std::string MakeHash() {
    char bytes[kHashDigits / 2];
    while (reference::FillRandom(bytes, sizeof(bytes))) {
        std::string hash = reference::HexText(std::string_view(bytes, sizeof(bytes)));
        if (hash.front() > '9') {
            return hash;
        }
    }
    return "";
}

/** The account if links may be made and kept in its name. */
std::optional<reference::Account> FindOwner(const char* owner) {
    auto account = owner == nullptr ? std::nullopt : reference::FindAccount(owner);
    return account && reference::IsInForce(account->name, account->uid) ? account : std::nullopt;
}

/** The owner's link of that hash, in the open database. A ZovaLinkResult. */
int FindOwn(Database& database, const char* owner, const char* hash, Link& link) {
    const auto account = FindOwner(owner);
    if (!account) {
        return ZOVA_LINK_NO_USER;
    }
    if (hash == nullptr || !IsHash(hash) || database.GetState() == Database::State::kMissing) {
        return ZOVA_LINK_UNKNOWN;
    }
    const StoreResult found = database.IsGood() ? LinkStore(database).Find(hash, link) : StoreResult::kFailed;
    if (found != StoreResult::kGood) {
        return ResultOf(found);
    }
    const bool own = link.entry.ownerUid == account->uid && link.entry.ownerName == account->name;
    return own ? ZOVA_LINK_OK : ZOVA_LINK_UNKNOWN;
}

}  // namespace

int ZovaLinkCreate(const char* owner, const Json::Value* fields, Json::Value* made) {
    const auto account = FindOwner(owner);
    if (!account) {
        return ZOVA_LINK_NO_USER;
    }
    Link link;
    link.entry.ownerUid = account->uid;
    link.entry.ownerName = account->name;
    link.created = time(nullptr);
    if (fields == nullptr || made == nullptr) {
        return ZOVA_LINK_BAD_FIELD;
    }
    if (const int bad = TakeLinkFields(*fields, false, link.created, link); bad != ZOVA_LINK_OK) {
        return bad;
    }
    Database database = Database::Made();
    link.entry.hash = MakeHash();
    if (!database.IsGood() || link.entry.hash.empty()) {
        return ZOVA_LINK_FAILED;
    }
    const StoreResult added = LinkStore(database).Add(link);
    if (added == StoreResult::kGood) {
        *made = LinkJson(link);
    }
    return ResultOf(added);
}

int ZovaLinkGet(const char* owner, const char* hash, Json::Value* link) {
    Database database;
    Link found;
    const int result = link == nullptr ? ZOVA_LINK_FAILED : FindOwn(database, owner, hash, found);
    if (result == ZOVA_LINK_OK) {
        *link = LinkJson(found);
    }
    return result;
}

int ZovaLinkList(const char* owner, Json::Value* links) {
    const auto account = FindOwner(owner);
    if (!account) {
        return ZOVA_LINK_NO_USER;
    }
    Database database;
    std::vector<Link> found;
    const bool missing = database.GetState() == Database::State::kMissing;
    if (links == nullptr ||
        (!missing && (!database.IsGood() || LinkStore(database).ListOf(account->uid, found) != StoreResult::kGood))) {
        return ZOVA_LINK_FAILED;
    }
    *links = Json::Value(Json::arrayValue);
    for (const Link& link : found) {
        if (link.entry.ownerName == account->name) {
            links->append(LinkJson(link));
        }
    }
    return ZOVA_LINK_OK;
}

int ZovaLinkUpdate(const char* owner, const char* hash, const Json::Value* fields) {
    Database database;
    Link link;
    if (const int bad = FindOwn(database, owner, hash, link); bad != ZOVA_LINK_OK) {
        return bad;
    }
    const int bad = fields == nullptr ? ZOVA_LINK_BAD_FIELD : TakeLinkFields(*fields, true, time(nullptr), link);
    return bad != ZOVA_LINK_OK ? bad : ResultOf(LinkStore(database).Change(link, ChangeAccess(*fields)));
}

int ZovaLinkDelete(const char* owner, const char* hash) {
    Database database;
    Link link;
    const int result = FindOwn(database, owner, hash, link);
    return result != ZOVA_LINK_OK ? result : ResultOf(LinkStore(database).Remove(link));
}
