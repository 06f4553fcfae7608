#pragma once

#include <json/value.h>

#include <string>

#include "APIParameter.h"
#include "Export.h"

namespace ZOVA {

namespace sharing {
enum _tag_SHARING_URL_TYPE : int;
namespace record {
class Entry;
class Session;
class Token;
}  // namespace record
}  // namespace sharing

class APIRequestPrivate;

/** Outcome of authorisation, kept in the request's session. 1 and 2 mean authorised. */
enum _tag_authorized_result_ : int {
    AUTHORIZED_RESULT_IP_MISMATCH = -8,
    AUTHORIZED_RESULT_TOKEN_FAILED = -7,
    AUTHORIZED_RESULT_TOKEN_UNAVAILABLE = -6,
    AUTHORIZED_RESULT_UNAUTHENTICATED = -5,
    AUTHORIZED_RESULT_INVALID = -4,
    AUTHORIZED_RESULT_INTERRUPTED = -3,
    AUTHORIZED_RESULT_REFUSED = -2,
    AUTHORIZED_RESULT_TIMEOUT = -1,
    AUTHORIZED_RESULT_UNDECIDED = 0,
    AUTHORIZED_RESULT_OK = 1,
    AUTHORIZED_RESULT_OK_ALSO = 2,
};

/**
 * One API call: what the web server or the calling process handed in, what was derived from it, and what authorisation
 * found out.
 *
 * All of it, but the sharing records, lives in one JSON object of nine sections ("environ", "cookie", "reqLib",
 * "session", "param", "attr", "url", "userAgent", "private"), so that a request can be written to a pipe or socket
 * with `Serialize` and rebuilt with `Deserialize`.
 *
 * A method gets its request from the dispatcher and does not own it. A request belongs to one thread at a time; a
 * forked child has a copy of its own. No function throws, and none logs unless it says so; whatever a client sent,
 * reading gives the stated default or the type's zero.
 */
class WEBAPI_EXPORT APIRequest {
public:
    enum PARAM_NECESSITY : int { PARAM_REQUIRED = 0, PARAM_OPTIONAL = 1 };

    /**
     * A request from the members "environ", "getParam", "postParam", "reqLib" and "session" of `init`, each if present;
     * other members are ignored. Anything but a non-empty object gives an empty request.
     */
    explicit APIRequest(const Json::Value& init);
    /** A deep copy, sharing records included; the sharing database is not asked again. */
    APIRequest(const APIRequest& other);
    APIRequest& operator=(const APIRequest&) = delete;
    virtual ~APIRequest();

    // ---- filling, for those who run calls ----

    /**
     * Adds environment variables; members that are no text are dropped, a later value of a name wins. Then the
     * cookies, the request method and the sharing context are read again, also if `env` brought nothing.
     */
    void InitEnv(const Json::Value& env);
    /**
     * Adds parameters from the members "getParam" and then "postParam" of `init`, so that the latter win. With
     * `clear` all earlier parameters go first. Enciphered members of either are deciphered before; what cannot be
     * deciphered is left out, and the rest is taken. "api", "version" and "method" name the call from then on.
     */
    void InitParam(const Json::Value& init, bool clear);
    /** Replaces the description of the called API; anything but a non-empty object leaves none. */
    void InitAPIInfo(const Json::Value& info);
    /** Replaces the session; anything but a non-empty object leaves none. */
    void InitSession(const Json::Value& session);
    /** The nine sections; a reference into the request. */
    const Json::Value& Serialize() const;
    /** Swaps the sections with `in`, unchecked, and reads the sharing context again. */
    void Deserialize(Json::Value& in);

    // ---- the call ----

    /** Name of the called API, or "". */
    std::string GetAPIClass();
    /** Version of the call, or 0. */
    int GetAPIVersion();
    /** Name of the called method, or "". */
    std::string GetAPIMethod();
    /** 0 unknown, 1 GET, 2 POST, 3 HEAD. */
    int GetRequestMethod();
    /** A member of the called API's description, "runAs" or a key of the package's own; for "" all of it. */
    Json::Value GetAPIInfo(const std::string& key, const Json::Value& fallback) const;

    // ---- environment, parameters, cookies, attributes ----

    /** Whether the variable is there, even if empty. */
    bool HasEnv(const std::string& key) const;
    /** A CGI variable; all of them as an object for "". Names that begin with HTTP_ hold client input. */
    Json::Value GetEnv(const std::string& key, const Json::Value& fallback) const;

    /** Whether the parameter is there, even if null. */
    bool HasParam(const std::string& key) const;
    /** A parameter as the client sent it, of any JSON type; all of them for "". */
    Json::Value GetParam(const std::string& key, const Json::Value& fallback) const;
    /** As `GetParam`, without a copy: valid until the request changes, and as long as `fallback` lives. */
    const Json::Value& GetParamRef(const std::string& key, const Json::Value& fallback) const;

    /** Whether the client sent the cookie, even if empty. */
    bool HasCookie(const std::string& key) const;
    /** A cookie's value, percent-decoded; `fallback` if there is none or it is no text. */
    std::string GetCookie(const std::string& key, const std::string& fallback) const;
    /** @return false for an empty key. The client does not see it: that is `APIResponse::AddCookie`. */
    bool SetCookie(const std::string& key, const std::string& value);

    /** Attributes are free values that whoever runs a call hands on with it; no client can set one. */
    bool HasAttr(const std::string& key) const;
    /** An attribute, or all of them for "". */
    Json::Value GetAttr(const std::string& key, const Json::Value& fallback) const;
    /** Stores a copy; an empty key is ignored. */
    void SetAttr(const std::string& key, const Json::Value& value);

    // ---- typed parameters: see APIParameter for what comes back ----

    /** An integer of 32 bits. */
    APIParameter<int> GetAndCheckInt(const std::string& key, PARAM_NECESSITY necessity,
                                     APIParameter<int>::Validator validator = nullptr) const;
    /** true or false; no number. */
    APIParameter<bool> GetAndCheckBool(const std::string& key, PARAM_NECESSITY necessity,
                                       APIParameter<bool>::Validator validator = nullptr) const;
    /** Any number. */
    APIParameter<double> GetAndCheckReal(const std::string& key, PARAM_NECESSITY necessity,
                                         APIParameter<double>::Validator validator = nullptr) const;
    /** A text, of any bytes. */
    APIParameter<std::string> GetAndCheckString(const std::string& key, PARAM_NECESSITY necessity,
                                                APIParameter<std::string>::Validator validator = nullptr) const;
    /** An array; its elements are not looked at. */
    APIParameter<Json::Value> GetAndCheckArray(const std::string& key, PARAM_NECESSITY necessity,
                                               APIParameter<Json::Value>::Validator validator = nullptr) const;
    /** An object; its members are not looked at. */
    APIParameter<Json::Value> GetAndCheckObject(const std::string& key, PARAM_NECESSITY necessity,
                                                APIParameter<Json::Value>::Validator validator = nullptr) const;
    /** An integer of T's range; T is `long long`, `unsigned int` or `unsigned long long`. */
    template <class T>
    APIParameter<T> GetAndCheckIntegral(const std::string& key, PARAM_NECESSITY necessity,
                                        typename APIParameter<T>::Validator validator = nullptr) const;
    /** As `GetAndCheckArray`, but a single value counts as an array of that one element. */
    APIParameter<Json::Value> GetAndCheckUnitArray(const std::string& key, PARAM_NECESSITY necessity,
                                                   APIParameter<Json::Value>::Validator validator = nullptr) const;

    // ---- the URL by which the client reached the server, read from the environment at the first question ----

    /** "http" or "https". */
    std::string GetURLProto(const std::string& fallback);
    /** Host as the client named it; an IPv6 literal keeps its brackets. */
    std::string GetURLHost(const std::string& fallback);
    /** Port as the client named it, else 80 or 443; text that is no number reads as 0. */
    int GetURLPort(int fallback);
    /** Path up to and including its last "/". */
    std::string GetURLPath(const std::string& fallback);
    /** What stands behind the last "/" of the path, possibly nothing. */
    std::string GetURLName(const std::string& fallback);

    // ---- the client's device, told once by its headers; any client can claim any of these ----

    /** A mobile device whose user did not ask for the desktop view (the cookie "forceDesktop" is a number but 0). */
    bool IsMobile();
    /** A phone, tablet or the like. */
    bool IsMobileDevice();
    /** An iPhone or iPod; true for an iPad as well. */
    bool IsIPhone();
    /** Android that does not name one of the families of Apple. */
    bool IsAndroid();
    /** A mobile device with a browser of Microsoft. */
    bool IsIEMobile();
    /** An iPad that says so; one that asks for desktop pages calls itself a Mac. */
    bool IsIPad();
    /** A PlayBook tablet. */
    bool IsPlayBook();
    /** A BlackBerry with a WebKit browser. */
    bool IsBlackBerry6();
    /** A browser that names WebKit, mobile or not; nearly all do, for compatibility. */
    bool IsWebKit();
    /** One of the device families above, with WebKit: it can run the web application. */
    bool IsSupportWebApp();

    // ---- who calls ----

    /** Login name; "" if nobody is logged in. */
    std::string GetLoginUserName() const;
    /** For those who authorise: names the caller. */
    void SetLoginUserName(const std::string& name);
    /** Whether the caller is a member of the administrators' group. */
    bool IsAdmin() const;
    /** User id of the login session, asked of the system once; 4294967295 if nobody is logged in. */
    unsigned int GetLoginUID();
    /** Whether the request passed authorisation. */
    bool IsAuthorized() const;
    /** Whether the session has timed out; true without a session. */
    bool IsTimeout() const;
    /** Idle time of the session, in minutes; 0 without a session. */
    int GetTimeoutDuration() const;
    /** Whether the session may be used from any address; true without a session. */
    bool IsSkipCheckIP() const;
    /** Application of the login, or "". */
    std::string GetApplication() const;
    /** API privilege string of the login, or "". */
    std::string GetWebAPIPriv() const;
    /** Path of the login session's file, or "". */
    std::string GetSessionFilePath() const;
    /** Id of the login session: the cookie "id". A secret: not for logs. */
    std::string GetSessionID() const;
    /**
     * Id of the device access token, or null. The pointer leads into the process environment and holds until the
     * variable "zovaAccessToken" changes. A secret: not for logs.
     */
    const char* GetZovaAccessTokenID() const;
    /** Whether the session's application privilege is exactly `app`. */
    bool HasAppPriv(const std::string& app) const;
    /**
     * The description's "allowUser" as a bit mask, worked out once: admin.local 1, admin.domain 2, admin.ldap 4,
     * normal.local 8, normal.domain 16, normal.ldap 32.
     */
    int GetAllowUser();
    /** Preference directory of the caller; "/tmp" if the system knows none. */
    std::string GetPreferenceDir() const;
    /** Preference directory of a group; "/tmp" if the system knows none. */
    std::string GetGroupPreferenceDir(const std::string& group) const;
    /** For those who authorise: keeps the outcome in the session. */
    void SetAuthResult(_tag_authorized_result_ result);
    /** The outcome; -4 before authorisation. */
    _tag_authorized_result_ GetAuthResult() const;
    /** Client address as the CGI library worked it out, or "". */
    std::string GetRemoteIP() const;
    /** Interface language code; "enu" without a session. */
    std::string GetUILanguage() const;
    /** Whether the login asks for a token with each call. */
    bool IsTokenEnable() const;
    /** Always false: no device runs in demo mode. */
    bool IsDemoMode() const;

    // ---- kind of request ----

    /** Whether the body is a multipart form, or a slice of an upload. */
    bool IsUploadRequest() const;
    /** Whether the body is one slice of an upload. */
    bool IsSliceUploadRequest() const;
    /** Whether this process is a background task's. */
    bool IsPollingTask() const;
    /** Full id of the background task, or "". */
    std::string GetPollingTaskId() const;

    // ---- sharing links ----

    /** Whether the request came through a sharing link; the link need not be a good one. */
    bool IsSharing() const;
    /** Hash of the sharing link, or "". */
    std::string GetSharingID() const;
    /** Session id of the link's visitor, or "". A secret: not for logs. */
    std::string GetSharingSID() const;
    /** Records of link, session and token as the sharing database gave them; of an unknown one an empty record. */
    sharing::record::Entry GetSharingEntry() const;
    sharing::record::Session GetSharingSession() const;
    sharing::record::Token GetSharingToken() const;
    /**
     * URL under which the sharing links of this server are reached, worked out at the first question from the URL of
     * this request. `fallback` stands in only for a store that cannot hold it: "" comes for a URL that cannot be told.
     */
    std::string GetSharingURL(const std::string& fallback);
    /** Kind of that URL; 0 for a request that was rebuilt from its serialised form with the URL in it. */
    sharing::_tag_SHARING_URL_TYPE GetSharingURLType();

private:
    friend class APIRequestPrivate;
    APIRequestPrivate* d;
};

}  // namespace ZOVA
