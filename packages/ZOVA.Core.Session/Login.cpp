#include "Login.h"

#include "../common/ClientSession.h"
#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/PlatformAccounts.h"
#include "../common/PlatformLogin.h"
#include "../common/Text.h"
#include "LoginParameters.h"
#include "SessionCookie.h"
#include "SessionErrors.h"

namespace package {
namespace {

constexpr int kBufferSize = 256;
using IdBuffer = SecretBuffer<kBufferSize>;

/** 0, or the error to answer. */
int CheckPassword(const LoginParameters& login, const std::string& address) {
    switch (ZovaLoginCheckPassword(login.account.c_str(), login.password.c_str(), address.c_str())) {
        case ZOVA_LOGIN_OK:
            return ZOVA::WEBAPI_ERR_NONE;
        case ZOVA_LOGIN_REFUSED:
            return SESSION_ERR_REFUSED;
        case ZOVA_LOGIN_BLOCKED:
            return SESSION_ERR_BLOCKED;
        default:
            return ZOVA::WEBAPI_ERR_INTERNAL;
    }
}

bool OpenSession(const LoginParameters& login, const std::string& address, IdBuffer& sid, IdBuffer& token) {
    ZovaLoginOptions options = {};
    options.address = address.c_str();
    options.app = "";
    options.webapi = "";
    options.withToken = login.csrf ? 1 : 0;
    return ZovaSessionCreate(login.account.c_str(), &options, sid.Data(), IdBuffer::kSize, token.Data(),
                             IdBuffer::kSize) == 0;
}

Json::Value Answer(const LoginParameters& login, const IdBuffer& sid, const IdBuffer& token) {
    Json::Value data(Json::objectValue);
    data["sid"] = sid.c_str();
    data["user"] = ValidUtf8(login.account);
    data["is_admin"] = IsAdministrator(login.account.c_str());
    if (login.csrf) {
        data["token"] = token.c_str();
    }
    return data;
}

void LogIn(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    LoginParameters login;
    if (const char* parameter = ReadLoginParameters(request, login)) {
        RefuseParameter(response, parameter);
        return;
    }
    const std::string address = request->GetRemoteIP();
    if (const int error = CheckPassword(login, address)) {
        response->SetError(error, Json::Value());
        return;
    }
    IdBuffer sid;
    IdBuffer token;
    if (!OpenSession(login, address, sid, token)) {
        response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
        return;
    }
    EndClientSession(request);
    if (!SetSessionCookie(request, response, sid.c_str())) {
        response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
        return;
    }
    response->SetSuccess(Answer(login, sid, token));
}

}  // namespace

void Login(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("login", response, [&] { LogIn(request, response); });
}

}  // namespace package
