#include "Accessors.h"

#include <string>

#include "Check.h"
#include "JsonRoundTrip.h"
#include "webapi/Json.h"
#include "zovasharing.h"

namespace fuzz {

namespace {

using ZOVA::APIRequest;

constexpr size_t kMostParameters = 32;

template <class T>
void CheckParameter(const ZOVA::APIParameter<T>& parameter, bool isThere) {
    FUZZ_CHECK(parameter.IsSet() == isThere);
    FUZZ_CHECK(!parameter.IsReset() || parameter.IsSet());
    FUZZ_CHECK(!(parameter.IsReset() && parameter.IsInvalid()));
    FUZZ_CHECK(!parameter.IsDefault());
}

void AskParameter(const APIRequest& request, const std::string& name, APIRequest::PARAM_NECESSITY necessity) {
    const bool isThere = request.HasParam(name);
    CheckParameter(request.GetAndCheckInt(name, necessity), isThere);
    CheckParameter(request.GetAndCheckBool(name, necessity), isThere);
    CheckParameter(request.GetAndCheckReal(name, necessity), isThere);
    CheckParameter(request.GetAndCheckString(name, necessity), isThere);
    CheckParameter(request.GetAndCheckArray(name, necessity), isThere);
    CheckParameter(request.GetAndCheckObject(name, necessity), isThere);
    CheckParameter(request.GetAndCheckUnitArray(name, necessity), isThere);
    CheckParameter(request.GetAndCheckIntegral<long long>(name, necessity), isThere);
    CheckParameter(request.GetAndCheckIntegral<unsigned int>(name, necessity), isThere);
    CheckParameter(request.GetAndCheckIntegral<unsigned long long>(name, necessity), isThere);
}

void AskParameters(const APIRequest& request) {
    const Json::Value all = request.GetParam("", Json::Value());
    size_t asked = 0;
    if (all.type() == Json::objectValue) {
        for (auto member = all.begin(); member != all.end() && asked < kMostParameters; ++member, ++asked) {
            AskParameter(request, member.name(), APIRequest::PARAM_REQUIRED);
        }
    }
    AskParameter(request, "no such parameter", APIRequest::PARAM_OPTIONAL);
    const Json::Value fallback("fallback");
    FUZZ_CHECK(request.GetParamRef("api", fallback) == request.GetParam("api", fallback));
}

void AskURL(APIRequest& request) {
    const std::string proto = request.GetURLProto("");
    request.GetURLHost("");
    const int port = request.GetURLPort(80);
    request.GetURLPath("/");
    request.GetURLName("");
    // Asking again changes nothing.
    FUZZ_CHECK(request.GetURLProto("") == proto && request.GetURLPort(80) == port);
}

void AskDevice(APIRequest& request) {
    const bool isMobile = request.IsMobile();
    request.IsMobileDevice();
    request.IsIPhone();
    request.IsAndroid();
    request.IsIEMobile();
    request.IsIPad();
    request.IsPlayBook();
    request.IsBlackBerry6();
    request.IsWebKit();
    request.IsSupportWebApp();
    FUZZ_CHECK(request.IsMobile() == isMobile);
}

void AskSession(APIRequest& request) {
    request.GetLoginUserName();
    request.IsAdmin();
    request.GetLoginUID();
    request.IsAuthorized();
    request.IsTimeout();
    request.GetTimeoutDuration();
    request.IsSkipCheckIP();
    request.GetApplication();
    request.GetWebAPIPriv();
    request.GetSessionFilePath();
    FUZZ_CHECK(request.GetSessionID() == request.GetCookie("id", ""));
    request.GetZovaAccessTokenID();
    request.HasAppPriv("app");
    request.GetPreferenceDir();
    request.GetGroupPreferenceDir("users");
    request.GetAuthResult();
    request.GetRemoteIP();
    request.GetUILanguage();
    request.IsTokenEnable();
    FUZZ_CHECK(!request.IsDemoMode());
}

void AskKind(APIRequest& request) {
    FUZZ_CHECK(!request.IsSliceUploadRequest() || request.IsUploadRequest());
    request.IsPollingTask();
    request.GetPollingTaskId();
    FUZZ_CHECK(request.IsSharing() == !request.GetSharingID().empty());
    request.GetSharingSID();
    request.GetSharingEntry();
    request.GetSharingSession();
    request.GetSharingToken();
}

}  // namespace

void AskEverything(APIRequest& request) {
    request.GetAPIClass();
    request.GetAPIVersion();
    request.GetAPIMethod();
    request.GetRequestMethod();
    request.GetAPIInfo("lib", Json::Value());
    const int allowed = request.GetAllowUser();
    FUZZ_CHECK(request.GetAllowUser() == allowed);
    request.HasEnv("HTTP_HOST");
    request.GetEnv("", Json::Value());
    request.HasCookie("id");
    request.HasAttr("attribute");
    request.GetAttr("", Json::Value());
    AskParameters(request);
    AskURL(request);
    AskDevice(request);
    AskSession(request);
    AskKind(request);
}

void CheckCopies(APIRequest& request) {
    APIRequest copy(request);
    FUZZ_CHECK(copy.Serialize() == request.Serialize());
    CheckRoundTrip(request.Serialize());
    Json::Value store;
    if (!Json::fromString(store, Json::toString(request.Serialize()))) {
        return;
    }
    const std::string text = Json::toString(store);
    APIRequest rebuilt((Json::Value()));
    rebuilt.Deserialize(store);
    FUZZ_CHECK(Json::toString(rebuilt.Serialize()) == text);
    FUZZ_CHECK(rebuilt.GetCookie("id", "") == request.GetCookie("id", ""));
    FUZZ_CHECK(rebuilt.GetAPIClass() == request.GetAPIClass() && rebuilt.GetAPIVersion() == request.GetAPIVersion());
}

}  // namespace fuzz
