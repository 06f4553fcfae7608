#include <cstdlib>
#include <cstring>
#include <iterator>
#include <string>

#include "auth/UserTag.h"
#include "base/DecimalText.h"
#include "base/Log.h"
#include "webapi/APIAuth.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "webapi/WebEntry.h"
#include "zovaaccesstoken.h"
#include "zovacgi.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr int kLoginOpen = 0;
constexpr int kLoginRequired = 1;
constexpr int kLoginOptional = 2;

constexpr int kUserNameSize = 493;
constexpr int kAuthFlags =
    ZOVA_CGI_AUTH_LOAD | ZOVA_CGI_AUTH_IDLE | ZOVA_CGI_AUTH_ADDRESS | ZOVA_CGI_AUTH_REFRESH | ZOVA_CGI_AUTH_TOKEN;

constexpr int kLowestResult = -8;
/** The error of each authorisation result, from -8 to 2. */
constexpr int kErrorOfResult[] = {
    WEBAPI_ERR_IP_MISMATCH,        // -8
    WEBAPI_ERR_NO_PERMISSION,      // -7
    WEBAPI_ERR_NO_PERMISSION,      // -6
    WEBAPI_ERR_NOT_AUTHENTICATED,  // -5
    WEBAPI_ERR_NO_PERMISSION,      // -4
    WEBAPI_ERR_NO_PERMISSION,      // -3
    WEBAPI_ERR_NO_PERMISSION,      // -2
    WEBAPI_ERR_SESSION_TIMEOUT,    // -1
    WEBAPI_ERR_NO_PERMISSION,      // 0
    WEBAPI_ERR_NONE,               // 1
    WEBAPI_ERR_NONE,               // 2
};

int ErrorOf(int result) {
    const long long index = static_cast<long long>(result) - kLowestResult;
    const bool known = index >= 0 && index < static_cast<long long>(std::size(kErrorOfResult));
    return known ? kErrorOfResult[index] : static_cast<int>(WEBAPI_ERR_NO_PERMISSION);
}

const char* ServerErrorOf(int error) {
    switch (error) {
        case WEBAPI_ERR_SESSION_TIMEOUT:
            return "timeout";
        case WEBAPI_ERR_NOT_AUTHENTICATED:
            return "unauth";
        case WEBAPI_ERR_IP_MISMATCH:
            return "errorip";
        case WEBAPI_ERR_NO_PERMISSION:
            return "noprivilege";
        default:
            return nullptr;
    }
}

/** What the description asks for; anything that is no integer asks for a login. */
int AuthLevel(const APIRequest& request) {
    const Json::Value level = request.GetAPIInfo("authLevel", kLoginRequired);
    const bool integer = level.type() == Json::intValue || level.type() == Json::uintValue;
    return integer && level.isInt() ? level.asInt() : kLoginRequired;
}

/** Idle time of the session in minutes: its own, else the system's. */
int SessionTimeout(ZovaCgi& cgi) {
    const long own = strtol(ZovaCgiGetOption(&cgi, ZOVA_CGI_OPTION_TIMEOUT, "0"), nullptr, 10);
    return own != 0 ? base::ClampToInt(own) : cgi.timeout;
}

bool SkipsAddressCheck(ZovaCgi& cgi) {
    const char* own = ZovaCgiGetOption(&cgi, ZOVA_CGI_OPTION_SKIP_CHECK_IP, nullptr);
    return own == nullptr ? cgi.skipCheckIP == 1 : std::string(own) == "1";
}

/** The session of the process's own request, after the check. */
Json::Value SessionOfLogin(ZovaCgi& cgi, const char* user, int result) {
    Json::Value session(Json::objectValue);
    session["username"] = user;
    session["isAdmin"] = QLIBGroupIsAdminGroupMem(user, 0) == 1;
    session["sessFile"] = cgi.sessFile == nullptr ? "" : cgi.sessFile;
    session["isTimeout"] = result == AUTHORIZED_RESULT_TIMEOUT;
    session["timeout"] = SessionTimeout(cgi);
    session["isSkipCheckIP"] = SkipsAddressCheck(cgi);
    session["uiLang"] = ZovaCgiGetLang(&cgi);
    session["app"] = ZovaCgiGetOption(&cgi, ZOVA_CGI_OPTION_APP, "");
    session["webapi"] = ZovaCgiGetOption(&cgi, ZOVA_CGI_OPTION_WEBAPI, "");
    session["isAuthorized"] = true;
    session["tokenEnable"] = ZovaCgiIsTokenEnable(&cgi);
    return session;
}

/** The same for the request under check, which in a batch is another one. */
Json::Value SessionOfCall(const APIRequest& login, const std::string& privilege) {
    Json::Value session(Json::objectValue);
    session["username"] = login.GetLoginUserName();
    session["isAdmin"] = login.IsAdmin();
    session["sessFile"] = login.GetSessionFilePath();
    session["isTimeout"] = login.IsTimeout();
    session["timeout"] = login.GetTimeoutDuration();
    session["isSkipCheckIP"] = login.IsSkipCheckIP();
    session["uiLang"] = login.GetUILanguage();
    session["app"] = login.GetApplication();
    session["webapi"] = login.GetWebAPIPriv();
    session["isAuthorized"] = login.IsAuthorized();
    session["tokenEnable"] = login.IsTokenEnable();
    session["appPriv"] = privilege;
    return session;
}

Json::ArrayIndex SlotOf(bool allowTimeout) {
    return allowTimeout ? 0 : 1;
}

}  // namespace

// ---- which calls meet the gate ----

bool WebEntry::NeedPermission(APIRequest* call) {
    return call == nullptr || AuthLevel(*call) != kLoginOpen;
}

bool WebEntry::SkipPermission(APIRequest* call) {
    return call != nullptr && AuthLevel(*call) == kLoginOptional;
}

// ---- the authorisation, on the process's own request ----

int WebEntry::Authorize(bool allowTimeout) {
    std::string sid = request->GetSessionID();
    const char* token = request->GetZovaAccessTokenID();
    std::string tokenId = token == nullptr ? "" : token;
    char user[kUserNameSize] = "";
    int result = AUTHORIZED_RESULT_REFUSED;
    if (APIAuth::CheckAccessToken(request)) {
        // A bearer token alone counts, also beside a session id.
        sid.clear();
        tokenId.clear();
        result = request->GetAuthResult();
        request->GetLoginUserName().copy(user, kUserNameSize - 1);
    } else if (sid.empty() && tokenId.empty()) {
        return AUTHORIZED_RESULT_UNAUTHENTICATED;
    }
    if (GetMethodAttr(request, "skipCheckIP")) {
        cgi->skipCheckIP = 1;
    }
    if (!sid.empty()) {
        const ZovaCgiAuthOptions options{kAuthFlags, allowTimeout ? 1 : 0};
        result = ZovaCgiIsAuthorizedEx(cgi, sid.c_str(), user, kUserNameSize, &options, 0);
    }
    if (result < 0) {
        if (tokenId.empty()) {
            return result;
        }
        // A session id that fails can still be rescued by a device token.
        memset(user, 0, sizeof(user));
        const std::string api = request->GetAPIClass();
        const std::string method = request->GetAPIMethod();
        const bool granted = ZovaAccessTokenGrant(&tokenId, api.c_str(), method.c_str(), user, kUserNameSize) >= 0;
        result = granted ? AUTHORIZED_RESULT_OK : AUTHORIZED_RESULT_UNAUTHENTICATED;
    }
    // After a refused token too: the result below refuses the call, whatever the session says.
    setenv("ZOVA_WEBAPI_USERNAME", user, 1);
    request->InitSession(SessionOfLogin(*cgi, user, result));
    return result;
}

int WebEntry::CheckPermission(bool allowTimeout) {
    Json::Value& slot = permCache["permResult"][SlotOf(allowTimeout)];
    const int result = slot.isInt() ? slot.asInt() : Authorize(allowTimeout);
    request->SetAuthResult(static_cast<_tag_authorized_result_>(result));
    if (slot.isNull()) {
        slot = result;
    }
    return ErrorOf(result);
}

// ---- the gate of one call ----

bool WebEntry::CheckPermission(APIRequest* call, APIResponse* answer) {
    const bool allowTimeout = GetMethodAttr(call, "allowTimeout");
    const int error = CheckPermission(allowTimeout);
    if (permCache["permResult"][SlotOf(allowTimeout)] == AUTHORIZED_RESULT_TOKEN_FAILED &&
        AuthLevel(*call) == kLoginRequired) {
        WEBAPI_LOG(LOG_ERR, "Token Authentication Fail.");
    }
    answer->SetError(error, Json::Value());
    if (error != WEBAPI_ERR_NONE) {
        if (const char* word = ServerErrorOf(error)) {
            answer->SetServerError(word);
        }
        return false;
    }

    const std::string user = request->GetLoginUserName();
    const Json::Value& attributes = GetMethod(call->GetAPIClass(), call->GetAPIVersion(), call->GetAPIMethod());
    const Json::Value allowUser = Json::hasMember(attributes, "allowUser")
                                      ? attributes["allowUser"]
                                      : call->GetAPIInfo("allowUser", Json::Value());
    if (!NamesUserTag(allowUser, UserTag(request->IsAdmin(), user))) {
        answer->SetError(WEBAPI_ERR_NO_PERMISSION, Json::Value());
        return false;
    }
    const std::string privilege = Json::asString(call->GetAPIInfo("appPriv", ""));
    if (!privilege.empty() &&
        QLIBAppPrivUserHas(user.c_str(), privilege.c_str(), request->GetRemoteIP().c_str()) == 0) {
        answer->SetError(WEBAPI_ERR_APP_PRIVILEGE, Json::Value());
        return false;
    }
    call->InitSession(SessionOfCall(*request, privilege));
    return true;
}

}  // namespace ZOVA
