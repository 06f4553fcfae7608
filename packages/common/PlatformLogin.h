#pragma once

// The login operations that the packages import from libzovacgi.so.6.

extern "C" {

enum ZovaLoginResult {
    ZOVA_LOGIN_OK = 0,
    /** Unknown account or wrong password. */
    ZOVA_LOGIN_REFUSED = 1,
    /** Too many failed logins of this account or from this address. */
    ZOVA_LOGIN_BLOCKED = 2,
    /** The password could not be checked. */
    ZOVA_LOGIN_FAILED = 3,
};

struct ZovaLoginOptions {
    /** Address that the session is bound to. */
    const char* address;
    /** Application of the login, or "". */
    const char* app;
    /** API privilege string of the login, or "". */
    const char* webapi;
    /** Not 0: each call of the session must bring the session's token. */
    int withToken;
    /** Not 0: the session may be used from any address. */
    int skipCheckIP;
};

/** Checks a password; failures count against the account and the address. Returns a ZovaLoginResult. */
int ZovaLoginCheckPassword(const char* user, const char* password, const char* address);
/** Makes a login session and writes its id, and its token if it has one, each at least 65 bytes. 0 on success. */
int ZovaSessionCreate(const char* user, const ZovaLoginOptions* options, char* sid, int sidSize, char* token,
                      int tokenSize);
/** Finds the user of a session; a null token is none. 1 for a good session, below 0 an authorisation result. */
int ZovaSessionUser(const char* sid, const char* address, const char* token, char* user, int userSize);
/** Ends a session. 0 on success, negative if there was none. */
int ZovaSessionRemove(const char* sid);
/** Writes the public key of the parameter cipher, base64 of its SubjectPublicKeyInfo. Negative on failure. */
int ZovaCipherPublicKey(char* out, int size);

}  // extern "C"
