#include "common/Crypto.h"

#include <cstring>

#include "Paths.h"
#include "common/LazyModule.h"
#include "modules/CryptoModule.h"

namespace reference {

Secret::~Secret() {
    explicit_bzero(text.data(), text.size());
}

namespace crypto {

namespace {

constexpr size_t kDigestSize = 32;

LazyModule module(paths::kCryptoModule);

ZovaBytes BytesOf(std::string_view text) {
    return {text.data(), text.size()};
}

}  // namespace

bool OpenSealed(std::string_view key, std::string_view nonce, std::string_view additional, std::string_view sealed,
                std::string& plain) {
    auto* open = module.Find<decltype(ZovaCryptoOpenSealed)>("ZovaCryptoOpenSealed");
    if (open == nullptr || key.size() != kKeySize || nonce.size() != kNonceSize || sealed.size() < kTagSize) {
        return false;
    }
    std::string opened(sealed.size() - kTagSize, '\0');
    if (open(BytesOf(key), BytesOf(nonce), BytesOf(additional), BytesOf(sealed), opened.data()) != 0) {
        return false;
    }
    plain = std::move(opened);
    return true;
}

bool UnwrapKey(std::string_view pem, std::string_view wrapped, std::string& key) {
    auto* unwrap = module.Find<decltype(ZovaCryptoUnwrapKey)>("ZovaCryptoUnwrapKey");
    key.assign(kKeySize, '\0');
    return unwrap != nullptr && unwrap(BytesOf(pem), BytesOf(wrapped), key.data(), key.size()) == 0;
}

bool MakePrivateKey(std::string& pem) {
    constexpr unsigned int kBits = 3072;
    constexpr size_t kLargest = 8192;
    auto* make = module.Find<decltype(ZovaCryptoMakePrivateKey)>("ZovaCryptoMakePrivateKey");
    if (make == nullptr) {
        return false;
    }
    pem.assign(kLargest, '\0');
    const int length = make(kBits, pem.data(), pem.size());
    pem.resize(length > 0 ? static_cast<size_t>(length) : 0);
    return length > 0;
}

bool PublicKey(std::string_view pem, std::string& der) {
    constexpr size_t kLargest = 4096;
    auto* extract = module.Find<decltype(ZovaCryptoPublicKey)>("ZovaCryptoPublicKey");
    if (extract == nullptr) {
        return false;
    }
    der.assign(kLargest, '\0');
    const int length = extract(BytesOf(pem), der.data(), der.size());
    der.resize(length > 0 ? static_cast<size_t>(length) : 0);
    return length > 0;
}

bool HmacSha256(std::string_view key, std::string_view data, std::string& digest) {
    auto* hmac = module.Find<decltype(ZovaCryptoHmacSha256)>("ZovaCryptoHmacSha256");
    digest.assign(kDigestSize, '\0');
    return hmac != nullptr && hmac(BytesOf(key), BytesOf(data), digest.data()) == 0;
}

bool Sha256(std::string_view data, std::string& digest) {
    auto* hash = module.Find<decltype(ZovaCryptoSha256)>("ZovaCryptoSha256");
    digest.assign(kDigestSize, '\0');
    return hash != nullptr && hash(BytesOf(data), digest.data()) == 0;
}

bool Scrypt(std::string_view password, std::string_view salt, std::string& key) {
    auto* scrypt = module.Find<decltype(ZovaCryptoScrypt)>("ZovaCryptoScrypt");
    key.assign(kKeySize, '\0');
    return scrypt != nullptr && scrypt(BytesOf(password), BytesOf(salt), key.data(), key.size()) == 0;
}

}  // namespace crypto

}  // namespace reference
