#pragma once

// libzovacgi.so.6: CGI decoding and login sessions.

struct ZovaSzHash;

extern "C" {

/** The CGI context record. All zero before `ZovaCgiInit`; `ZovaCgiFree` gives back what it holds. */
struct ZovaCgi {
    ZovaSzHash* params;
    char* sessFile;
    char* sessDir;
    int timeout;
    int skipCheckIP;
    void* state;
};

/** Bits of the flag word of `ZovaCgiAuthOptions`. */
enum ZovaCgiAuthFlag : int {
    ZOVA_CGI_AUTH_LOAD = 1,
    ZOVA_CGI_AUTH_IDLE = 2,
    ZOVA_CGI_AUTH_ADDRESS = 4,
    ZOVA_CGI_AUTH_REFRESH = 8,
    ZOVA_CGI_AUTH_TOKEN = 16,
};

struct ZovaCgiAuthOptions {
    int flags;
    /** Not 0: a session whose idle time ran out is accepted. */
    int allowTimeout;
};

/** Numbers for `ZovaCgiGetOption`. */
enum ZovaCgiOption : int {
    ZOVA_CGI_OPTION_SKIP_CHECK_IP = 1,
    ZOVA_CGI_OPTION_WEBAPI = 6,
    ZOVA_CGI_OPTION_APP = 7,
    ZOVA_CGI_OPTION_TIMEOUT = 10,
};

/** Prepares the record for a web request: session directory, idle time, address check. 0 on success. */
int ZovaCgiInit(const char* unused, ZovaCgi* cgi);
/** Prepares the record without a web request. 0 on success. */
int ZovaCgiInitEx(ZovaCgi* cgi, int timeout, int flag, const char* users, const char* unused);
void ZovaCgiFree(ZovaCgi* cgi);
/** Reads the cookies of the process environment into the record; may be called again. */
void ZovaCgiLoadInCookies(ZovaCgi* cgi);
/** Interface language code; owned by the record. Never null. */
const char* ZovaCgiGetLang(ZovaCgi* cgi);
/** Address of the client as text. 0 on success. */
int ZovaCgiGetRemoteIP(char* buffer, int size);
/** A value of the session record as text, or `fallback`; owned by the record. */
const char* ZovaCgiGetOption(ZovaCgi* cgi, int number, const char* fallback);
/** 1 if the login asks for its token with each call. */
int ZovaCgiIsTokenEnable(ZovaCgi* cgi);
/**
 * Checks a session id and fills in the user name and the record's `sessFile`.
 * @return an authorisation result, 1 for a good session, below 0 for a refusal.
 */
int ZovaCgiIsAuthorizedEx(ZovaCgi* cgi, const char* sid, char* user, int userSize, const ZovaCgiAuthOptions* options,
                          int unused);
/** User id of a session, (unsigned)-1 if there is none. */
unsigned int ZovaCgiUIDGet(const char* sid);
/** Deciphers an envelope in place; the clear text is never longer. 0 on failure. */
int ZovaCgiDecryptParam(char* text);
/** Deciphers an enciphered parameter line in place, leaves a clear one alone. Null on failure, else `line`. */
char* ZovaCgiDetectAndDecryptParamLine(char* line);

}  // extern "C"
