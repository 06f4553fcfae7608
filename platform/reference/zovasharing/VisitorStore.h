#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "zovasharing/Database.h"
#include "zovasharing/LinkStore.h"

namespace reference::sharing {

/** Longest life of a visitor's session, in seconds. */
constexpr int64_t kVisitTime = 12 * 3600;

/** A visitor's session. Of its id only a digest is kept. */
struct Visitor {
    ZOVA::sharing::record::Session session;
    std::string address;
    int64_t created = 0;

    /** Whether the session is at its end, or seems to be from the future: the clock was put back. */
    bool HasEnded(int64_t now) const;
};

/** The visitors' sessions in an open database, and which links each of them opens. */
class VisitorStore {
public:
    explicit VisitorStore(Database& base) : database(base) {}

    StoreResult Find(std::string_view sid, Visitor& visitor) const;
    /** Id of what ties them. */
    StoreResult FindToken(int64_t session, int64_t entry, int64_t& token) const;
    /** Stores a new session under `sid` that opens the link, after removing those that have ended. */
    StoreResult Add(std::string_view sid, Visitor& visitor, int64_t entry) const;

private:
    Database& database;
};

}  // namespace reference::sharing
