#include "ListUsers.h"

#include <algorithm>
#include <cstddef>
#include <limits>
#include <vector>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/PlatformAccounts.h"
#include "../common/Text.h"
#include "Account.h"
#include "UserErrors.h"

namespace package {
namespace {

constexpr int kDefaultLimit = 100;
constexpr int kHighestLimit = 1000;

Json::Value Describe(const Account& account) {
    Json::Value user(Json::objectValue);
    user["name"] = ValidUtf8(account.name);
    user["uid"] = account.uid;
    user["gid"] = account.gid;
    user["home"] = ValidUtf8(account.home);
    user["description"] = ValidUtf8(account.description);
    user["is_admin"] = IsAdministrator(account.name.c_str());
    return user;
}

void Answer(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    int offset = 0;
    int limit = kDefaultLimit;
    if (!ReadInteger(request, response, "offset", 0, std::numeric_limits<int>::max(), offset) ||
        !ReadInteger(request, response, "limit", 1, kHighestLimit, limit)) {
        return;
    }
    std::vector<Account> accounts;
    if (!ListAccounts(accounts)) {
        response->SetError(USER_ERR_DATABASE, Json::Value());
        return;
    }
    const std::size_t begin = std::min<std::size_t>(offset, accounts.size());
    const std::size_t end = std::min<std::size_t>(begin + limit, accounts.size());
    Json::Value data(Json::objectValue);
    data["total"] = Json::UInt64(accounts.size());
    data["offset"] = offset;
    data["users"] = Json::Value(Json::arrayValue);
    for (std::size_t at = begin; at < end; ++at) {
        data["users"].append(Describe(accounts[at]));
    }
    response->SetSuccess(data);
}

}  // namespace

void ListUsers(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("list", response, [&] { Answer(request, response); });
}

}  // namespace package
