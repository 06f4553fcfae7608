#pragma once

#include <string>
#include <string_view>

/** What clients do: the other side of the ciphers, straight on OpenSSL. */
namespace client {

std::string RandomText(size_t size);

/** Nonce, cipher text and tag of AES-256-GCM. */
std::string Seal(std::string_view key, std::string_view additional, std::string_view plain);

/** RSA-OAEP with SHA-256; the public key is base64 of its SubjectPublicKeyInfo. */
std::string Wrap(const std::string& publicKey, std::string_view key);

/** The bytes of an envelope. */
std::string Envelope(const std::string& publicKey, std::string_view plain);

std::string Base64Url(std::string_view bytes);

/** A fresh RSA public key of another device, of 2048 bits. */
std::string ForeignPublicKey();

std::string HmacSha256(std::string_view key, std::string_view data);

}  // namespace client
