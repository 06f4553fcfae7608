#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/Json.h>

#include <stdexcept>
#include <string>

/** The value of a JSON text that a test writes down. */
inline Json::Value Parse(const std::string& text) {
    Json::Value value;
    if (!Json::fromString(value, text)) {
        throw std::invalid_argument("no JSON: " + text);
    }
    return value;
}

/** One call of a method, with a request from its JSON form. */
class Call {
public:
    using Method = void (*)(ZOVA::APIRequest*, ZOVA::APIResponse*);

    Call(Method method, const Json::Value& init) : request(init), response(&request) { method(&request, &response); }

    int Error() const { return response.GetError(); }
    Json::Value Data() const { return Json::member(response.GetBody(), "data"); }
    std::string Body() const { return Json::toString(response.GetBody()); }
    std::string Cookies() const { return Json::toString(response.GetCookies()); }
    std::string ServerError() const { return response.GetServerError(); }

private:
    ZOVA::APIRequest request;
    ZOVA::APIResponse response;
};

/** The answer that names a parameter as unusable. */
inline std::string RefusalOf(const std::string& parameter) {
    return R"({"error":{"code":101,"errors":{"parameter":")" + parameter + R"("}},"success":false})";
}
