#pragma once

// What the module zova-crypto.so exports. It stands apart so that OpenSSL is mapped only where a cipher is used.

#include <cstddef>

struct ZovaBytes {
    const char* data;
    size_t size;
};

extern "C" {

/** AES-256-GCM. `plain` has room for `sealed` without its tag of 16 bytes. 0 on success. */
int ZovaCryptoOpenSealed(ZovaBytes key, ZovaBytes nonce, ZovaBytes additional, ZovaBytes sealed, char* plain);
/** RSA-OAEP (SHA-256) with an RSA key of at least 2048 bits; the clear text must have exactly `size` bytes. 0 on
 * success. */
int ZovaCryptoUnwrapKey(ZovaBytes pem, ZovaBytes wrapped, char* key, size_t size);
/** Makes an RSA key. Length of its PEM text in `pem`, negative on failure. */
int ZovaCryptoMakePrivateKey(unsigned int bits, char* pem, size_t size);
/** Length of the DER SubjectPublicKeyInfo in `der`, negative on failure. */
int ZovaCryptoPublicKey(ZovaBytes pem, char* der, size_t size);
/** Writes 32 bytes. 0 on success. */
int ZovaCryptoHmacSha256(ZovaBytes key, ZovaBytes data, char* digest);
/** Writes 32 bytes. 0 on success. */
int ZovaCryptoSha256(ZovaBytes data, char* digest);

/** scrypt with a cost of 2^15, block size 8, one lane: 32 MiB and about a tenth of a second. `size` bytes; 0 on
 * success. */
int ZovaCryptoScrypt(ZovaBytes password, ZovaBytes salt, char* out, size_t size);

}  // extern "C"
