#pragma once

// Operations on sharing links, for the package by which users make and visitors open them, and for the check libraries
// of projects. Not part of what the framework imports. All of them need effective root.

#include <json/value.h>

namespace ZOVA::sharing::record {
class Entry;
}

extern "C" {

enum ZovaLinkResult {
    ZOVA_LINK_OK = 0,
    /** A field that is not known, or one that cannot be changed. */
    ZOVA_LINK_BAD_FIELD = 1,
    /** No name of a project: 1 to 64 letters, digits, "_", "-" and ".", not beginning with a dot. */
    ZOVA_LINK_BAD_PROJECT = 2,
    /** No 1 to 32 absolute paths without links in them, each of a file or folder that belongs to the owner. */
    ZOVA_LINK_BAD_PATHS = 3,
    /** No protect type, or its password (1 to 256 bytes) or users (1 to 64 accounts) missing or not its own. */
    ZOVA_LINK_BAD_PROTECTION = 4,
    /** An address that is none, or more than 1,024 bytes of them; or an address check that is no bool. */
    ZOVA_LINK_BAD_ADDRESSES = 5,
    /** An end that is past or further than ten years of 365 days. */
    ZOVA_LINK_BAD_TIME = 6,
    /** A limit of visits that is none: 0 to 1,000,000. */
    ZOVA_LINK_BAD_LIMIT = 7,
    /** No such account, or one that may not log in. */
    ZOVA_LINK_NO_USER = 8,
    /** The owner has 1,000 links, the device 20,000; or the link has 1,000 sessions, the device 50,000. */
    ZOVA_LINK_TOO_MANY = 9,
    /** No such link of this owner; for a visitor also one that is closed, used up, or not for this address. */
    ZOVA_LINK_UNKNOWN = 10,
    /** Wrong password, or a user who may not use the link: deliberately one answer. */
    ZOVA_LINK_REFUSED = 11,
    /** Too many failures on this link or from this address; the password was not looked at. */
    ZOVA_LINK_BLOCKED = 12,
    /** The database cannot be used, or the check could not be made. */
    ZOVA_LINK_FAILED = 13,
};

/**
 * Makes a link.
 * @param fields an object with "project" (text), "paths" (list of texts), and optionally "protect_type" (0 public, 1
 *     password, 2 named users; default 0), "password" (text, type 1), "users" (list of account names, type 2),
 *     "addresses" (list of "address" or "address/bits"; empty is every address), "match_ip" (bool: a session is good
 *     from one address only), "expires" (seconds since the epoch; 0 never), "visit_limit" (number; 0 none) and
 *     "enabled" (bool).
 * @param made receives the link as `ZovaLinkGet` gives it.
 * @return a ZovaLinkResult.
 */
int ZovaLinkCreate(const char* owner, const Json::Value* fields, Json::Value* made);

/**
 * A link of the owner's: the fields above but "password", and "hash" (32 hex digits), "created", "visits".
 * @return a ZovaLinkResult.
 */
int ZovaLinkGet(const char* owner, const char* hash, Json::Value* link);

/** All links of the owner's, the oldest first, in a list. @return a ZovaLinkResult. */
int ZovaLinkList(const char* owner, Json::Value* links);

/**
 * Replaces the fields that are given, any but "project". Changing "paths", "protect_type", "password", "users" or
 * "match_ip" ends all sessions on the link; another "protect_type" takes its password or users from the same call.
 * @return a ZovaLinkResult.
 */
int ZovaLinkUpdate(const char* owner, const char* hash, const Json::Value* fields);

/** Removes a link and ends its sessions. @return a ZovaLinkResult. */
int ZovaLinkDelete(const char* owner, const char* hash);

/** What a visitor brings; each may be null. */
struct ZovaLinkVisit {
    const char* user;
    const char* password;
    /** Client address as text. */
    const char* address;
};

/**
 * Opens a link for a visitor: checks password or user, counts the visit and makes a session. A public link without
 * conditions needs none: then `sid` is "". Logs refusals and blocks (LOG_AUTH), never the password.
 * @param sid at least 65 bytes, left alone on failure. @param expires end of the session, in seconds since the epoch.
 * @return a ZovaLinkResult.
 */
int ZovaLinkOpen(const char* hash, const ZovaLinkVisit* visit, char* sid, int sidSize, long long* expires);

/**
 * Opens what lies at the path, if the link shares it: one of the link's paths or something below it, reached without
 * any symbolic link, a regular file or folder that belongs to the link's owner.
 * @return a descriptor (O_PATH, close-on-exec) of the very thing that was checked, for the caller to close; negative if
 * it is not shared.
 */
int ZovaLinkOpenPath(const ZOVA::sharing::record::Entry* entry, const char* path);

}  // extern "C"
