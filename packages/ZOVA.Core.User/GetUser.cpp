#include "GetUser.h"

#include <string>
#include <vector>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/PlatformAccounts.h"
#include "../common/Text.h"
#include "Account.h"
#include "Groups.h"
#include "UserErrors.h"

namespace package {
namespace {

constexpr char kName[] = "name";

/** Whose account is asked for; false with the error in the response. */
bool ReadName(ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::string& out) {
    const auto name = request->GetAndCheckString(kName, ZOVA::APIRequest::PARAM_OPTIONAL);
    if (name.IsInvalid() || name.IsReset() || (name.IsSet() && !IsAccountName(name.Get()))) {
        RefuseParameter(response, kName);
        return false;
    }
    const std::string self = request->GetLoginUserName();
    out = name.Get(self);
    if (out.empty() || (out != self && !request->IsAdmin())) {
        response->SetError(ZOVA::WEBAPI_ERR_NO_PERMISSION, Json::Value());
        return false;
    }
    return true;
}

Json::Value Describe(const Account& account, const std::vector<std::string>& groups) {
    Json::Value data(Json::objectValue);
    data["name"] = ValidUtf8(account.name);
    data["uid"] = account.uid;
    data["gid"] = account.gid;
    data["group"] = ValidUtf8(GroupName(account.gid));
    data["groups"] = Json::Value(Json::arrayValue);
    for (const std::string& group : groups) {
        data["groups"].append(ValidUtf8(group));
    }
    data["home"] = ValidUtf8(account.home);
    data["shell"] = ValidUtf8(account.shell);
    data["description"] = ValidUtf8(account.description);
    data["is_admin"] = IsAdministrator(account.name.c_str());
    return data;
}

void Answer(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::string name;
    if (!ReadName(request, response, name)) {
        return;
    }
    Account account;
    const AccountResult result = FindAccount(name, account);
    std::vector<std::string> groups;
    if (result == AccountResult::kNone) {
        response->SetError(USER_ERR_NO_SUCH_USER, Json::Value());
    } else if (result == AccountResult::kFailed || !GroupNames(account.name, account.gid, groups)) {
        response->SetError(USER_ERR_DATABASE, Json::Value());
    } else {
        response->SetSuccess(Describe(account, groups));
    }
}

}  // namespace

void GetUser(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("get", response, [&] { Answer(request, response); });
}

}  // namespace package
