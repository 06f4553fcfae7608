#pragma once

#include <string>
#include <string_view>

namespace reference {

/** Random bytes of a session id or token, and its length as text. */
constexpr size_t kSecretBytes = 32;
constexpr size_t kSecretDigits = 2 * kSecretBytes;

/** Exactly 64 lower-case hex digits: so no id can be a path, be hidden, or be long. */
bool IsSessionId(std::string_view text);

/** A fresh secret of that form; "" if the random source fails. */
std::string MakeSecret();

/** Compares in a time that depends on the lengths alone. */
bool EqualSecrets(std::string_view first, std::string_view second);

}  // namespace reference
