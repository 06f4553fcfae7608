#pragma once

#include <string>
#include <string_view>

namespace reference {

/** A text that is wiped when it goes. */
struct Secret {
    Secret() = default;
    Secret(const Secret&) = delete;
    Secret& operator=(const Secret&) = delete;
    ~Secret();

    std::string text;
};

/** The ciphers of the crypto module, which is opened at the first call. All fail cleanly without it. */
namespace crypto {

constexpr size_t kKeySize = 32;
constexpr size_t kNonceSize = 12;
constexpr size_t kTagSize = 16;

/** AES-256-GCM; `sealed` is the cipher text with its tag behind it. `plain` is set on success only. */
bool OpenSealed(std::string_view key, std::string_view nonce, std::string_view additional, std::string_view sealed,
                std::string& plain);

/** RSA-OAEP with SHA-256: a key of `kKeySize` bytes. */
bool UnwrapKey(std::string_view pem, std::string_view wrapped, std::string& key);

/** A fresh RSA private key of 3072 bits as PEM. */
bool MakePrivateKey(std::string& pem);

/** The public half as DER SubjectPublicKeyInfo. */
bool PublicKey(std::string_view pem, std::string& der);

/** 32 bytes. */
bool HmacSha256(std::string_view key, std::string_view data, std::string& digest);

/** 32 bytes. */
bool Sha256(std::string_view data, std::string& digest);

/** scrypt, 32 bytes; slow by intent. */
bool Scrypt(std::string_view password, std::string_view salt, std::string& key);

}  // namespace crypto

}  // namespace reference
