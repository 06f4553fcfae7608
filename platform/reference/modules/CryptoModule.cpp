#pragma GCC visibility push(default)
#include "modules/CryptoModule.h"
#pragma GCC visibility pop

#include <openssl/bio.h>
#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/hmac.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>
#include <openssl/x509.h>

#include <climits>
#include <cstring>
#include <memory>

namespace {

template <auto kFree>
struct Freer {
    template <typename Object>
    void operator()(Object* object) const {
        kFree(object);
    }
};

using CipherContext = std::unique_ptr<EVP_CIPHER_CTX, Freer<EVP_CIPHER_CTX_free>>;
using Key = std::unique_ptr<EVP_PKEY, Freer<EVP_PKEY_free>>;
using KeyContext = std::unique_ptr<EVP_PKEY_CTX, Freer<EVP_PKEY_CTX_free>>;
using Stream = std::unique_ptr<BIO, Freer<BIO_free_all>>;

constexpr size_t kKeySize = 32;
constexpr size_t kNonceSize = 12;
constexpr size_t kTagSize = 16;
constexpr int kSmallestKeyBits = 2048;

const unsigned char* Data(ZovaBytes bytes) {
    return reinterpret_cast<const unsigned char*>(bytes.data);
}

unsigned char* Data(char* bytes) {
    return reinterpret_cast<unsigned char*>(bytes);
}

/** Nothing for what is no RSA private key of a good length. Never asks for a pass phrase. */
Key ReadKey(ZovaBytes pem) {
    if (pem.size > INT_MAX) {
        return nullptr;
    }
    const Stream stream(BIO_new_mem_buf(pem.data, static_cast<int>(pem.size)));
    char noPassPhrase[] = "";
    Key key(stream ? PEM_read_bio_PrivateKey(stream.get(), nullptr, nullptr, noPassPhrase) : nullptr);
    if (key && (EVP_PKEY_base_id(key.get()) != EVP_PKEY_RSA || EVP_PKEY_bits(key.get()) < kSmallestKeyBits)) {
        key.reset();
    }
    return key;
}

bool Decrypt(EVP_CIPHER_CTX* context, ZovaBytes key, ZovaBytes nonce, ZovaBytes additional, ZovaBytes sealed,
             char* plain) {
    const int size = static_cast<int>(sealed.size - kTagSize);
    unsigned char tag[kTagSize];
    memcpy(tag, sealed.data + size, kTagSize);
    int length = 0;
    int rest = 0;
    if (EVP_DecryptInit_ex(context, EVP_aes_256_gcm(), nullptr, Data(key), Data(nonce)) != 1 ||
        (additional.size > 0 &&
         EVP_DecryptUpdate(context, nullptr, &length, Data(additional), static_cast<int>(additional.size)) != 1)) {
        return false;
    }
    length = 0;
    return (size == 0 || EVP_DecryptUpdate(context, Data(plain), &length, Data(sealed), size) == 1) &&
           EVP_CIPHER_CTX_ctrl(context, EVP_CTRL_GCM_SET_TAG, kTagSize, tag) == 1 &&
           EVP_DecryptFinal_ex(context, tag, &rest) == 1 && length == size && rest == 0;
}

}  // namespace

int ZovaCryptoOpenSealed(ZovaBytes key, ZovaBytes nonce, ZovaBytes additional, ZovaBytes sealed, char* plain) {
    if (key.size != kKeySize || nonce.size != kNonceSize || sealed.size < kTagSize || sealed.size > INT_MAX ||
        additional.size > INT_MAX) {
        return -1;
    }
    const CipherContext context(EVP_CIPHER_CTX_new());
    if (context && Decrypt(context.get(), key, nonce, additional, sealed, plain)) {
        return 0;
    }
    OPENSSL_cleanse(plain, sealed.size - kTagSize);
    return -1;
}

int ZovaCryptoUnwrapKey(ZovaBytes pem, ZovaBytes wrapped, char* key, size_t size) {
    constexpr size_t kLargestModulus = 1024;
    const Key privateKey = ReadKey(pem);
    const KeyContext context(privateKey ? EVP_PKEY_CTX_new(privateKey.get(), nullptr) : nullptr);
    unsigned char opened[kLargestModulus];
    size_t length = sizeof(opened);
    const bool good = context && wrapped.size == static_cast<size_t>(EVP_PKEY_size(privateKey.get())) &&
                      wrapped.size <= kLargestModulus && EVP_PKEY_decrypt_init(context.get()) == 1 &&
                      EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_OAEP_PADDING) == 1 &&
                      EVP_PKEY_CTX_set_rsa_oaep_md(context.get(), EVP_sha256()) == 1 &&
                      EVP_PKEY_decrypt(context.get(), opened, &length, Data(wrapped), wrapped.size) == 1 &&
                      length == size;
    if (good) {
        memcpy(key, opened, size);
    }
    OPENSSL_cleanse(opened, sizeof(opened));
    return good ? 0 : -1;
}

int ZovaCryptoMakePrivateKey(unsigned int bits, char* pem, size_t size) {
    const Key key(EVP_RSA_gen(bits));
    const Stream stream(BIO_new(BIO_s_secmem()));
    if (!key || !stream ||
        PEM_write_bio_PrivateKey(stream.get(), key.get(), nullptr, nullptr, 0, nullptr, nullptr) != 1) {
        return -1;
    }
    char* text = nullptr;
    const long length = BIO_get_mem_data(stream.get(), &text);
    if (length <= 0 || static_cast<size_t>(length) > size) {
        return -1;
    }
    memcpy(pem, text, static_cast<size_t>(length));
    return static_cast<int>(length);
}

int ZovaCryptoPublicKey(ZovaBytes pem, char* der, size_t size) {
    const Key key = ReadKey(pem);
    if (!key) {
        return -1;
    }
    const int length = i2d_PUBKEY(key.get(), nullptr);
    if (length <= 0 || static_cast<size_t>(length) > size) {
        return -1;
    }
    unsigned char* end = Data(der);
    return i2d_PUBKEY(key.get(), &end);
}

int ZovaCryptoHmacSha256(ZovaBytes key, ZovaBytes data, char* digest) {
    unsigned int length = 0;
    if (key.size > INT_MAX || HMAC(EVP_sha256(), key.data, static_cast<int>(key.size), Data(data), data.size,
                                   Data(digest), &length) == nullptr) {
        return -1;
    }
    return 0;
}

int ZovaCryptoSha256(ZovaBytes data, char* digest) {
    return EVP_Digest(data.data, data.size, Data(digest), nullptr, EVP_sha256(), nullptr) == 1 ? 0 : -1;
}

int ZovaCryptoScrypt(ZovaBytes password, ZovaBytes salt, char* out, size_t size) {
    constexpr uint64_t kCost = 1 << 15;
    constexpr uint64_t kBlockSize = 8;
    constexpr uint64_t kLanes = 1;
    constexpr uint64_t kMostMemory = 64 << 20;
    return EVP_PBE_scrypt(password.data, password.size, Data(salt), salt.size, kCost, kBlockSize, kLanes, kMostMemory,
                          Data(out), size) == 1
               ? 0
               : -1;
}
