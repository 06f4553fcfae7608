#include "Encipher.h"

#include <openssl/evp.h>
#include <openssl/hmac.h>
#include <openssl/rand.h>
#include <openssl/rsa.h>
#include <openssl/x509.h>

#include <memory>
#include <stdexcept>

#include "common/Base64.h"

namespace client {

namespace {

unsigned char* Data(std::string& text) {
    return reinterpret_cast<unsigned char*>(text.data());
}
const unsigned char* Data(std::string_view text) {
    return reinterpret_cast<const unsigned char*>(text.data());
}

void Require(bool good) {
    if (!good) {
        throw std::runtime_error("cannot encipher");
    }
}

using Key = std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>;

}  // namespace

std::string RandomText(size_t size) {
    std::string text(size, '\0');
    Require(RAND_bytes(Data(text), static_cast<int>(size)) == 1);
    return text;
}

std::string Seal(std::string_view key, std::string_view additional, std::string_view plain) {
    const std::string nonce = RandomText(12);
    std::string sealed(plain.size() + 16, '\0');
    const std::unique_ptr<EVP_CIPHER_CTX, decltype(&EVP_CIPHER_CTX_free)> context(EVP_CIPHER_CTX_new(),
                                                                                  EVP_CIPHER_CTX_free);
    int length = 0;
    Require(EVP_EncryptInit_ex(context.get(), EVP_aes_256_gcm(), nullptr, Data(key), Data(nonce)) == 1);
    Require(EVP_EncryptUpdate(context.get(), nullptr, &length, Data(additional), static_cast<int>(additional.size())) ==
            1);
    Require(EVP_EncryptUpdate(context.get(), Data(sealed), &length, Data(plain), static_cast<int>(plain.size())) == 1);
    Require(EVP_EncryptFinal_ex(context.get(), Data(sealed) + length, &length) == 1);
    Require(EVP_CIPHER_CTX_ctrl(context.get(), EVP_CTRL_GCM_GET_TAG, 16, Data(sealed) + plain.size()) == 1);
    return nonce + sealed;
}

std::string Wrap(const std::string& publicKey, std::string_view key) {
    std::string der;
    Require(reference::Base64Decode(publicKey, reference::Base64Alphabet::kAny, der));
    const unsigned char* at = Data(der);
    const Key wrapping(d2i_PUBKEY(nullptr, &at, static_cast<long>(der.size())), EVP_PKEY_free);
    const std::unique_ptr<EVP_PKEY_CTX, decltype(&EVP_PKEY_CTX_free)> context(EVP_PKEY_CTX_new(wrapping.get(), nullptr),
                                                                              EVP_PKEY_CTX_free);
    Require(EVP_PKEY_encrypt_init(context.get()) == 1);
    Require(EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_OAEP_PADDING) == 1);
    Require(EVP_PKEY_CTX_set_rsa_oaep_md(context.get(), EVP_sha256()) == 1);
    size_t size = 0;
    Require(EVP_PKEY_encrypt(context.get(), nullptr, &size, Data(key), key.size()) == 1);
    std::string wrapped(size, '\0');
    Require(EVP_PKEY_encrypt(context.get(), Data(wrapped), &size, Data(key), key.size()) == 1);
    wrapped.resize(size);
    return wrapped;
}

std::string Envelope(const std::string& publicKey, std::string_view plain) {
    const std::string key = RandomText(32);
    const std::string wrapped = Wrap(publicKey, key);
    std::string bytes(1, '\x01');
    bytes += static_cast<char>(wrapped.size() >> 8);
    bytes += static_cast<char>(wrapped.size() & 0xff);
    return bytes + wrapped + Seal(key, "zova-envelope-1", plain);
}

std::string Base64Url(std::string_view bytes) {
    std::string text = reference::Base64Encode(bytes);
    while (!text.empty() && text.back() == '=') {
        text.pop_back();
    }
    for (char& digit : text) {
        digit = digit == '+' ? '-' : digit == '/' ? '_' : digit;
    }
    return text;
}

std::string ForeignPublicKey() {
    const Key key(EVP_RSA_gen(2048u), EVP_PKEY_free);
    std::string der(4096, '\0');
    unsigned char* end = Data(der);
    der.resize(static_cast<size_t>(i2d_PUBKEY(key.get(), &end)));
    return reference::Base64Encode(der);
}

std::string HmacSha256(std::string_view key, std::string_view data) {
    std::string digest(32, '\0');
    unsigned int size = 0;
    Require(HMAC(EVP_sha256(), key.data(), static_cast<int>(key.size()), Data(data), data.size(), Data(digest),
                 &size) != nullptr);
    return digest;
}

}  // namespace client
