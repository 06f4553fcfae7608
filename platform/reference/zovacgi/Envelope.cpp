#include "zovacgi/Envelope.h"

#include "common/Base64.h"
#include "common/Crypto.h"
#include "common/DeviceKeys.h"

namespace reference {

namespace {

constexpr char kVersion = 1;
constexpr std::string_view kAdditionalData = "zova-envelope-1";
constexpr std::string_view kPairName = "__cIpHeRtExT=";

bool IsUrlSafe(std::string_view text) {
    for (char byte : text) {
        const bool isLetter = (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z');
        if (!isLetter && !(byte >= '0' && byte <= '9') && byte != '-' && byte != '_') {
            return false;
        }
    }
    return true;
}

}  // namespace

bool SplitEnvelope(std::string_view bytes, Envelope& envelope) {
    constexpr size_t kHeader = 3;
    if (bytes.size() < kHeader || bytes[0] != kVersion) {
        return false;
    }
    const size_t length =
        static_cast<size_t>(static_cast<unsigned char>(bytes[1])) << 8 | static_cast<unsigned char>(bytes[2]);
    if (length == 0 || bytes.size() - kHeader < length + crypto::kNonceSize + crypto::kTagSize) {
        return false;
    }
    envelope.wrappedKey = bytes.substr(kHeader, length);
    envelope.nonce = bytes.substr(kHeader + length, crypto::kNonceSize);
    envelope.sealed = bytes.substr(kHeader + length + crypto::kNonceSize);
    return true;
}

bool IsEncipheredLine(std::string_view line, std::string_view& cipherText) {
    if (line.substr(0, kPairName.size()) != kPairName) {
        return false;
    }
    cipherText = line.substr(kPairName.size());
    return IsUrlSafe(cipherText);
}

bool OpenEnvelope(std::string_view cipherText, std::string& plain) {
    std::string bytes;
    Envelope envelope;
    if (!Base64Decode(cipherText, Base64Alphabet::kUrl, bytes) || !SplitEnvelope(bytes, envelope)) {
        return false;
    }
    Secret pem;
    Secret key;
    if (!ReadEnvelopeKey(pem.text) || !crypto::UnwrapKey(pem.text, envelope.wrappedKey, key.text)) {
        return false;
    }
    std::string opened;
    if (!crypto::OpenSealed(key.text, envelope.nonce, kAdditionalData, envelope.sealed, opened) ||
        opened.find('\0') != std::string::npos) {
        return false;
    }
    plain = std::move(opened);
    return true;
}

}  // namespace reference
