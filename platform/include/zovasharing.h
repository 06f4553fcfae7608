#pragma once

// libzovasharing.so.6: sharing links.

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <vector>

extern "C" {

/** Name of the CGI variable that holds a sharing link's hash. */
extern const char* const SZ_X_SHARING_HEADER;

/** What a visitor brings. Both texts are null when there is none. */
struct ZovaSharingCredentials {
    const char* sharingId;
    void* reserved[3];
    const char* sessionId;
};

/**
 * Judges a link and the session of its visitor; the client's address is that of the request in the process environment.
 * @return 1 for a good one, otherwise
 *   -1 the session has ended,
 *   -2 the link is closed: switched off, not yet or no longer good, used up, its owner gone,
 *   -5 the link asks for a session, and there is none that is known,
 *   -6 the sharing database cannot be asked,
 *   -7 the session was opened for another link, or its user may not use this one any more,
 *   -8 the client's address is not one that the link or the session allows,
 *   -4 there is no such link.
 */
int ZovaSharingIsAuthorized(const ZovaSharingCredentials* credentials);

}  // extern "C"

namespace ZOVA {
namespace sharing {

/** Name of the cookie that holds a visitor's session id. */
extern const char* const SZK_SHARING_SID;

enum _tag_SHARING_URL_TYPE : int {
    SHARING_URL_UNKNOWN = 0,
    /** Under the host and the folder of the request. */
    SHARING_URL_HOST = 1,
    /** Under the prefix by which a proxy reaches this application. */
    SHARING_URL_REWRITTEN = 2,
};

/**
 * URL under which sharing links are reached, with a slash at its end; a link's hash goes behind it.
 * @param host of the request, possibly in brackets. @param port 0 if not known.
 * @param path folder of the request's URL, with a slash at both ends; may be "".
 * @param rewriteApp name under which a proxy reaches this application, or "".
 * @return false, with `url` "" and the type unknown, if host, port, path or name cannot be part of an URL.
 */
bool GetSharingURL(const std::string& host, int port, bool https, const std::string& path,
                   const std::string& rewriteApp, std::string& url, _tag_SHARING_URL_TYPE& type);

namespace record {

/** How a link is protected. */
enum ProtectType : int {
    PROTECT_NONE = 0,
    PROTECT_PASSWORD = 1,
    /** Only the named users, who then act as themselves. */
    PROTECT_USERS = 2,
};

/** A sharing link. */
class Entry {
public:
    std::string get_project_name() const;
    int get_protect_type() const;
    /** Whether a session is good only from the address that opened it. */
    bool get_enable_match_ip() const;

    /** 0: none was found. */
    std::int64_t id = 0;
    std::string hash;
    uid_t ownerUid = 0;
    std::string ownerName;
    std::string projectName;
    /** What is shared: absolute paths without "." and ".." parts. */
    std::vector<std::string> paths;
    int protectType = PROTECT_NONE;
    bool matchIp = false;
};

/** A visitor's session. */
class Session {
public:
    /** User of the session; meaningless unless its link is for named users. */
    uid_t get_uid() const;
    /** End of the session, in seconds since the epoch. */
    std::int64_t get_timeout() const;

    /** 0: none was found. */
    std::int64_t id = 0;
    uid_t uid = static_cast<uid_t>(-1);
    std::string userName;
    std::int64_t timeout = 0;
};

/** What ties a session to a link. */
class Token {
public:
    /** 0: none was found. */
    std::int64_t id = 0;
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
