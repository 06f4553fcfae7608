#pragma once

// libzovasharing.so.6: sharing links.

#include <string>

/** Name of the CGI variable that holds a sharing link's hash. */
extern "C" const char* const SZ_X_SHARING_HEADER;

namespace ZOVA {
namespace sharing {

/** Name of the cookie that holds a visitor's session id. */
extern const char* const SZK_SHARING_SID;

enum _tag_SHARING_URL_TYPE : int { SHARING_URL_UNKNOWN = 0 };

namespace record {

/** A sharing link. */
class Entry {
public:
    std::string hash;
};

/** A visitor's session. */
class Session {
public:
    std::string id;
};

/** What ties a session to a link. */
class Token {
public:
    std::string id;
};

}  // namespace record

namespace db {

class BaseDB {
public:
    virtual ~BaseDB();
    /** Whether the database can be used. */
    bool IsGood() const;
};

class SharingDB : public BaseDB {
public:
    /** The process's database object. */
    static SharingDB& Instance();
};

class EntryDB {
public:
    explicit EntryDB(BaseDB& database);
    bool GetByHash(const std::string& hash, record::Entry& out) const;

private:
    BaseDB& database;
};

class SessionDB {
public:
    explicit SessionDB(BaseDB& database);
    bool GetBySessionId(const std::string& sid, record::Session& out) const;

private:
    BaseDB& database;
};

class TokenDB {
public:
    explicit TokenDB(BaseDB& database);
    bool GetBySessionEntry(const record::Session& session, const record::Entry& entry, record::Token& out) const;

private:
    BaseDB& database;
};

}  // namespace db
}  // namespace sharing
}  // namespace ZOVA
