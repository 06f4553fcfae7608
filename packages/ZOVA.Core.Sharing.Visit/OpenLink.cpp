#include "OpenLink.h"

#include <webapi/Json.h>

#include <cstddef>
#include <string>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/PlatformSharing.h"
#include "../common/Secret.h"
#include "../common/Text.h"
#include "VisitErrors.h"

namespace package {
namespace {

constexpr char kHash[] = "hash";
constexpr char kUser[] = "user";
constexpr char kPassword[] = "password";
constexpr char kCookie[] = "sharing_sid";
// `AddCookie` has no argument for same-site. It writes the path out unchanged, so the attribute goes behind it. A
// visitor comes from elsewhere by the link, so "Strict" would keep the cookie back.
constexpr char kPathAndSameSite[] = "/; SameSite=Lax";
constexpr long kThisVisit = 0;
constexpr std::size_t kLongestText = 511;
constexpr int kBufferSize = 256;

/** An absent one is "". False if it is no text, no whole number, too long or holds control bytes. */
bool ReadText(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* name, Secret& out) {
    const Json::Value value = request->GetParam(name, "");
    const Json::ValueType type = value.type();
    if (type == Json::stringValue || type == Json::intValue || type == Json::uintValue) {
        out.Take(Json::asString(value));
        if (out.Text().size() <= kLongestText && !HasControlBytes(out.Text())) {
            return true;
        }
    }
    RefuseParameter(response, name);
    return false;
}

int ErrorOf(int result) {
    switch (result) {
        case ZOVA_LINK_REFUSED:
            return VISIT_ERR_REFUSED;
        case ZOVA_LINK_UNKNOWN:
            return VISIT_ERR_NO_SUCH_LINK;
        case ZOVA_LINK_TOO_MANY:
            return VISIT_ERR_TOO_MANY;
        case ZOVA_LINK_BLOCKED:
            return VISIT_ERR_BLOCKED;
        default:
            return ZOVA::WEBAPI_ERR_INTERNAL;
    }
}

void Open(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Secret hash;
    Secret user;
    Secret password;
    if (!ReadText(request, response, kHash, hash) || !ReadText(request, response, kUser, user) ||
        !ReadText(request, response, kPassword, password)) {
        return;
    }
    const std::string address = request->GetRemoteIP();
    const ZovaLinkVisit visit = {user.c_str(), password.c_str(), address.c_str()};
    SecretBuffer<kBufferSize> sid;
    long long expires = 0;
    const int result = ZovaLinkOpen(hash.c_str(), &visit, sid.Data(), kBufferSize, &expires);
    if (result != ZOVA_LINK_OK) {
        response->SetError(ErrorOf(result), Json::Value());
        return;
    }
    Json::Value data(Json::objectValue);
    const bool hasSession = *sid.c_str() != '\0';
    if (hasSession) {
        const bool secure = request->GetURLProto("http") == "https";
        if (!response->AddCookie(kCookie, sid.c_str(), kPathAndSameSite, kThisVisit, "", secure, true)) {
            response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
            return;
        }
        data["expires"] = Json::Int64(expires);
    }
    response->SetSuccess(data);
}

}  // namespace

void OpenLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("open", response, [&] { Open(request, response); });
}

}  // namespace package
