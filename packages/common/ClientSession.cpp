#include "ClientSession.h"

#include <webapi/Json.h>

#include "PlatformLogin.h"
#include "Secret.h"

namespace package {
namespace {

constexpr char kTokenHeader[] = "HTTP_X_ZOVA_TOKEN";
constexpr int kUserSize = 493;

bool IsGood(int result) {
    return result == ZOVA::AUTHORIZED_RESULT_OK || result == ZOVA::AUTHORIZED_RESULT_OK_ALSO;
}

}  // namespace

int CheckClientSession(ZOVA::APIRequest* request, char* user, int size) {
    const Secret sid(request->GetSessionID());
    if (sid.Empty()) {
        return ZOVA::AUTHORIZED_RESULT_UNAUTHENTICATED;
    }
    const Secret token(Json::asString(request->GetEnv(kTokenHeader, Json::Value())));
    return ZovaSessionUser(sid.c_str(), request->GetRemoteIP().c_str(), token.Empty() ? nullptr : token.c_str(), user,
                           size);
}

bool EndClientSession(ZOVA::APIRequest* request) {
    const Secret sid(request->GetSessionID());
    if (sid.Empty() || ZovaSessionRemove(sid.c_str()) >= 0) {
        return true;
    }
    char user[kUserSize] = {};
    return !IsGood(CheckClientSession(request, user, kUserSize));
}

}  // namespace package
