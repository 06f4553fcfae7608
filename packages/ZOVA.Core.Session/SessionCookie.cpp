#include "SessionCookie.h"

namespace package {
namespace {

constexpr char kCookie[] = "id";

// `AddCookie` has no argument for same-site. It writes the path out unchanged, so the attribute goes behind it.
constexpr char kPathAndSameSite[] = "/; SameSite=Strict";

constexpr long kThisVisit = 0;
constexpr long kDelete = -1;

bool AddSessionCookie(ZOVA::APIRequest* request, ZOVA::APIResponse* response, const std::string& value, long expire) {
    const bool secure = request->GetURLProto("http") == "https";
    return response->AddCookie(kCookie, value, kPathAndSameSite, expire, "", secure, true);
}

}  // namespace

bool SetSessionCookie(ZOVA::APIRequest* request, ZOVA::APIResponse* response, const std::string& sid) {
    return AddSessionCookie(request, response, sid, kThisVisit);
}

bool DeleteSessionCookie(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    return AddSessionCookie(request, response, "", kDelete);
}

}  // namespace package
