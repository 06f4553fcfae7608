#pragma once

// libzovacgi.so.6: CGI decoding and login sessions.

struct ZovaSzHash;

extern "C" {

/** The CGI context record. All zero before `ZovaCgiInit`; `ZovaCgiFree` gives back what it holds. */
struct ZovaCgi {
    /** Receives form fields. Null until somebody allocates it. */
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

/** How an upload stands. */
enum ZovaCgiUploadStatus : int {
    /** The body goes on. */
    ZOVA_UPLOAD_RUNNING = 0,
    ZOVA_UPLOAD_COMPLETE = 1,
    /** Not in the form that the content type announces. */
    ZOVA_UPLOAD_MALFORMED = -1,
    /** No folder with enough room, or the room ran out. */
    ZOVA_UPLOAD_NO_ROOM = -2,
    /** The body ends before it is complete. */
    ZOVA_UPLOAD_CUT_OFF = -3,
    /** A part file cannot be made or written. */
    ZOVA_UPLOAD_NO_FILE = -4,
    /** Too many parts, or a name, header block or value that is too long. */
    ZOVA_UPLOAD_TOO_LARGE = -5,
    ZOVA_UPLOAD_EMPTY = -6,
    /** Neither multipart with a usable boundary nor a slice. */
    ZOVA_UPLOAD_NO_UPLOAD = -7,
    ZOVA_UPLOAD_NO_PART_REACHED = -8,
    ZOVA_UPLOAD_NO_MEMORY = -9,
};

struct ZovaCgiUploadState {
    /** Bytes of the body taken so far, and its length. */
    unsigned long long readBytes;
    unsigned long long totalBytes;
    int status;
};

/** Told now and then how far an upload has come: bytes taken so far, length of the body. */
using ZovaCgiUploadCallback = void (*)(unsigned long long, unsigned long long);

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

// Uploads. The body of the process's request is read from standard input, by all of these from where the last of them
// stopped; `boundary` receives the text that parts the body. Part files are regular files with mode 0600, owned by the
// identity that the process has then, under names that nobody can guess; the client's file names are no part of them.

/**
 * Reads up to `count` form fields into the record's hash, and no byte beyond them; stops at a file part.
 * @return the number of fields, negative on failure.
 */
int ZovaCgiLoadUploadNumParams(ZovaCgi* cgi, int count, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state,
                               char* boundary, int boundarySize);
/**
 * Reads form fields up to the next file part into the record's hash; a file part that nobody read is passed over.
 * @param name receives the part's field, `value` the client's name of the file, both "" at the end of the body.
 * @return the number of fields, negative on failure.
 */
int ZovaCgiLoadUploadParams(ZovaCgi* cgi, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state, char* boundary,
                            int boundarySize, char* name, int nameSize, char* value, int valueSize);
/**
 * Writes the file part that was reached into a new file in `dir`; its path stands in the record's hash under `name`.
 * @return 1, negative on failure; no file is left then.
 */
int ZovaCgiLoadUploadFileToDir(ZovaCgi* cgi, const char* dir, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state,
                               char* boundary, char* name);
/**
 * Reads the rest of the body: form fields into `params`, and the paths of new files in `dir` into `files`.
 * @return an upload status, 1 on success. Files of a body that failed stand in `files`, or are gone.
 */
int ZovaCgiLoadUploadAll(ZovaSzHash** params, ZovaSzHash** files, const char* dir, int unused);

}  // extern "C"
