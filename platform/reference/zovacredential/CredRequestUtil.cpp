#include "Seam.h"
#include "common/Base64.h"
#include "common/Crypto.h"

namespace ZOVA {

bool CredRequestUtil::GetDecryptAESString(const std::string& key, const std::string& cipherText, std::string& plain) {
    std::string bytes;
    if (key.size() != reference::crypto::kKeySize ||
        !reference::Base64Decode(cipherText, reference::Base64Alphabet::kAny, bytes) ||
        bytes.size() < reference::crypto::kNonceSize + reference::crypto::kTagSize) {
        return false;
    }
    const std::string_view view(bytes);
    return reference::crypto::OpenSealed(key, view.substr(0, reference::crypto::kNonceSize), "",
                                         view.substr(reference::crypto::kNonceSize), plain);
}

}  // namespace ZOVA
