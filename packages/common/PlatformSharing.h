#pragma once

// The operations on sharing links that the packages import from libzovasharing.so.6.

#include <json/value.h>

extern "C" {

enum ZovaLinkResult {
    ZOVA_LINK_OK = 0,
    ZOVA_LINK_BAD_FIELD = 1,
    ZOVA_LINK_BAD_PROJECT = 2,
    ZOVA_LINK_BAD_PATHS = 3,
    /** Protect type, password or users. */
    ZOVA_LINK_BAD_PROTECTION = 4,
    ZOVA_LINK_BAD_ADDRESSES = 5,
    ZOVA_LINK_BAD_TIME = 6,
    ZOVA_LINK_BAD_LIMIT = 7,
    ZOVA_LINK_NO_USER = 8,
    /** As many links, or sessions on them, as there may be. */
    ZOVA_LINK_TOO_MANY = 9,
    ZOVA_LINK_UNKNOWN = 10,
    /** Wrong password, or a user who may not use the link. */
    ZOVA_LINK_REFUSED = 11,
    ZOVA_LINK_BLOCKED = 12,
    ZOVA_LINK_FAILED = 13,
};

struct ZovaLinkVisit {
    const char* user;
    const char* password;
    const char* address;
};

// Each returns a ZovaLinkResult.

int ZovaLinkCreate(const char* owner, const Json::Value* fields, Json::Value* made);
int ZovaLinkGet(const char* owner, const char* hash, Json::Value* link);
int ZovaLinkList(const char* owner, Json::Value* links);
int ZovaLinkUpdate(const char* owner, const char* hash, const Json::Value* fields);
int ZovaLinkDelete(const char* owner, const char* hash);
/** `sid` has at least 65 bytes; "" comes for a link that needs no session. `expires` is in seconds since the epoch. */
int ZovaLinkOpen(const char* hash, const ZovaLinkVisit* visit, char* sid, int sidSize, long long* expires);

}  // extern "C"
