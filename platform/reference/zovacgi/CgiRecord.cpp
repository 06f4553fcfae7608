#include <cstdlib>
#include <cstring>

#include "Paths.h"
#include "Seam.h"
#include "common/DeviceInformation.h"
#include "zovacgi/CgiState.h"
#include "zovacgi/ClientAddress.h"
#include "zovacgi/Cookies.h"
#include "zovacgi/Language.h"

using reference::CgiState;

namespace {

int Prepare(ZovaCgi& cgi, int timeout, bool skipCheckIp) {
    ZovaCgiFree(&cgi);
    cgi.sessDir = strdup(reference::paths::kSessionDirectory);
    cgi.timeout = timeout;
    cgi.skipCheckIP = skipCheckIp ? 1 : 0;
    return cgi.sessDir != nullptr ? 0 : -1;
}

std::string_view Variable(const char* name) {
    const char* value = getenv(name);
    return value != nullptr ? value : "";
}

const char* LanguageOfRequest(std::string_view cookies) {
    for (const char* name : {"lang", "ui_language"}) {
        if (const char* language = reference::LanguageByCode(reference::FindCookie(cookies, name))) {
            return language;
        }
    }
    const char* language = reference::LanguageByHeader(Variable("HTTP_ACCEPT_LANGUAGE"));
    return language != nullptr ? language : reference::kDefaultLanguage;
}

const char* TextOr(const std::optional<std::string>& text, const char* fallback) {
    return text ? text->c_str() : fallback;
}

}  // namespace

int ZovaCgiInit(const char*, ZovaCgi* cgi) {
    if (cgi == nullptr) {
        return -1;
    }
    const reference::DeviceInformation information;
    return Prepare(*cgi, information.IdleMinutes(), information.SkipsAddressCheck());
}

int ZovaCgiInitEx(ZovaCgi* cgi, int timeout, int, const char*, const char*) {
    if (cgi == nullptr) {
        return -1;
    }
    const bool inRange = timeout > 0 && timeout <= reference::kLongestIdleMinutes;
    const reference::DeviceInformation information;
    return Prepare(*cgi, inRange ? timeout : information.IdleMinutes(), information.SkipsAddressCheck());
}

void ZovaCgiFree(ZovaCgi* cgi) {
    if (cgi == nullptr) {
        return;
    }
    QLIBCSzHashFree(cgi->params);
    free(cgi->sessFile);
    free(cgi->sessDir);
    delete static_cast<CgiState*>(cgi->state);
    cgi->params = nullptr;
    cgi->sessFile = nullptr;
    cgi->sessDir = nullptr;
    cgi->state = nullptr;
}

void ZovaCgiLoadInCookies(ZovaCgi* cgi) {
    if (cgi == nullptr) {
        return;
    }
    CgiState& state = CgiState::Of(*cgi);
    const std::string_view cookies = Variable("HTTP_COOKIE");
    state.cookieSid = reference::FindCookie(cookies, "id");
    state.language = LanguageOfRequest(cookies);
}

const char* ZovaCgiGetLang(ZovaCgi* cgi) {
    return cgi != nullptr ? CgiState::Of(*cgi).language : reference::kDefaultLanguage;
}

int ZovaCgiGetRemoteIP(char* buffer, int size) {
    const std::string address = reference::ClientAddressOfRequest();
    if (buffer == nullptr || size <= 0 || address.empty() || address.size() >= static_cast<size_t>(size)) {
        return -1;
    }
    memcpy(buffer, address.c_str(), address.size() + 1);
    return 0;
}

const char* ZovaCgiGetOption(ZovaCgi* cgi, int number, const char* fallback) {
    if (cgi == nullptr) {
        return fallback;
    }
    const CgiState& state = CgiState::Of(*cgi);
    switch (number) {
        case ZOVA_CGI_OPTION_SKIP_CHECK_IP:
            return TextOr(state.skipCheckIp, fallback);
        case ZOVA_CGI_OPTION_WEBAPI:
            return TextOr(state.webapi, fallback);
        case ZOVA_CGI_OPTION_APP:
            return TextOr(state.app, fallback);
        case ZOVA_CGI_OPTION_TIMEOUT:
            return TextOr(state.timeout, fallback);
        default:
            return fallback;
    }
}

int ZovaCgiIsTokenEnable(ZovaCgi* cgi) {
    if (cgi == nullptr) {
        return 0;
    }
    CgiState& state = CgiState::Of(*cgi);
    return state.Find(state.cookieSid) == reference::SessionStore::Result::kGood && !state.Found().session.token.empty()
               ? 1
               : 0;
}
