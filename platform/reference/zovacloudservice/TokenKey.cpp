#include <cstring>

#include "Seam.h"
#include "common/Crypto.h"
#include "common/DeviceKeys.h"
#include "common/Hex.h"

int ZOVACloudServiceZntokenGenerateToken(const char* token, char* out, int size) {
    constexpr size_t kDigits = 32;
    if (token == nullptr || *token == '\0' || out == nullptr || size <= static_cast<int>(kDigits)) {
        return -1;
    }
    reference::Secret secret;
    reference::Secret digest;
    reference::Secret key;
    if (!reference::EnsureDeviceSecret(secret.text) ||
        !reference::crypto::HmacSha256(secret.text, token, digest.text)) {
        return -1;
    }
    key.text = reference::HexText(digest.text);
    memcpy(out, key.text.data(), kDigits);
    out[kDigits] = '\0';
    return 0;
}
