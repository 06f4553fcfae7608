#include <algorithm>
#include <cctype>
#include <ctime>
#include <stdexcept>

#include "base/DecimalText.h"
#include "base/Log.h"
#include "base/Printable.h"
#include "envelope/APIResponsePrivate.h"
#include "webapi/APIRequest.h"
#include "webapi/Json.h"
#include "webapiutil.h"

namespace ZOVA {

namespace {

/** First second of the year 0 and last one of the year 9999: what a cookie's four-digit year can hold. */
constexpr long long kEarliestExpiry = -62167219200;
constexpr long long kLatestExpiry = 253402300799;

long long ClientTime(const APIRequest* request) {
    if (request == nullptr || !request->HasParam("client_time")) {
        return time(nullptr);
    }
    const Json::Value value = request->GetParam("client_time", 0);
    if (value.isString()) {
        return base::DecimalNumber(Json::asString(value)).value_or(0);
    }
    if (value.isNumeric()) {
        return static_cast<long long>(
            std::clamp(value.asDouble(), static_cast<double>(kEarliestExpiry), static_cast<double>(kLatestExpiry)));
    }
    return Json::asInt64(value);
}

/** "; expires=" with the time `minutes` from now, kept within the dates that can be written. */
std::string ExpiryAttribute(const APIRequest* request, long minutes) {
    const long long start = std::clamp(ClientTime(request), kEarliestExpiry, kLatestExpiry);
    const long long seconds = std::min<long long>(minutes, kLatestExpiry / 60) * 60;
    const time_t expiry = static_cast<time_t>(std::min(start + seconds, kLatestExpiry));
    struct tm utc {};
    char text[1024] = "";
    if (gmtime_r(&expiry, &utc) != nullptr) {
        strftime(text, sizeof(text), "%a, %d-%b-%Y %H:%M:%S GMT", &utc);
    }
    return std::string("; expires=") + text;
}

}  // namespace

// ---- cookies ----

bool APIResponsePrivate::AddCookie(const std::string& key, const std::string& value, const std::string& path,
                                   long expire, const std::string& domain, bool secure, bool httpOnly) {
    Json::Value* cookies = Json::hasMember(data, "setCookie") ? &data["setCookie"] : nullptr;
    if (key.empty() || path.empty() || cookies == nullptr || !cookies->isArray()) {
        return false;
    }
    for (char c : key) {
        if (isalnum(static_cast<unsigned char>(c)) == 0 && c != '_' && c != '-') {
            syslog(LOG_ERR, "%s(%d)%s: key[%s] contains invalid character", "APIResponse", __LINE__, "AddCookie",
                   base::Printable(key).c_str());
            return false;
        }
    }
    std::string cookie = key + "=" + WebAPIUtil::URLEncode(value) + "; path=" + path;
    if (expire > 0) {
        cookie += ExpiryAttribute(request, expire);
    } else if (expire < 0) {
        cookie += "; expires=Thu, 01-Jan-1970 00:00:01 GMT";
    }
    if (!domain.empty()) {
        cookie += "; domain=" + domain;
    }
    if (secure) {
        cookie += "; secure";
    }
    if (httpOnly) {
        cookie += "; httponly";
    }
    cookies->append(cookie);
    return true;
}

bool APIResponse::AddCookie(const std::string& key, const std::string& value, const std::string& path, long expire,
                            const std::string& domain, bool secure, bool httpOnly) {
    return d->AddCookie(key, value, path, expire, domain, secure, httpOnly);
}

Json::Value APIResponse::GetCookies() const {
    const Json::Value& cookies = Json::member(d->Serialize(), "setCookie");
    return cookies.type() == Json::arrayValue ? cookies : Json::Value(Json::arrayValue);
}

// ---- headers and status ----

bool APIResponse::HasHeader(const std::string& name) const {
    return d->HasData("headers", name);
}

bool APIResponse::SetHeader(const std::string& name, const std::string& value) {
    return d->SetData("headers", name, value, true);
}

std::string APIResponse::GetHeader(const std::string& name, const std::string& fallback) const {
    return name.empty() ? fallback : Json::asString(d->GetData("headers", name, fallback));
}

Json::Value APIResponse::GetHeaders() const {
    return d->GetData("headers", Json::Value(Json::objectValue));
}

_tag_HTTP_STATUS_CODE APIResponse::GetStatus() const {
    // The number in front, as a stream would read it: blanks before it and text behind it do not count.
    const std::string text = GetHeader("Status", "200");
    std::size_t begin = text.find_first_not_of(" \t\r\n\v\f");
    if (begin == std::string::npos) {
        return static_cast<_tag_HTTP_STATUS_CODE>(0);
    }
    std::size_t digits = begin + (text[begin] == '-' || text[begin] == '+' ? 1 : 0);
    const std::size_t end = std::min(text.find_first_not_of("0123456789", digits), text.size());
    const long long number = base::DecimalNumber(text.substr(begin, end - begin)).value_or(0);
    return static_cast<_tag_HTTP_STATUS_CODE>(base::ClampToInt(number));
}

bool APIResponse::SetStatus(_tag_HTTP_STATUS_CODE code, const std::string& message) {
    return SetHeader("Status", std::to_string(static_cast<int>(code))) &&
           d->SetData("option", "statusMsg", message, true);
}

// ---- redirect ----

bool APIResponsePrivate::GetSiteURL(std::string& url) const {
    if (request == nullptr) {
        return false;
    }
    url = request->GetURLProto("") + "://" + Json::asString(request->GetEnv("HTTP_HOST", ""));
    return true;
}

bool APIResponse::Redirect(const std::string& url) {
    std::string location;
    if (!d->GetSiteURL(location)) {
        return false;
    }
    if (url.at(0) != '/') {
        location += '/';
    }
    return SetHeader("Location", location + url) && SetStatus(HTTP_STATUS_FOUND, "");
}

}  // namespace ZOVA
