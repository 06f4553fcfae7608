#pragma once

#include <json/value.h>

#include <string_view>

#include "common/Accounts.h"

namespace reference {

/**
 * Whether the entry of a privilege ({"users": [...], "groups": [...], "addresses": [...]}) admits the account. Without
 * "addresses" every address will do; with it only one that lies in a listed network.
 */
bool PrivilegeAdmits(const Json::Value& entry, const Account& account, std::string_view address);

}  // namespace reference
