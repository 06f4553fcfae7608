#include "webapi/APIAuth.h"

#include <cstdlib>
#include <memory>

#include "auth/UserTag.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "zovacgi.h"
#include "zovacore.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr int kUserNameSize = 493;
/** Everything but the request's own token, which a library with a session id of its own does not have. */
constexpr int kAuthFlags = ZOVA_CGI_AUTH_LOAD | ZOVA_CGI_AUTH_IDLE | ZOVA_CGI_AUTH_ADDRESS | ZOVA_CGI_AUTH_REFRESH;

struct CgiDeleter {
    void operator()(ZovaCgi* cgi) const { ZovaCgiFree(cgi); }
};

struct FreeDeleter {
    void operator()(void* memory) const { free(memory); }
};

/** The error of an authorisation result. It differs from the web entry's for an interrupted session. */
int ErrorOf(int result) {
    switch (result) {
        case AUTHORIZED_RESULT_OK:
        case AUTHORIZED_RESULT_OK_ALSO:
            return WEBAPI_ERR_NONE;
        case AUTHORIZED_RESULT_IP_MISMATCH:
            return WEBAPI_ERR_IP_MISMATCH;
        case AUTHORIZED_RESULT_INTERRUPTED:
            return WEBAPI_ERR_SESSION_INTERRUPTED;
        case AUTHORIZED_RESULT_TIMEOUT:
            return WEBAPI_ERR_SESSION_TIMEOUT;
        default:
            return WEBAPI_ERR_NO_PERMISSION;
    }
}

int CheckSession(const char* sessionId, bool flag) {
    ZovaCgi record{};
    const std::unique_ptr<ZovaCgi, CgiDeleter> owner(&record);
    ZovaCgiInitEx(&record, QLIBCConfGetZELMTimeout(), flag ? 1 : 0, "current.users", "");
    char user[kUserNameSize] = "";
    const ZovaCgiAuthOptions options{kAuthFlags, 0};
    return ErrorOf(ZovaCgiIsAuthorizedEx(&record, sessionId, user, kUserNameSize, &options, 0));
}

bool Refuse(APIResponse* response, int code) {
    response->SetError(code, Json::Value());
    return false;
}

}  // namespace

bool APIAuth::CheckAllowUser(APIRequest* request, const char* userName) {
    if (userName == nullptr) {
        return false;
    }
    return NamesUserTag(request->GetAPIInfo("allowUser", Json::Value()), UserTag(request->IsAdmin(), userName));
}

bool APIAuth::CheckPermission(APIRequest* request, APIResponse* response, const char* sessionId, bool flag) {
    const int error = sessionId == nullptr ? static_cast<int>(WEBAPI_ERR_NO_PERMISSION) : CheckSession(sessionId, flag);
    if (error != WEBAPI_ERR_NONE) {
        response->SetError(error, Json::Value());
    }
    // An error that stood there before ends it too.
    if (response->GetError() != WEBAPI_ERR_NONE) {
        return false;
    }
    const std::string name = request->GetLoginUserName();
    if (!CheckAllowUser(request, name.c_str())) {
        return Refuse(response, WEBAPI_ERR_NO_PERMISSION);
    }
    const std::string privilege = Json::asString(request->GetAPIInfo("appPriv", ""));
    if (!privilege.empty() &&
        QLIBAppPrivUserHas(name.c_str(), privilege.c_str(), request->GetRemoteIP().c_str()) == 0) {
        return Refuse(response, WEBAPI_ERR_APP_PRIVILEGE);
    }
    return true;
}

bool APIAuth::UpdateTimeout(APIRequest* request) {
    if (request == nullptr) {
        return false;
    }
    ZovaCgi record{};
    const std::unique_ptr<ZovaCgi, CgiDeleter> owner(&record);
    ZovaCgiInit("", &record);
    const std::string path =
        std::string(record.sessDir == nullptr ? "" : record.sessDir) + "/" + request->GetSessionID();
    const std::unique_ptr<char, FreeDeleter> resolved(realpath(path.c_str(), nullptr));
    // Path parts in the id, or a link in the store, lead elsewhere.
    return resolved && path == resolved.get() && QLIBCFileUTime(resolved.get(), 1, 0) >= 0;
}

}  // namespace ZOVA
