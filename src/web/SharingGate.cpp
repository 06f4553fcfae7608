#include <cstdlib>
#include <ctime>

#include "base/DecimalText.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "webapi/WebEntry.h"
#include "zovacgi.h"
#include "zovasdk.h"
#include "zovasharing.h"

namespace ZOVA {

namespace {

constexpr int kProtectedByUser = 2;
constexpr int kSecondsPerMinute = 60;
constexpr int kDefaultTimeoutMinutes = 15;

/** What the gate makes of a refusal by the sharing library. */
struct Refusal {
    int error;
    _tag_authorized_result_ stored;
};

Refusal RefusalOf(int result) {
    switch (result) {
        case AUTHORIZED_RESULT_TIMEOUT:
            return {WEBAPI_ERR_SHARING_MINUS1, AUTHORIZED_RESULT_TIMEOUT};
        case AUTHORIZED_RESULT_REFUSED:
            return {WEBAPI_ERR_SHARING_NOT_ALLOWED, AUTHORIZED_RESULT_REFUSED};
        case AUTHORIZED_RESULT_UNAUTHENTICATED:
            return {WEBAPI_ERR_SHARING_MINUS5, AUTHORIZED_RESULT_UNAUTHENTICATED};
        case AUTHORIZED_RESULT_TOKEN_UNAVAILABLE:
            return {WEBAPI_ERR_SHARING_MINUS6, AUTHORIZED_RESULT_TOKEN_UNAVAILABLE};
        case AUTHORIZED_RESULT_TOKEN_FAILED:
            return {WEBAPI_ERR_SHARING_MINUS7, AUTHORIZED_RESULT_TOKEN_FAILED};
        case AUTHORIZED_RESULT_IP_MISMATCH:
            return {WEBAPI_ERR_IP_MISMATCH, AUTHORIZED_RESULT_IP_MISMATCH};
        default:
            return {WEBAPI_ERR_BAD_REQUEST, AUTHORIZED_RESULT_TOKEN_FAILED};
    }
}

const char* TextOrNull(const std::string& text) {
    return text.empty() ? nullptr : text.c_str();
}

/** What the sharing library says of the request's link and session. */
int JudgeLink(const APIRequest& call) {
    const std::string id = call.GetSharingID();
    const std::string sid = call.GetSharingSID();
    ZovaSharingCredentials credentials{};
    credentials.sharingId = TextOrNull(id);
    credentials.sessionId = TextOrNull(sid);
    return ZovaSharingIsAuthorized(&credentials);
}

/** Minutes until then, negative only from a whole minute ago on. */
int MinutesUntil(std::int64_t end) {
    std::int64_t left = 0;
    if (__builtin_sub_overflow(end, static_cast<std::int64_t>(time(nullptr)), &left)) {
        return -1;
    }
    return base::ClampToInt(left / kSecondsPerMinute);
}

}  // namespace

bool WebEntry::CheckSharingPermission(APIRequest* call, APIResponse* answer) {
    if (call == nullptr) {
        return false;
    }
    if (!call->IsSharing() || !GetMethodAttr(call, "allowSharing")) {
        answer->SetError(WEBAPI_ERR_SHARING_NOT_ALLOWED, Json::Value());
        call->SetAuthResult(AUTHORIZED_RESULT_INVALID);
        return false;
    }
    const int result = JudgeLink(*call);
    if (result != AUTHORIZED_RESULT_OK) {
        const Refusal refusal = RefusalOf(result);
        answer->SetError(refusal.error, Json::Value());
        call->SetAuthResult(refusal.stored);
        return false;
    }
    const bool agreed = GetMethodAttr(call, "skipSharingAppCheck") || CheckSharingAppPermission(call, answer);
    if (!agreed) {
        answer->SetError(WEBAPI_ERR_SHARING_APP_DENIED, Json::Value());
    } else if (call->GetSharingEntry().get_protect_type() == kProtectedByUser) {
        InitSharingSession(call);
    }
    call->SetAuthResult(AUTHORIZED_RESULT_OK);
    return agreed;
}

void WebEntry::InitSharingSession(APIRequest* call) {
    const sharing::record::Session visitor = call->GetSharingSession();
    ZovaUserRecord* user = nullptr;
    if (ZOVAUserGetByUID(visitor.get_uid(), &user) != 0) {
        return;
    }
    const int minutes = MinutesUntil(visitor.get_timeout());
    setenv("ZOVA_WEBAPI_USERNAME", user->name, 1);
    Json::Value session(Json::objectValue);
    session["appPriv"] = "";
    session["username"] = user->name;
    session["isAdmin"] = QLIBGroupIsAdminGroupMem(user->name, 0) == 1;
    session["sessFile"] = cgi->sessFile == nullptr ? "" : cgi->sessFile;
    session["isTimeout"] = false;
    session["timeout"] = minutes < 0 ? kDefaultTimeoutMinutes : minutes;
    session["isSkipCheckIP"] = call->GetSharingEntry().get_enable_match_ip();
    session["uiLang"] = ZovaCgiGetLang(cgi);
    session["app"] = "";
    session["webapi"] = "";
    session["isAuthorized"] = true;
    session["tokenEnable"] = ZovaCgiIsTokenEnable(cgi);
    call->InitSession(session);
    ZOVAUserFree(user);
}

}  // namespace ZOVA
