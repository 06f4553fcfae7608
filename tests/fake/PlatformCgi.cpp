// libzovacgi.so.6 on the fake platform.

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "FakePlatform.h"
#include "zovacgi.h"
#include "zovacore.h"

using fake::FakePlatform;
using fake::Session;

namespace {

/** What a record holds behind its `state`. */
struct CgiState {
    std::string sid;
    std::string option;
};

void CopyText(const std::string& text, char* buffer, int size) {
    if (size > 0) {
        strncpy(buffer, text.c_str(), static_cast<std::size_t>(size) - 1);
        buffer[size - 1] = '\0';
    }
}

void Prepare(const FakePlatform& platform, ZovaCgi* cgi) {
    if (cgi->params != nullptr || cgi->sessFile != nullptr || cgi->sessDir != nullptr || cgi->state != nullptr) {
        fake::Unmodelled("a CGI record that is not zero");
    }
    cgi->sessDir = strdup(platform.sessionDirectory.c_str());
    cgi->timeout = platform.cgiTimeout;
    cgi->skipCheckIP = platform.cgiSkipCheckIP;
    cgi->state = new CgiState();
}

std::string Shown(const char* text) {
    return text == nullptr ? "null" : text;
}

const Session* SessionOf(const FakePlatform& platform, const ZovaCgi* cgi) {
    const auto* state = static_cast<const CgiState*>(cgi->state);
    const auto found = state == nullptr ? platform.sessions.end() : platform.sessions.find(state->sid);
    return found == platform.sessions.end() ? nullptr : &found->second;
}

}  // namespace

extern "C" {

int ZovaCgiInit(const char* unused, ZovaCgi* cgi) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, Shown(unused), ENOMEM)) {
        return -1;
    }
    Prepare(platform, cgi);
    return 0;
}

int ZovaCgiInitEx(ZovaCgi* cgi, int timeout, int flag, const char* users, const char* unused) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(
            __func__,
            std::to_string(timeout) + ", " + std::to_string(flag) + ", " + Shown(users) + ", " + Shown(unused),
            ENOMEM)) {
        return -1;
    }
    Prepare(platform, cgi);
    cgi->timeout = timeout;
    return 0;
}

void ZovaCgiFree(ZovaCgi* cgi) {
    FakePlatform::Required(__func__).Enter(__func__, "", 0);
    QLIBCSzHashFree(cgi->params);
    free(cgi->sessFile);
    free(cgi->sessDir);
    delete static_cast<CgiState*>(cgi->state);
    memset(cgi, 0, sizeof(*cgi));
}

void ZovaCgiLoadInCookies(ZovaCgi*) {
    const char* cookies = getenv("HTTP_COOKIE");
    FakePlatform::Required(__func__).Enter(__func__, Shown(cookies), 0);
}

const char* ZovaCgiGetLang(ZovaCgi*) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, "", 0);
    return platform.language.c_str();
}

int ZovaCgiGetRemoteIP(char* buffer, int size) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::to_string(size), ENOENT) || platform.remoteAddress.empty()) {
        return -1;
    }
    CopyText(platform.remoteAddress, buffer, size);
    return 0;
}

const char* ZovaCgiGetOption(ZovaCgi* cgi, int number, const char* fallback) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, std::to_string(number) + ", " + Shown(fallback), 0);
    const Session* session = SessionOf(platform, cgi);
    if (session == nullptr || session->options.count(number) == 0) {
        return fallback;
    }
    return session->options.at(number).c_str();
}

int ZovaCgiIsTokenEnable(ZovaCgi*) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, "", 0);
    return platform.tokenEnable;
}

int ZovaCgiIsAuthorizedEx(ZovaCgi* cgi, const char* sid, char* user, int userSize, const ZovaCgiAuthOptions* options,
                          int unused) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__,
                        Shown(sid) + ", " + std::to_string(userSize) + ", flags " + std::to_string(options->flags) +
                            ", allowTimeout " + std::to_string(options->allowTimeout) + ", " + std::to_string(unused),
                        EIO)) {
        return -2;
    }
    const auto found = platform.sessions.find(sid);
    // A record that could not be prepared knows no session.
    if (found == platform.sessions.end() || cgi->state == nullptr) {
        return platform.unknownSessionResult;
    }
    const Session& session = found->second;
    const bool forgiven =
        (session.result == -1 && options->allowTimeout != 0) || (session.result == -8 && cgi->skipCheckIP != 0);
    if (session.result < 0 && !forgiven) {
        return session.result;
    }
    CopyText(session.user, user, userSize);
    free(cgi->sessFile);
    cgi->sessFile = strdup((platform.sessionDirectory + "/" + sid).c_str());
    static_cast<CgiState*>(cgi->state)->sid = sid;
    return forgiven ? 1 : session.result;
}

unsigned int ZovaCgiUIDGet(const char* sid) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    const auto found = platform.sessions.find(sid);
    if (!platform.Enter(__func__, Shown(sid), ENOENT) || found == platform.sessions.end()) {
        return static_cast<unsigned int>(-1);
    }
    return found->second.uid;
}

int ZovaCgiDecryptParam(char* text) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    const auto found = platform.cipherEnvelopes.find(text);
    if (!platform.Enter(__func__, text, EINVAL) || found == platform.cipherEnvelopes.end()) {
        return 0;
    }
    CopyText(found->second, text, static_cast<int>(strlen(text)) + 1);
    return 1;
}

char* ZovaCgiDetectAndDecryptParamLine(char* line) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, line, EINVAL)) {
        return nullptr;
    }
    const auto found = platform.cipherLines.find(line);
    if (found != platform.cipherLines.end()) {
        CopyText(found->second, line, static_cast<int>(strlen(line)) + 1);
    }
    return line;
}

}  // extern "C"
