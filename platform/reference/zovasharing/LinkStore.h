#pragma once

#include <string>
#include <vector>

#include "zovasharing/Database.h"
#include "zovasharing/Link.h"

namespace reference::sharing {

enum class StoreResult {
    kGood,
    kUnknown,
    /** The owner has 1,000 links, or the device 20,000. */
    kTooMany,
    kFailed,
};

/** The links in an open database. */
class LinkStore {
public:
    explicit LinkStore(Database& base) : database(base) {}

    StoreResult Find(std::string_view hash, Link& link) const;
    /** The owner's, the oldest first. */
    StoreResult ListOf(uid_t owner, std::vector<Link>& links) const;
    /** Stores a new link, whose id is set. */
    StoreResult Add(Link& link) const;
    /** Writes everything that an owner may change, and ends all sessions on the link if `endSessions`. */
    StoreResult Change(const Link& link, bool endSessions) const;
    StoreResult Remove(const Link& link) const;
    /** Counts a visit; kUnknown if the link's visits are used up. */
    StoreResult CountVisit(const Link& link) const;

private:
    Database& database;
};

}  // namespace reference::sharing
