#include "zovasharing/LinkPassword.h"

#include "common/Crypto.h"
#include "common/Hex.h"
#include "common/RandomBytes.h"
#include "zovacgi/SessionId.h"

namespace reference::sharing {

namespace {

constexpr std::string_view kMethod = "scrypt$";
constexpr size_t kSaltBytes = 16;
constexpr size_t kSaltDigits = 2 * kSaltBytes;

/** The salt's hex text is what salts. */
std::string TextOf(std::string_view password, std::string_view salt) {
    std::string key;
    if (!crypto::Scrypt(password, salt, key)) {
        return "";
    }
    return std::string(kMethod) + std::string(salt) + "$" + HexText(key);
}

}  // namespace

std::string MakePasswordText(std::string_view password) {
    char salt[kSaltBytes];
    return FillRandom(salt, sizeof(salt)) ? TextOf(password, HexText(std::string_view(salt, sizeof(salt)))) : "";
}

PasswordResult CheckPassword(std::string_view password, std::string_view kept) {
    if (kept.size() <= kMethod.size() + kSaltDigits || kept.substr(0, kMethod.size()) != kMethod) {
        return PasswordResult::kFailed;
    }
    const std::string text = TextOf(password, kept.substr(kMethod.size(), kSaltDigits));
    if (text.empty()) {
        return PasswordResult::kFailed;
    }
    return EqualSecrets(text, kept) ? PasswordResult::kGood : PasswordResult::kWrong;
}

}  // namespace reference::sharing
