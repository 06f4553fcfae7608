#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "zovacgi/Language.h"
#include "zovacgi/SessionStore.h"

struct ZovaCgi;

namespace reference {

/** What a CGI context record holds beyond its open fields. */
class CgiState {
public:
    /** The record's state, made if it has none. */
    static CgiState& Of(ZovaCgi& cgi);

    /** The session, read once for as long as the id stays the same; a failure is not kept. */
    SessionStore::Result Find(std::string_view sid);
    /** The session that `Find` gave last. */
    const SessionStore::Entry& Found() const { return entry; }

    /** Session id and language of the request's headers. */
    std::string cookieSid;
    const char* language = kDefaultLanguage;

    /** Options of the authorised session, as texts; nothing where the session does not say. */
    std::optional<std::string> skipCheckIp;
    std::optional<std::string> webapi;
    std::optional<std::string> app;
    std::optional<std::string> timeout;

private:
    std::string foundSid;
    SessionStore::Entry entry;
};

}  // namespace reference
