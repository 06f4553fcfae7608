#include "webapi/WebEntry.h"

#include <unistd.h>

#include <cstdlib>

#include "web/RestartHttpd.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "zovacgi.h"
#include "zovasharing.h"

namespace ZOVA {

namespace {

constexpr int kAddressSize = 65;

std::string ProcessVariable(const char* name) {
    const char* value = getenv(name);
    return value == nullptr ? "" : value;
}

class [[nodiscard]] RemovalAtEnd {
public:
    explicit RemovalAtEnd(WebEntry& entry) : owner(entry) {}
    RemovalAtEnd(const RemovalAtEnd&) = delete;
    RemovalAtEnd& operator=(const RemovalAtEnd&) = delete;
    ~RemovalAtEnd() { owner.RemoveTemporaryUploadFile(); }

private:
    WebEntry& owner;
};

}  // namespace

WebEntry::WebEntry() : tempUploadFiles(Json::arrayValue), cgi(new ZovaCgi{}), permCache(Json::objectValue) {
    permCache["permResult"] = Json::Value(Json::arrayValue);
}

WebEntry::~WebEntry() {
    ZovaCgiFree(cgi);
    delete cgi;
}

void WebEntry::Run(const Json::Value&) {
    // Also where an exception leaves: no file of an upload stays behind.
    const RemovalAtEnd removal(*this);
    if (Initialize(Json::Value()) && SetProcessName(request, response)) {
        if (request->HasParam("relay_zn")) {
            ProcessRelay(request, response);
        } else {
            Process(request, response);
        }
    }
    // Whatever failed before, the client gets its header block and body.
    if (response->IsEnableOutput()) {
        OutputHeader();
        OutputBody();
    }
    if (response->GetHttpdRestart()) {
        response->SetCallbackFunc(RestartHttpd, nullptr);
    }
    HandleCallback(response);
}

bool WebEntry::Initialize(const Json::Value&) {
    ZovaCgiInit("", cgi);
    ZovaCgiLoadInCookies(cgi);
    request->SetAttr("_collector_count_webapi", true);

    // Language and token setting are known also to a call that never reaches the gate.
    Json::Value session(Json::objectValue);
    session["uiLang"] = ZovaCgiGetLang(cgi);
    session["tokenEnable"] = ZovaCgiIsTokenEnable(cgi);
    request->InitSession(session);

    Json::Value env(Json::objectValue);
    if (!InitEnv(env)) {
        response->SetError(WEBAPI_ERR_BAD_REQUEST, Json::Value());
        return false;
    }
    char address[kAddressSize] = "";
    if (ZovaCgiGetRemoteIP(address, kAddressSize) == 0) {
        env["ZOVA_REMOTE_IP"] = address;
    }
    request->InitEnv(env);

    Json::Value params(Json::objectValue);
    if (!InitParam(params)) {
        return false;
    }
    request->InitParam(params, false);
    return TakeCredentialParameters();
}

bool WebEntry::TakeCredentialParameters() {
    const auto parameter = [this](const char* name) {
        return request->GetAndCheckString(name, APIRequest::PARAM_REQUIRED);
    };
    const APIParameter<std::string> sid = parameter("_sid");
    const APIParameter<std::string> tokenId = parameter("tid");
    const APIParameter<std::string> sharingId = parameter("_sharing_id");
    const APIParameter<std::string> sharingSid = parameter("_sharing_sid");
    if (sid.IsInvalid() && tokenId.IsInvalid() && sharingId.IsInvalid() && sharingSid.IsInvalid()) {
        return true;
    }

    std::string cookie = ProcessVariable("HTTP_COOKIE");
    std::string sharingHeader = ProcessVariable(SZ_X_SHARING_HEADER);
    // Both separators look at the header as it was found, not at the text that is being built.
    const bool cookieCame = !cookie.empty();
    Json::Value env(Json::objectValue);
    if (!sharingId.IsInvalid()) {
        sharingHeader = sharingId.Get();
        setenv(SZ_X_SHARING_HEADER, sharingHeader.c_str(), 1);
        if (!sharingSid.IsInvalid()) {
            cookie += std::string(cookieCame ? "; " : "") + sharing::SZK_SHARING_SID + "=" + sharingSid.Get();
            setenv("HTTP_COOKIE", cookie.c_str(), 1);
        }
    }
    if (!sid.IsInvalid()) {
        if (cookieCame) {
            cookie += "; ";
            const std::size_t found = cookie.find("id=");
            if (found != std::string::npos) {
                cookie.replace(found, 2, "abandoned");
            }
        }
        cookie += "id=" + sid.Get();
        setenv("HTTP_COOKIE", cookie.c_str(), 1);
    } else if (!tokenId.IsInvalid()) {
        if (setenv("zovaAccessToken", tokenId.Get().c_str(), 1) != 0) {
            return false;
        }
        env["zovaAccessToken"] = tokenId.Get();
    }
    ZovaCgiLoadInCookies(cgi);
    env["HTTP_COOKIE"] = cookie;
    env[SZ_X_SHARING_HEADER] = sharingHeader;
    request->InitEnv(env);
    return true;
}

void WebEntry::RemoveTemporaryUploadFile() {
    for (const Json::Value& path : tempUploadFiles) {
        if (path.isString()) {
            unlink(Json::asString(path).c_str());
        }
    }
}

}  // namespace ZOVA
