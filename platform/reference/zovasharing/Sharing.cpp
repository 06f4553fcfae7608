#include "Seam.h"

// The database of sharing links is not there: it never is good, and nothing is found in it.

const char* const SZ_X_SHARING_HEADER = "HTTP_X_SHARING_ID";

namespace ZOVA::sharing {

const char* const SZK_SHARING_SID = "sharing_sid";

namespace db {

BaseDB::~BaseDB() = default;

bool BaseDB::IsGood() const {
    return false;
}

SharingDB& SharingDB::Instance() {
    static SharingDB instance;
    return instance;
}

EntryDB::EntryDB(BaseDB& base) : database(base) {}

bool EntryDB::GetByHash(const std::string&, record::Entry&) const {
    return database.IsGood();
}

SessionDB::SessionDB(BaseDB& base) : database(base) {}

bool SessionDB::GetBySessionId(const std::string&, record::Session&) const {
    return database.IsGood();
}

TokenDB::TokenDB(BaseDB& base) : database(base) {}

bool TokenDB::GetBySessionEntry(const record::Session&, const record::Entry&, record::Token&) const {
    return database.IsGood();
}

}  // namespace db

}  // namespace ZOVA::sharing
