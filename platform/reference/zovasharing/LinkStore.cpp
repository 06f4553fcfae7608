#include "zovasharing/LinkStore.h"

#include "common/JsonText.h"

namespace reference::sharing {

namespace {

constexpr int64_t kMostOfOwner = 1000;
constexpr int64_t kMostOfDevice = 20000;

#define LINK_COLUMNS                                                                                                 \
    "id, hash, owner_uid, owner_name, project, paths, protect_type, password, users, addresses, match_ip, created, " \
    "expires, visits, visit_limit, enabled"

bool TakeTexts(const std::string& text, std::vector<std::string>& out) {
    Json::Value value;
    if (!ParseJson(text, value)) {
        return false;
    }
    auto texts = ParseTexts(value);
    if (texts) {
        out = std::move(*texts);
    }
    return texts.has_value();
}

/** False for a row that this library did not write. */
bool TakeRow(Statement& row, Link& link) {
    link = Link();
    link.entry.id = row.Number();
    link.entry.hash = row.Text();
    link.entry.ownerUid = static_cast<uid_t>(row.Number());
    link.entry.ownerName = row.Text();
    link.entry.projectName = row.Text();
    const std::string pathsText = row.Text();
    link.entry.protectType = static_cast<int>(row.Number());
    link.password = row.Text();
    const std::string usersText = row.Text();
    link.addresses = row.Text();
    link.entry.matchIp = row.Number() != 0;
    link.created = row.Number();
    link.expires = row.Number();
    link.visits = row.Number();
    link.visitLimit = row.Number();
    link.enabled = row.Number() == 1;
    return TakeTexts(pathsText, link.entry.paths) && TakeTexts(usersText, link.users);
}

int64_t Count(Statement& statement) {
    return statement.Step() == ZOVA_SQLITE_ROW ? statement.Number() : kMostOfDevice;
}

StoreResult OfChange(bool finished, const Database& database) {
    if (!finished) {
        return StoreResult::kFailed;
    }
    return database.Changes() == 1 ? StoreResult::kGood : StoreResult::kUnknown;
}

}  // namespace

StoreResult LinkStore::Find(std::string_view hash, Link& link) const {
    Statement statement(database, "SELECT " LINK_COLUMNS " FROM entries WHERE hash = ?");
    statement.Bind(hash);
    switch (statement.Step()) {
        case ZOVA_SQLITE_ROW:
            return TakeRow(statement, link) ? StoreResult::kGood : StoreResult::kFailed;
        case ZOVA_SQLITE_DONE:
            return StoreResult::kUnknown;
        default:
            return StoreResult::kFailed;
    }
}

StoreResult LinkStore::ListOf(uid_t owner, std::vector<Link>& links) const {
    Statement statement(database, "SELECT " LINK_COLUMNS " FROM entries WHERE owner_uid = ? ORDER BY id");
    statement.Bind(int64_t{owner});
    int step = ZOVA_SQLITE_DONE;
    while ((step = statement.Step()) == ZOVA_SQLITE_ROW) {
        if (!TakeRow(statement, links.emplace_back())) {
            return StoreResult::kFailed;
        }
    }
    return step == ZOVA_SQLITE_DONE ? StoreResult::kGood : StoreResult::kFailed;
}

StoreResult LinkStore::Add(Link& link) const {
    Transaction transaction(database);
    Statement ofOwner(database, "SELECT count(*) FROM entries WHERE owner_uid = ?");
    ofOwner.Bind(int64_t{link.entry.ownerUid});
    Statement ofDevice(database, "SELECT count(*) FROM entries");
    if (!transaction.IsOpen()) {
        return StoreResult::kFailed;
    }
    if (Count(ofOwner) >= kMostOfOwner || Count(ofDevice) >= kMostOfDevice) {
        return StoreResult::kTooMany;
    }
    Statement insert(database,
                     "INSERT INTO entries (hash, owner_uid, owner_name, project, paths, protect_type, password, users, "
                     "addresses, match_ip, created, expires, visits, visit_limit, enabled) "
                     "VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, 0, ?, ?)");
    insert.Bind(link.entry.hash)
        .Bind(int64_t{link.entry.ownerUid})
        .Bind(link.entry.ownerName)
        .Bind(link.entry.projectName)
        .Bind(WriteJson(TextsJson(link.entry.paths)))
        .Bind(link.entry.protectType)
        .Bind(link.password)
        .Bind(WriteJson(TextsJson(link.users)))
        .Bind(link.addresses)
        .Bind(int64_t{link.entry.matchIp})
        .Bind(link.created)
        .Bind(link.expires)
        .Bind(link.visitLimit)
        .Bind(int64_t{link.enabled});
    if (!insert.Finish()) {
        return StoreResult::kFailed;
    }
    link.entry.id = database.LastId();
    return transaction.Commit() ? StoreResult::kGood : StoreResult::kFailed;
}

StoreResult LinkStore::Change(const Link& link, bool endSessions) const {
    Transaction transaction(database);
    Statement update(database,
                     "UPDATE entries SET paths = ?, protect_type = ?, password = ?, users = ?, addresses = ?, "
                     "match_ip = ?, expires = ?, visit_limit = ?, enabled = ? WHERE id = ?");
    update.Bind(WriteJson(TextsJson(link.entry.paths)))
        .Bind(link.entry.protectType)
        .Bind(link.password)
        .Bind(WriteJson(TextsJson(link.users)))
        .Bind(link.addresses)
        .Bind(int64_t{link.entry.matchIp})
        .Bind(link.expires)
        .Bind(link.visitLimit)
        .Bind(int64_t{link.enabled})
        .Bind(link.entry.id);
    const StoreResult changed = transaction.IsOpen() ? OfChange(update.Finish(), database) : StoreResult::kFailed;
    if (changed != StoreResult::kGood) {
        return changed;
    }
    Statement end(database, "DELETE FROM tokens WHERE entry_id = ?");
    if (endSessions && !end.Bind(link.entry.id).Finish()) {
        return StoreResult::kFailed;
    }
    return transaction.Commit() ? StoreResult::kGood : StoreResult::kFailed;
}

StoreResult LinkStore::Remove(const Link& link) const {
    Statement statement(database, "DELETE FROM entries WHERE id = ?");
    return OfChange(statement.Bind(link.entry.id).Finish(), database);
}

StoreResult LinkStore::CountVisit(const Link& link) const {
    Statement statement(database,
                        "UPDATE entries SET visits = visits + 1 "
                        "WHERE id = ? AND (visit_limit = 0 OR visits < visit_limit)");
    return OfChange(statement.Bind(link.entry.id).Finish(), database);
}

}  // namespace reference::sharing
