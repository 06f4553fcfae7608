#pragma once

#include <json/value.h>

#include <string>

#include "Export.h"

namespace ZOVA {

class APIRequest;
class APIResponsePrivate;

/** The error numbers. API libraries may set others of their own; those up to 160 and 500 to 508 are taken. */
enum _tag_WEBAPI_ERR : int {
    WEBAPI_ERR_NONE = 0,
    WEBAPI_ERR_BAD_REQUEST = 101,
    WEBAPI_ERR_NO_SUCH_API = 102,
    WEBAPI_ERR_NO_SUCH_METHOD = 103,
    WEBAPI_ERR_VERSION_NOT_SUPPORTED = 104,
    WEBAPI_ERR_NO_PERMISSION = 105,
    WEBAPI_ERR_SESSION_TIMEOUT = 106,
    WEBAPI_ERR_SESSION_INTERRUPTED = 107,
    WEBAPI_ERR_UPLOAD_FAILED = 108,
    WEBAPI_ERR_RELAY_FAILED = 109,
    WEBAPI_ERR_COMPOUND_BAD_REQUEST = 110,
    WEBAPI_ERR_LIB_LOAD_FAILED = 111,
    WEBAPI_ERR_COMPOUND_STOPPED = 112,
    WEBAPI_ERR_COMPOUND_TRANSFER_REFUSED = 113,
    WEBAPI_ERR_TASK_BAD_GROUP = 114,
    WEBAPI_ERR_UPLOAD_NOT_ALLOWED = 115,
    WEBAPI_ERR_DEMO_NOT_ALLOWED = 116,
    WEBAPI_ERR_INTERNAL = 117,
    WEBAPI_ERR_PROCESS_NAME_FAILED = 118,
    WEBAPI_ERR_NOT_AUTHENTICATED = 119,
    WEBAPI_ERR_METHOD_NOT_IN_TABLE = 121,
    WEBAPI_ERR_SHARING_MINUS5 = 122,
    WEBAPI_ERR_SHARING_MINUS7 = 123,
    WEBAPI_ERR_SHARING_MINUS6 = 124,
    WEBAPI_ERR_SHARING_MINUS1 = 125,
    WEBAPI_ERR_SHARING_NOT_ALLOWED = 126,
    WEBAPI_ERR_SHARING_APP_DENIED = 127,
    WEBAPI_ERR_IP_MISMATCH = 150,
    WEBAPI_ERR_APP_PRIVILEGE = 160,

    POLLING_ERR_UNKNOWN = 500,
    POLLING_ERR_FINISH_FAILED = 501,
    POLLING_ERR_BAD_PARAMETERS = 502,
    POLLING_ERR_BAD_TASK_ID = 503,
    POLLING_ERR_NO_PERMISSION = 505,
    POLLING_ERR_KILL_FAILED = 506,
    POLLING_ERR_NO_SUCH_TASK = 508,
};

/** HTTP status numbers; any other number may be cast to it. */
enum _tag_HTTP_STATUS_CODE : int {
    HTTP_STATUS_OK = 200,
    HTTP_STATUS_NO_CONTENT = 204,
    HTTP_STATUS_PARTIAL_CONTENT = 206,
    HTTP_STATUS_MOVED_PERMANENTLY = 301,
    HTTP_STATUS_FOUND = 302,
    HTTP_STATUS_NOT_MODIFIED = 304,
    HTTP_STATUS_BAD_REQUEST = 400,
    HTTP_STATUS_UNAUTHORIZED = 401,
    HTTP_STATUS_FORBIDDEN = 403,
    HTTP_STATUS_NOT_FOUND = 404,
    HTTP_STATUS_INTERNAL_SERVER_ERROR = 500,
    HTTP_STATUS_SERVICE_UNAVAILABLE = 503,
};

/**
 * The outcome of one API call: error code, the JSON body that the client reads, HTTP headers and cookies, output
 * switches, and functions to run once the answer is out.
 *
 * A method answers by one call of `SetSuccess` or `SetError`; the last call wins and replaces the body as a whole. A
 * method that calls neither answers 117. All state but the functions is one JSON document, so that a response can
 * cross a pipe or socket. A response belongs to one thread; it does not own its request, which must outlive it.
 */
class WEBAPI_EXPORT APIResponse {
public:
    /** `request` may be null, for a response that serves header work only. */
    explicit APIResponse(APIRequest* request);
    APIResponse(const APIResponse&) = delete;
    APIResponse& operator=(const APIResponse&) = delete;
    ~APIResponse();

    // ---- the outcome ----

    /**
     * Sets the outcome. A code other than 0 gives `{"error":{"code":n},"success":false}`, with "errors" beside "code"
     * if `extra` is not null; 0 is a success with `extra` as its data.
     */
    void SetError(int code, const Json::Value& extra);
    /** `{"success":true}`, with "data" unless it is null: an empty object is written out. */
    void SetSuccess(const Json::Value& data);
    /** The last code given; 0 for success and before any. */
    int GetError() const;
    /** A copy of what the client will read; an empty object before the first outcome. */
    Json::Value GetBody() const;

    // ---- headers, cookies, status ----

    /** Whether the header is there, in this spelling. */
    bool HasHeader(const std::string& name) const;
    /** Replaces the header. Names are case-sensitive here: "Content-type" is there from the start. @return false for
     * "". */
    bool SetHeader(const std::string& name, const std::string& value);
    /** The header's value, or `fallback` if it is not there. */
    std::string GetHeader(const std::string& name, const std::string& fallback) const;
    /** All headers, name to value. */
    Json::Value GetHeaders() const;
    /** The finished `Set-Cookie` values, in the order of the calls. */
    Json::Value GetCookies() const;
    /** 200 unless a status was set. */
    _tag_HTTP_STATUS_CODE GetStatus() const;
    /** @return false if it could not be stored. The message travels with the response and is not printed. */
    bool SetStatus(_tag_HTTP_STATUS_CODE code, const std::string& message);
    /**
     * Status 302 to a path on the host that the client named; a URL of another site becomes a path there too.
     * @param url must not be empty: an empty one throws `std::out_of_range`.
     * @return false if the response has no request, or nothing could be stored.
     */
    bool Redirect(const std::string& url);
    /**
     * Adds a cookie; an earlier one of the same key stays beside it.
     * @param key letters, digits, "_" and "-"; anything else is refused and logged.
     * @param value any bytes; goes out percent-encoded.
     * @param path must not be empty.
     * @param expire minutes from now (from the request's parameter "client_time", in seconds since the epoch, if it
     *     has one); 0 for a session cookie, below 0 to delete the cookie at the client.
     * @return false if refused; nothing is added then.
     */
    bool AddCookie(const std::string& key, const std::string& value, const std::string& path, long expire,
                   const std::string& domain, bool secure, bool httpOnly);

    // ---- switches ----

    /** Whether the web entry writes header and body; true unless switched off. */
    bool IsEnableOutput() const;
    /** False says that the output has been written already, by a download for instance. */
    void SetEnableOutput(bool enable);
    /** Whether the web server is to restart; false unless asked for. */
    bool GetHttpdRestart() const;
    /** True makes the web server restart once the answer is out. */
    void SetHttpdRestart(bool restart);
    /** The word of the header "x-request-error", or "". */
    std::string GetServerError() const;
    /** Sets the header: a short word that tells a client's error handler the kind of a refusal. */
    void SetServerError(const std::string& word);
    /** Whether the header exists, even if empty. */
    bool HasServerError() const;

    // ---- work after the answer ----

    using CallbackFunc = void (*)(void*);

    /**
     * Registers a function for the time after the answer, in a detached child and in the order of the calls; a pair
     * of function and argument counts once, a null function not at all. `argument` is not owned. Refused and logged
     * in the API daemon.
     */
    void SetCallbackFunc(CallbackFunc function, void* argument);
    /** The list itself, for `SetCallbackFuncs` of another response. */
    void* GetCallbackFuncs();
    /** Adds each entry of another response's list; null is ignored. */
    void SetCallbackFuncs(void* list);

    // ---- transport ----

    /** The document; a reference into the response. */
    const Json::Value& Serialize() const;
    /** Swaps the document with `in`, unchecked. */
    void Deserialize(Json::Value& in);

private:
    APIResponsePrivate* d;
};

}  // namespace ZOVA
