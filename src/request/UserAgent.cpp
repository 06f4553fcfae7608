#include <regex.h>

#include <cstdlib>
#include <cstring>
#include <memory>

#include "base/ErrnoGuard.h"
#include "base/FreeDeleter.h"
#include "envelope/APIRequestPrivate.h"
#include "webapi/Json.h"
#include "zovacore.h"

namespace ZOVA {

namespace {

constexpr const char* kMobilePattern =
    "(SymbianOS|Windows CE|PalmOS|BlackBerry|Vodafone|Opera Mobi|Opera Mini|UP\\.Browser|AvantGo|EudoraWeb|PLink|"
    "Plucker|NetFront|Xiino|Blazer|WebPro|ProxiNet|Elaine)";

enum FamilyBit : unsigned int { kIPhone = 1, kIPad = 2, kAndroid = 4, kPlayBook = 8, kBlackBerry = 16 };

struct Family {
    const char* word;
    unsigned int bits;
    bool onlyWithWebKit;
};

/** In their order: the first whose word the header holds counts. */
constexpr Family kFamilies[] = {
    {"ipad", kIPhone | kIPad, false}, {"iphone", kIPhone, false},     {"ipod", kIPhone, false},
    {"android", kAndroid, false},     {"playbook", kPlayBook, false}, {"blackberry", kBlackBerry, true},
};

using OwnedText = std::unique_ptr<char, base::FreeDeleter>;

bool Holds(const OwnedText& text, const char* word) {
    return strstr(text.get(), word) != nullptr;
}

/** The header in small letters, up to its first NUL; null if there is no memory. */
OwnedText SmallLetters(const Json::Value& header) {
    const std::string text = Json::asString(header);
    const std::size_t length = strlen(text.c_str());
    OwnedText copy(static_cast<char*>(calloc(length + 1, 1)));
    if (copy) {
        memcpy(copy.get(), text.c_str(), length);
        QLIBCStrCaseLower(copy.get(), 0, 0, length + 1);
    }
    return copy;
}

const Family* FamilyOf(const OwnedText& text, bool webkit) {
    for (const Family& family : kFamilies) {
        if ((webkit || !family.onlyWithWebKit) && Holds(text, family.word)) {
            return &family;
        }
    }
    return nullptr;
}

bool MatchesMobilePattern(const OwnedText& text) {
    regex_t pattern;
    if (regcomp(&pattern, kMobilePattern, REG_EXTENDED | REG_ICASE) != 0) {
        return false;
    }
    const bool matches = regexec(&pattern, text.get(), 0, nullptr, 0) == 0;
    regfree(&pattern);
    return matches;
}

bool ForcesDesktop(const APIRequest& request) {
    const base::ErrnoGuard errnoGuard;
    return strtol(request.GetCookie("forceDesktop", "0").c_str(), nullptr, 10) != 0;
}

}  // namespace

void APIRequestPrivate::InitUA() {
    if (HasData("userAgent", "initialized")) {
        return;
    }
    SetData("userAgent", "initialized", true, false);
    const Json::Value none;
    const Json::Value& header = GetData("environ", "HTTP_USER_AGENT", none);
    const OwnedText text = header.isString() ? SmallLetters(header) : nullptr;
    if (!text) {
        return;
    }
    const bool webkit = Holds(text, "webkit");
    const Family* family = FamilyOf(text, webkit);
    const unsigned int bits = family != nullptr ? family->bits : 0;
    const bool mobile = family != nullptr || MatchesMobilePattern(text) || HasData("environ", "HTTP_UA_OS") ||
                        HasData("environ", "HTTP_X_WAP_PROFILE");
    const struct {
        const char* key;
        bool value;
    } flags[] = {
        {"uaMobile", mobile && !ForcesDesktop(*owner)},
        {"uaMobileDevice", mobile},
        {"uaIPhone", (bits & kIPhone) != 0},
        {"uaAndroid", (bits & kAndroid) != 0},
        {"uaIEMobile", mobile && (Holds(text, "msie") || Holds(text, "iemobile"))},
        {"uaIPad", (bits & kIPad) != 0},
        {"uaPlayBook", (bits & kPlayBook) != 0},
        {"uaBlackBerry6", (bits & kBlackBerry) != 0},
        {"uaWebKit", webkit},
        {"uaSupportWebAPP", family != nullptr && webkit},
    };
    for (const auto& flag : flags) {
        SetData("userAgent", flag.key, flag.value, false);
    }
}

bool APIRequestPrivate::UserAgentFlag(const char* key) {
    InitUA();
    return Json::asBool(GetData("userAgent", key, false));
}

bool APIRequest::IsMobile() {
    return d->UserAgentFlag("uaMobile");
}

bool APIRequest::IsMobileDevice() {
    return d->UserAgentFlag("uaMobileDevice");
}

bool APIRequest::IsIPhone() {
    return d->UserAgentFlag("uaIPhone");
}

bool APIRequest::IsAndroid() {
    return d->UserAgentFlag("uaAndroid");
}

bool APIRequest::IsIEMobile() {
    return d->UserAgentFlag("uaIEMobile");
}

bool APIRequest::IsIPad() {
    return d->UserAgentFlag("uaIPad");
}

bool APIRequest::IsPlayBook() {
    return d->UserAgentFlag("uaPlayBook");
}

bool APIRequest::IsBlackBerry6() {
    return d->UserAgentFlag("uaBlackBerry6");
}

bool APIRequest::IsWebKit() {
    return d->UserAgentFlag("uaWebKit");
}

bool APIRequest::IsSupportWebApp() {
    return d->UserAgentFlag("uaSupportWebAPP");
}

}  // namespace ZOVA
