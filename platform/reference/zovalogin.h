#pragma once

// Login operations of the reference libraries, for the package that logs users in and out. Not part of what the
// framework imports.

extern "C" {

enum ZovaLoginResult {
    ZOVA_LOGIN_OK = 0,
    /** Wrong password, unknown user, account locked or expired: deliberately one answer. */
    ZOVA_LOGIN_REFUSED = 1,
    /** Too many failures of this account or from this address; the password was not looked at. */
    ZOVA_LOGIN_BLOCKED = 2,
    /** The check could not be made (store, PAM). */
    ZOVA_LOGIN_FAILED = 3,
};

struct ZovaLoginOptions {
    /** Client address as text; required unless `skipCheckIP`. */
    const char* address;
    /** Texts kept with the session, or null. At most 255 bytes each. */
    const char* app;
    const char* webapi;
    /** Not 0: the session gets a token that each call has to bring. */
    int withToken;
    /** Not 0: the session is not bound to the address. */
    int skipCheckIP;
};

/**
 * Checks a password through PAM, needs effective root. A refusal takes one second, whatever its reason. Logs refusals
 * and blocks (LOG_AUTH), never the password.
 * @param address client address as text; null or malformed counts as one common unknown address.
 * @return a ZovaLoginResult.
 */
int ZovaLoginCheckPassword(const char* user, const char* password, const char* address);

/**
 * Makes a session for an existing account, which must not be root's.
 * @param sid, token each at least 65 bytes; `token` may be null unless the options ask for one. Left alone on failure.
 * @return 0 on success, negative on failure.
 */
int ZovaSessionCreate(const char* user, const ZovaLoginOptions* options, char* sid, int sidSize, char* token,
                      int tokenSize);

/**
 * Checks a session as `ZovaCgiIsAuthorizedEx` does, with the address and token given here (null is none), and does not
 * renew its idle time. `user` is set on success only.
 * @return an authorisation result: 1 for a good session, below 0 for a refusal.
 */
int ZovaSessionUser(const char* sid, const char* address, const char* token, char* user, int userSize);

/** Ends a session. 0 on success, negative if there was none. */
int ZovaSessionRemove(const char* sid);

/**
 * The device's envelope key as base64 of its SubjectPublicKeyInfo, with a NUL; made at first use. 1024 bytes are
 * enough.
 * @return the text's length, negative on failure.
 */
int ZovaCipherPublicKey(char* out, int size);

}  // extern "C"
