#include "zovacgi/SessionId.h"

#include "common/Hex.h"
#include "common/RandomBytes.h"

namespace reference {

bool IsSessionId(std::string_view text) {
    if (text.size() != kSecretDigits) {
        return false;
    }
    for (char digit : text) {
        if (!((digit >= '0' && digit <= '9') || (digit >= 'a' && digit <= 'f'))) {
            return false;
        }
    }
    return true;
}

std::string MakeSecret() {
    char bytes[kSecretBytes];
    return FillRandom(bytes, sizeof(bytes)) ? HexText(std::string_view(bytes, sizeof(bytes))) : std::string();
}

bool EqualSecrets(std::string_view first, std::string_view second) {
    if (first.size() != second.size()) {
        return false;
    }
    unsigned char difference = 0;
    for (size_t at = 0; at < first.size(); ++at) {
        difference = static_cast<unsigned char>(difference | (first[at] ^ second[at]));
    }
    return difference == 0;
}

}  // namespace reference
