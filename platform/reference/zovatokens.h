#pragma once

// Operations on device access tokens, for the package by which users keep theirs. Not part of what the framework
// imports. All of them need effective root.

#include <json/value.h>

extern "C" {

enum ZovaAccessTokenResult {
    ZOVA_ACCESS_TOKEN_OK = 0,
    /** The APIs are no list as below, name one that no token may call, or are too many to be kept. */
    ZOVA_ACCESS_TOKEN_BAD_APIS = 1,
    /** The label is longer than 128 bytes or holds control bytes. */
    ZOVA_ACCESS_TOKEN_BAD_LABEL = 2,
    /** The time is shorter than a minute or longer than ten years of 365 days. */
    ZOVA_ACCESS_TOKEN_BAD_TIME = 3,
    /** No such account, or one that may not log in: locked, expired, root's. */
    ZOVA_ACCESS_TOKEN_NO_USER = 4,
    /** The user has 100 tokens, or the device 5,000. */
    ZOVA_ACCESS_TOKEN_TOO_MANY = 5,
    /** The user has no token with this id. */
    ZOVA_ACCESS_TOKEN_UNKNOWN = 6,
    /** The store cannot be used. */
    ZOVA_ACCESS_TOKEN_FAILED = 7,
};

/**
 * Makes a token for an existing account.
 * @param label a text for people, may be "".
 * @param seconds how long the token is good.
 * @param apis 1 to 64 objects {"api": name, "methods": 1 to 64 names, or "*" for all methods}.
 * @param made receives "id", "token" (64 hex digits, kept nowhere) and "expires" (seconds since the epoch) on success.
 * @return a ZovaAccessTokenResult.
 */
int ZovaAccessTokenCreate(const char* user, const char* label, long long seconds, const Json::Value* apis,
                          Json::Value* made);

/**
 * Lists the user's tokens that have not expired, the oldest first.
 * @param tokens receives an array of objects with "id", "label", "apis", "created" and "expires" on success.
 * @return a ZovaAccessTokenResult.
 */
int ZovaAccessTokenList(const char* user, Json::Value* tokens);

/** Removes the user's token of that id. @return a ZovaAccessTokenResult. */
int ZovaAccessTokenRevoke(const char* user, const char* id);

}  // extern "C"
