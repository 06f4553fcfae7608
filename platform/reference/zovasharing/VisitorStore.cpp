#include "zovasharing/VisitorStore.h"

#include "common/Crypto.h"
#include "common/Hex.h"
#include "zovacgi/SessionId.h"

namespace reference::sharing {

namespace {

constexpr int64_t kMostOfLink = 1000;
constexpr int64_t kMostOfDevice = 50000;
constexpr int64_t kClockCorrection = 300;

std::string DigestOf(std::string_view sid) {
    std::string digest;
    return crypto::Sha256(sid, digest) ? HexText(digest) : std::string();
}

StoreResult OfSearch(int step) {
    if (step == ZOVA_SQLITE_ROW) {
        return StoreResult::kGood;
    }
    return step == ZOVA_SQLITE_DONE ? StoreResult::kUnknown : StoreResult::kFailed;
}

bool IsFull(Database& database, int64_t entry) {
    Statement ofLink(database, "SELECT count(*) FROM tokens WHERE entry_id = ?");
    ofLink.Bind(entry);
    Statement ofDevice(database, "SELECT count(*) FROM sessions");
    return ofLink.Step() != ZOVA_SQLITE_ROW || ofLink.Number() >= kMostOfLink || ofDevice.Step() != ZOVA_SQLITE_ROW ||
           ofDevice.Number() >= kMostOfDevice;
}

}  // namespace

bool Visitor::HasEnded(int64_t now) const {
    return now >= session.timeout || created > now + kClockCorrection;
}

StoreResult VisitorStore::Find(std::string_view sid, Visitor& visitor) const {
    if (!IsSessionId(sid)) {
        return StoreResult::kUnknown;
    }
    const std::string digest = DigestOf(sid);
    if (digest.empty()) {
        return StoreResult::kFailed;
    }
    Statement statement(database,
                        "SELECT id, uid, user_name, address, created, expires FROM sessions WHERE sid_digest = ?");
    const StoreResult result = OfSearch(statement.Bind(digest).Step());
    if (result == StoreResult::kGood) {
        visitor.session.id = statement.Number();
        visitor.session.uid = static_cast<uid_t>(statement.Number());
        visitor.session.userName = statement.Text();
        visitor.address = statement.Text();
        visitor.created = statement.Number();
        visitor.session.timeout = statement.Number();
    }
    return result;
}

StoreResult VisitorStore::FindToken(int64_t session, int64_t entry, int64_t& token) const {
    Statement statement(database, "SELECT id FROM tokens WHERE session_id = ? AND entry_id = ?");
    const StoreResult result = OfSearch(statement.Bind(session).Bind(entry).Step());
    if (result == StoreResult::kGood) {
        token = statement.Number();
    }
    return result;
}

StoreResult VisitorStore::Add(std::string_view sid, Visitor& visitor, int64_t entry) const {
    Statement sweep(database, "DELETE FROM sessions WHERE expires <= ?");
    if (!sweep.Bind(visitor.created).Finish()) {
        return StoreResult::kFailed;
    }
    // Those that a changed link has let go of.
    Statement orphans(database, "DELETE FROM sessions WHERE id NOT IN (SELECT session_id FROM tokens)");
    if (!orphans.Finish()) {
        return StoreResult::kFailed;
    }
    if (IsFull(database, entry)) {
        return StoreResult::kTooMany;
    }
    const std::string digest = DigestOf(sid);
    Statement session(database,
                      "INSERT INTO sessions (sid_digest, uid, user_name, address, created, expires) "
                      "VALUES (?, ?, ?, ?, ?, ?)");
    session.Bind(digest)
        .Bind(int64_t{visitor.session.uid})
        .Bind(visitor.session.userName)
        .Bind(visitor.address)
        .Bind(visitor.created)
        .Bind(visitor.session.timeout);
    if (digest.empty() || !session.Finish()) {
        return StoreResult::kFailed;
    }
    visitor.session.id = database.LastId();
    Statement token(database, "INSERT INTO tokens (session_id, entry_id) VALUES (?, ?)");
    return token.Bind(visitor.session.id).Bind(entry).Finish() ? StoreResult::kGood : StoreResult::kFailed;
}

}  // namespace reference::sharing
