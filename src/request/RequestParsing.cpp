#include <strings.h>

#include <algorithm>

#include "base/DecimalText.h"
#include "envelope/APIRequestPrivate.h"
#include "webapi/Json.h"
#include "webapiutil.h"

namespace ZOVA {

// ---- cookies and method, read each time the environment changes ----

void APIRequestPrivate::InitCookie() {
    const Json::Value none;
    const Json::Value& header = GetData("environ", "HTTP_COOKIE", none);
    Json::Value* cookies = Section("cookie");
    if (!header.isString() || cookies == nullptr) {
        return;
    }
    const Json::Value elements = WebAPIUtil::ParseToArray(Json::asString(header).c_str(), ";");
    for (const Json::Value& element : elements) {
        const std::string text = Json::asString(element);
        const std::size_t equals = text.find('=');
        if (equals != std::string::npos) {
            (*cookies)[text.substr(0, equals)] = WebAPIUtil::URLDecode(text.substr(equals + 1), true);
        }
    }
}

void APIRequestPrivate::InitRequestMethod() {
    if (!HasData("environ", "REQUEST_METHOD")) {
        return;
    }
    const std::string method = Json::asString(GetData("environ", "REQUEST_METHOD", ""));
    int number = 0;
    for (const char* known : {"GET", "POST", "HEAD"}) {
        ++number;
        if (method == known) {
            SetPrivateValue("requestMethod", number);
            return;
        }
    }
}

// ---- the URL, read once, at the first question ----

void APIRequestPrivate::InitURL() {
    if (HasData("url", "initialized")) {
        return;
    }
    SetData("url", "initialized", true, false);
    // The default port depends on the protocol, so the protocol comes first.
    ParseProtocol();
    ParseHostAndPort();
    ParsePathAndName();
}

bool APIRequestPrivate::ParseProtocol() {
    const std::string https = Json::asString(GetData("environ", "HTTPS", ""));
    const std::string forwarded = Json::asString(GetData("environ", "HTTP_X_FORWARDED_PROTO", ""));
    const bool secure = strcasecmp(https.c_str(), "ON") == 0 || strcasecmp(forwarded.c_str(), "https") == 0;
    return SetData("url", "urlProto", secure ? "https" : "http", true);
}

bool APIRequestPrivate::ParseHostAndPort() {
    const std::string text = Json::asString(GetData("environ", "HTTP_HOST", ""));
    if (text.empty()) {
        return false;
    }
    std::size_t hostEnd = text.rfind(':');
    std::size_t colon = hostEnd;
    if (text[0] == '[') {
        const std::size_t bracket = text.rfind(']');
        if (bracket == std::string::npos) {
            return false;
        }
        hostEnd = bracket + 1;
        colon = text.find(':', hostEnd);
    }
    std::string port = colon == std::string::npos ? "" : text.substr(colon + 1);
    if (port.empty()) {
        port = Json::asString(GetData("url", "urlProto", "")) == "https" ? "443" : "80";
    }
    return SetData("url", "urlHost", text.substr(0, hostEnd), true) && SetData("url", "urlPort", port, true);
}

bool APIRequestPrivate::ParsePathAndName() {
    std::string path = Json::asString(GetData("environ", "REQUEST_URI", ""));
    path.erase(std::min(path.find('?'), path.size()));
    const std::size_t slash = path.rfind('/');
    if (slash == std::string::npos) {
        return true;
    }
    return SetData("url", "urlPath", path.substr(0, slash + 1), true) &&
           SetData("url", "urlName", path.substr(slash + 1), true);
}

std::string APIRequest::GetURLProto(const std::string& fallback) {
    d->InitURL();
    return Json::asString(d->GetData("url", "urlProto", fallback));
}

std::string APIRequest::GetURLHost(const std::string& fallback) {
    d->InitURL();
    return Json::asString(d->GetData("url", "urlHost", fallback));
}

int APIRequest::GetURLPort(int fallback) {
    d->InitURL();
    if (!d->HasData("url", "urlPort")) {
        return fallback;
    }
    const std::string port = Json::asString(d->GetData("url", "urlPort", ""));
    return base::ClampToInt(base::DecimalNumber(port).value_or(0));
}

std::string APIRequest::GetURLPath(const std::string& fallback) {
    d->InitURL();
    return Json::asString(d->GetData("url", "urlPath", fallback));
}

std::string APIRequest::GetURLName(const std::string& fallback) {
    d->InitURL();
    return Json::asString(d->GetData("url", "urlName", fallback));
}

}  // namespace ZOVA
