#pragma once

// What the module zova-https.so exports. It stands apart so that libcurl is mapped only where a peer is asked.

#include <cstddef>
#include <cstdint>

enum ZovaHttpsResult {
    ZOVA_HTTPS_GOOD = 0,
    /** libcurl does not take the request, or has no memory. */
    ZOVA_HTTPS_FAILED = 1,
    /** No connection: unknown name, nobody listens. */
    ZOVA_HTTPS_NO_CONNECTION = 2,
    /** No TLS, or a certificate that was not asked for. */
    ZOVA_HTTPS_NOT_TRUSTED = 3,
    ZOVA_HTTPS_TIMEOUT = 4,
    /** The connection ended too early, or what came is no HTTP answer. */
    ZOVA_HTTPS_BROKEN = 5,
    /** `write` took no more, or the answer's header lines are too long. */
    ZOVA_HTTPS_TOO_LARGE = 6,
    /** `read` failed. */
    ZOVA_HTTPS_NO_BODY = 7,
};

struct ZovaHttpsRequest {
    const char* url;
    /** "::ADDRESS:" where the connection goes in place of the URL's host; null for none. */
    const char* connectTo;
    /** "sha256//BASE64" of the only public key that is taken; null for any. */
    const char* pin;
    /** Certificates in PEM one of which has to vouch for the server's; empty: it need not be vouched for. */
    const char* authority;
    size_t authoritySize;
    const char* contentType;
    uint64_t bodySize;
    /** Gives the next bytes of the body, at least one; 0 or less: there are none. */
    long (*read)(void* context, char* buffer, size_t size);
    /** Takes bytes of the answer's body; not 0: no more are wanted. */
    int (*write)(void* context, const char* data, size_t size);
    void* context;
    /** From the last byte of the request to the last of the answer. */
    long answerSeconds;
};

extern "C" {

/**
 * One POST over HTTPS, to the URL's host and no other. The name in the certificate has to be the host in any case.
 * @param status receives the HTTP status of a whole answer.
 * @return a ZovaHttpsResult.
 */
int ZovaHttpsPost(const ZovaHttpsRequest* request, long* status);

}  // extern "C"
