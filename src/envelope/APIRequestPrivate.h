#pragma once

#include <json/value.h>

#include <string>

#include "webapi/APIBase.h"
#include "webapi/APIParameter.h"
#include "webapi/APIRequest.h"
#include "zovasharing.h"

namespace ZOVA {

/** A call by its three names. */
struct CallName {
    std::string api;
    int version = 0;
    std::string method;
};

/** The nine sections of a request, and the sharing records that do not travel with them. */
class APIRequestPrivate : public APIBase {
public:
    explicit APIRequestPrivate(APIRequest* owner);
    APIRequestPrivate(const APIRequestPrivate& other, APIRequest* owner);
    APIRequestPrivate(const APIRequestPrivate&) = delete;
    APIRequestPrivate& operator=(const APIRequestPrivate&) = delete;
    ~APIRequestPrivate() override;

    /** The private object of a request, for the framework's own code. */
    static APIRequestPrivate& Of(APIRequest& request) { return *request.d; }

    /** Takes "api", "version" and "method" from parameters, each if present. */
    void SetAPIDesc(const Json::Value& params);

    /** Makes the request name exactly this call again, whatever parameters brought since. */
    void SetCallName(const CallName& call);

    /** A member of "private"; null where there is none. Asking creates it with null, which shows when serialised. */
    Json::Value PrivateValue(const char* key);
    void SetPrivateValue(const char* key, const Json::Value& value);

    // Parsers of the environment. None logs.
    void InitCookie();
    void InitRequestMethod();
    void InitURL();
    bool ParseProtocol();
    bool ParseHostAndPort();
    bool ParsePathAndName();

    /** Classifies the client by its headers, once. */
    void InitUA();
    /** A flag of the section "userAgent", after `InitUA`; false where there is none. */
    bool UserAgentFlag(const char* key);

    /** Reads the sharing link of the request and asks the sharing database about it. */
    void InitSharing();
    /** Has the URL of sharing links worked out, once per store. */
    void InitSharingURL();

    /**
     * Deciphers a parameter object in place: its cipher text, then its AES pair, then the object "webapi" in it in the
     * same way, at most `Json::kMaximumDepth` levels down. A value that is no object holds nothing enciphered.
     * @return false at the first that cannot be deciphered; what was taken out by then stays out. Logs nothing.
     */
    bool DecryptParam(Json::Value& params);
    /** The AES pair of a parameter object, in place, as `DecipherAES`. */
    bool DecryptAESParam(Json::Value& params);

    unsigned int GetLoginUID();

    template <class T>
    APIParameter<T> GetAndCheckParam(const std::string& key, bool required, Json::ValueType type,
                                     typename APIParameter<T>::Validator validator) const;
    APIParameter<Json::Value> GetAndCheckUnitArrayParam(const std::string& key, bool required,
                                                        APIParameter<Json::Value>::Validator validator) const;

    APIRequest* owner;
    Json::Value spare;
    std::string sharingId;
    std::string sharingSid;
    sharing::record::Entry sharingEntry;
    sharing::record::Session sharingSession;
    sharing::record::Token sharingToken;
    sharing::_tag_SHARING_URL_TYPE sharingUrlType;
};

}  // namespace ZOVA
