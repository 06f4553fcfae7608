#pragma once

// libzovacredential.so.6: requests to peer devices and their ciphers.

#include <json/value.h>

#include <cstdio>
#include <memory>
#include <string>

namespace ZOVA {

class CredRequestUtil {
public:
    /** AES deciphering with the key text; false on failure, `plain` is then left alone. */
    static bool GetDecryptAESString(const std::string& key, const std::string& cipherText, std::string& plain);
};

/** One request to a peer device; owned by the manager that it is queued in. */
class CredRequest {
public:
    class Private;

    explicit CredRequest(std::unique_ptr<Private> data);
    CredRequest(const CredRequest&) = delete;
    CredRequest& operator=(const CredRequest&) = delete;
    ~CredRequest();

    /** How long the peer may take to answer, in seconds. 0 and less leave the library's own limit in place. */
    void SetResponseTimeout(long seconds);

private:
    friend class CredRequestMgr;

    std::unique_ptr<Private> data;
};

/**
 * Requests to peer devices, in the name of the user of ZOVA_WEBAPI_USERNAME in the process environment. A peer is named
 * by a number that the device's administrator gave it.
 */
class CredRequestMgr {
public:
    CredRequestMgr();
    CredRequestMgr(const CredRequestMgr&) = delete;
    CredRequestMgr& operator=(const CredRequestMgr&) = delete;
    ~CredRequestMgr();

    /** Queues a call of the peer's web API. @return its number, negative on failure. */
    int AddWebAPIRequest(long peer, const std::string& api, int version, const std::string& method,
                         const Json::Value& params);
    /**
     * The same for a call whose body is read from `in` when it is sent.
     * @param headers "Content-Type" and "Content-Length" of the body, texts.
     * @param in read from where it stands; not owned.
     * @param out has to be null: the answer is kept for `GetResponse`.
     */
    int AddRelayRequest(long peer, const std::string& api, int version, const std::string& method,
                        const Json::Value& headers, FILE* in, FILE* out);
    /** The request of that number, null if there is none. */
    CredRequest* GetRequest(int number);
    /** Carries out the queued requests in their order; false at the first that fails. */
    bool Run();
    /** The peer's answer as it came; "" without one. */
    std::string GetResponse(int number) const;
    /** The reason of the last failure, 0 if there was none. */
    int GetError() const;

private:
    class Private;

    std::unique_ptr<Private> data;
};

}  // namespace ZOVA
