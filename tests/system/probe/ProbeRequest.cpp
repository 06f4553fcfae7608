#include "ProbeRequest.h"

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APIValidator.h>
#include <webapi/Json.h>

#include <cstdlib>

using ZOVA::APIRequest;
using ZOVA::APIValidator;

namespace {

constexpr struct {
    const char* name;
    bool (APIRequest::*ask)();
} kQuestions[] = {
    {"IsMobile", &APIRequest::IsMobile},     {"IsMobileDevice", &APIRequest::IsMobileDevice},
    {"IsIPhone", &APIRequest::IsIPhone},     {"IsAndroid", &APIRequest::IsAndroid},
    {"IsIEMobile", &APIRequest::IsIEMobile}, {"IsIPad", &APIRequest::IsIPad},
    {"IsPlayBook", &APIRequest::IsPlayBook}, {"IsBlackBerry6", &APIRequest::IsBlackBerry6},
    {"IsWebKit", &APIRequest::IsWebKit},     {"IsSupportWebApp", &APIRequest::IsSupportWebApp},
};

constexpr struct {
    const char* name;
    bool (*check)(const std::string&);
} kChecks[] = {
    {"IsHostname", APIValidator::IsHostname},
    {"IsDomain", APIValidator::IsDomain},
    {"IsIP", APIValidator::IsIP},
    {"IsIPv4", APIValidator::IsIPv4},
    {"IsIPv6", APIValidator::IsIPv6},
    {"IsEMail", APIValidator::IsEMail},
    {"IsNetbios", APIValidator::IsNetbios},
    {"IsWorkGroup", APIValidator::IsWorkGroup},
    {"IsDigit", APIValidator::IsDigit},
    {"IsTetherLinkId", APIValidator::IsTetherLinkId},
};

constexpr const char* kVariables[] = {"REMOTE_ADDR",  "HTTP_X_FORWARDED_FOR", "HTTP_X_FORWARDED_PROTO",
                                      "HTTP_PROXY",   "HTTP_AUTHORIZATION",   "HTTP_HOST",
                                      "QUERY_STRING", "REQUEST_URI",          "SCRIPT_NAME"};

}  // namespace

namespace probe {

void TellAgent(APIRequest* request, ZOVA::APIResponse* response) {
    Json::Value names(Json::arrayValue);
    for (const auto& question : kQuestions) {
        if ((request->*question.ask)()) {
            names.append(question.name);
        }
    }
    response->SetSuccess(names);
}

void TellChecks(APIRequest* request, ZOVA::APIResponse* response) {
    Json::Value names(Json::arrayValue);
    for (const auto& row : kChecks) {
        if (!request->GetAndCheckString("text", APIRequest::PARAM_REQUIRED, row.check).IsInvalid()) {
            names.append(row.name);
        }
    }
    if (!request->GetAndCheckInt("port", APIRequest::PARAM_REQUIRED, APIValidator::IsPort).IsInvalid()) {
        names.append("IsPort");
    }
    response->SetSuccess(names);
}

void TellRequest(APIRequest* request, ZOVA::APIResponse* response) {
    Json::Value told(Json::objectValue);
    told["params"] = request->GetParam("", Json::Value());
    for (const char* name : kVariables) {
        const char* value = getenv(name);
        told["variables"][name] = value == nullptr ? Json::Value() : Json::Value(value);
    }
    response->SetSuccess(told);
}

}  // namespace probe
