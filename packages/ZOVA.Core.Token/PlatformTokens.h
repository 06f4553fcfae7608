#pragma once

// The operations on device access tokens that this package imports from libzovaaccesstoken.so.6.

#include <json/value.h>

extern "C" {

enum ZovaAccessTokenResult {
    ZOVA_ACCESS_TOKEN_OK = 0,
    /** The APIs are no such list, or not to be had by a token. */
    ZOVA_ACCESS_TOKEN_BAD_APIS = 1,
    ZOVA_ACCESS_TOKEN_BAD_LABEL = 2,
    /** Too short or too long a time. */
    ZOVA_ACCESS_TOKEN_BAD_TIME = 3,
    ZOVA_ACCESS_TOKEN_NO_USER = 4,
    /** The user, or the device, has as many as there may be. */
    ZOVA_ACCESS_TOKEN_TOO_MANY = 5,
    /** The user has no such token. */
    ZOVA_ACCESS_TOKEN_UNKNOWN = 6,
    ZOVA_ACCESS_TOKEN_FAILED = 7,
};

/** Makes a token. `made` receives "id", "token" and "expires" on success. Returns a ZovaAccessTokenResult. */
int ZovaAccessTokenCreate(const char* user, const char* label, long long seconds, const Json::Value* apis,
                          Json::Value* made);
/** Lists a user's tokens: an array of "id", "label", "apis", "created", "expires". Returns a ZovaAccessTokenResult. */
int ZovaAccessTokenList(const char* user, Json::Value* tokens);
/** Removes a user's token. Returns a ZovaAccessTokenResult. */
int ZovaAccessTokenRevoke(const char* user, const char* id);

}  // extern "C"
