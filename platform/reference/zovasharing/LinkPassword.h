#pragma once

#include <string>
#include <string_view>

namespace reference::sharing {

/** What is kept of a link's password: "scrypt$<salt>$<key>" in hex; "" if it cannot be made. */
std::string MakePasswordText(std::string_view password);

enum class PasswordResult { kGood, kWrong, kFailed };

PasswordResult CheckPassword(std::string_view password, std::string_view kept);

}  // namespace reference::sharing
