// A request from CGI variables: one line of the input for each of them.

#include "Accessors.h"
#include "Check.h"
#include "Target.h"
#include "webapi/Json.h"
#include "webapiutil.h"
#include "zovacgi/Cookies.h"

namespace {

constexpr const char* kVariables[] = {
    "HTTP_COOKIE",  "HTTP_HOST",        "REQUEST_URI",     "HTTPS",      "HTTP_X_FORWARDED_PROTO", "REQUEST_METHOD",
    "CONTENT_TYPE", "HTTP_X_TYPE_NAME", "HTTP_USER_AGENT", "HTTP_UA_OS", "HTTP_X_WAP_PROFILE"};

Json::Value EnvironmentOf(std::string text) {
    Json::Value environment(Json::objectValue);
    for (const char* name : kVariables) {
        const size_t length = text.find('\n');
        environment[name] = text.substr(0, length);
        if (length == std::string::npos) {
            break;
        }
        text.erase(0, length + 1);
    }
    return environment;
}

/** The framework and the login library must find the same session id in one header. */
void CheckSessionCookie(const ZOVA::APIRequest& request, const std::string& header) {
    if (header.find('\0') == std::string::npos) {
        const std::string raw(reference::FindCookie(header, "id"));
        FUZZ_CHECK(request.GetCookie("id", "") == ZOVA::WebAPIUtil::URLDecode(raw, true));
    }
}

void CheckURL(ZOVA::APIRequest& request, const Json::Value& environment) {
    const std::string proto = request.GetURLProto("none");
    FUZZ_CHECK(proto == "http" || proto == "https");
    const std::string path = request.GetURLPath("");
    FUZZ_CHECK(path.empty() || path.back() == '/');
    FUZZ_CHECK(path.find('?') == std::string::npos);
    const std::string name = request.GetURLName("");
    FUZZ_CHECK(name.find('/') == std::string::npos && name.find('?') == std::string::npos);
    const std::string host = Json::asString(Json::member(environment, "HTTP_HOST"));
    FUZZ_CHECK(host.compare(0, request.GetURLHost("").size(), request.GetURLHost("")) == 0);
    FUZZ_CHECK(!host.empty() || request.GetURLPort(7) == 7);
}

void CheckDevice(ZOVA::APIRequest& request) {
    FUZZ_CHECK(!request.IsMobile() || request.IsMobileDevice());
    FUZZ_CHECK(!request.IsIEMobile() || request.IsMobileDevice());
    FUZZ_CHECK(!request.IsIPad() || request.IsIPhone());
    const int families =
        int{request.IsIPhone()} + int{request.IsAndroid()} + int{request.IsPlayBook()} + int{request.IsBlackBerry6()};
    FUZZ_CHECK(families <= 1);
    FUZZ_CHECK(families == 0 || request.IsMobileDevice());
    FUZZ_CHECK(request.IsSupportWebApp() == (families == 1 && request.IsWebKit()));
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const Json::Value environment = EnvironmentOf(fuzz::TextOf(data, size));
    Json::Value init(Json::objectValue);
    init["environ"] = environment;
    ZOVA::APIRequest request(init);
    FUZZ_CHECK(request.GetEnv("", Json::Value()) == environment);
    const int method = request.GetRequestMethod();
    FUZZ_CHECK(method >= 0 && method <= 3);
    CheckSessionCookie(request, Json::asString(environment["HTTP_COOKIE"]));
    CheckURL(request, environment);
    CheckDevice(request);
    fuzz::AskEverything(request);
    fuzz::CheckCopies(request);
    return 0;
}
