#include "Seam.h"
#include "zovasharing/Database.h"
#include "zovasharing/LinkStore.h"
#include "zovasharing/VisitorStore.h"

using reference::sharing::Database;
using reference::sharing::Link;
using reference::sharing::LinkStore;
using reference::sharing::StoreResult;
using reference::sharing::Visitor;
using reference::sharing::VisitorStore;

const char* const SZ_X_SHARING_HEADER = "HTTP_X_SHARING_ID";

namespace ZOVA::sharing {

const char* const SZK_SHARING_SID = "sharing_sid";

namespace record {

std::string Entry::get_project_name() const {
    return projectName;
}

int Entry::get_protect_type() const {
    return protectType;
}

bool Entry::get_enable_match_ip() const {
    return matchIp;
}

uid_t Session::get_uid() const {
    return uid;
}

std::int64_t Session::get_timeout() const {
    return timeout;
}

}  // namespace record

// The objects stand for the database; each look-up opens it for itself and closes it again.

namespace db {

BaseDB::~BaseDB() = default;

bool BaseDB::IsGood() const {
    return Database().IsGood();
}

SharingDB& SharingDB::Instance() {
    static SharingDB instance;
    return instance;
}

EntryDB::EntryDB(BaseDB& base) : database(base) {}

bool EntryDB::GetByHash(const std::string& hash, record::Entry& out) const {
    out = record::Entry();
    Database open;
    Link link;
    if (!reference::sharing::IsHash(hash) || !open.IsGood() || LinkStore(open).Find(hash, link) != StoreResult::kGood) {
        return false;
    }
    out = link.entry;
    return true;
}

SessionDB::SessionDB(BaseDB& base) : database(base) {}

bool SessionDB::GetBySessionId(const std::string& sid, record::Session& out) const {
    out = record::Session();
    Database open;
    Visitor visitor;
    if (!open.IsGood() || VisitorStore(open).Find(sid, visitor) != StoreResult::kGood) {
        return false;
    }
    out = visitor.session;
    return true;
}

TokenDB::TokenDB(BaseDB& base) : database(base) {}

bool TokenDB::GetBySessionEntry(const record::Session& session, const record::Entry& entry, record::Token& out) const {
    out = record::Token();
    Database open;
    return session.id != 0 && entry.id != 0 && open.IsGood() &&
           VisitorStore(open).FindToken(session.id, entry.id, out.id) == StoreResult::kGood;
}

}  // namespace db

}  // namespace ZOVA::sharing
