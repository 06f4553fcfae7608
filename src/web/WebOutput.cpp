#include <cstdio>
#include <string>

#include "response/HeaderLine.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "webapi/WebEntry.h"

namespace ZOVA {

namespace {

constexpr const char* kFixedLines =
    "X-Content-Type-Options: nosniff\r\n"
    "X-XSS-Protection: 1; mode=block\r\n"
    "Cache-Control: max-age=0, no-cache, no-store, must-revalidate\r\n"
    "Pragma: no-cache\r\n"
    "Expires: 0\r\n";

void Write(const std::string& text) {
    fwrite(text.data(), 1, text.size(), stdout);
}

}  // namespace

void WebEntry::OutputHeader() {
    std::string block;
    const Json::Value headers = response->GetHeaders();
    for (auto header = headers.begin(); header != headers.end(); ++header) {
        AppendHeaderLine(block, header.name(), *header);
    }
    const Json::Value cookies = response->GetCookies();
    for (const Json::Value& cookie : cookies) {
        AppendHeaderLine(block, "Set-Cookie", cookie);
    }
    block += kFixedLines;
    block += "\r\n";
    Write(block);
}

void WebEntry::OutputBody() {
    Write(Json::toString(response->GetBody()));
    fflush(stdout);
}

}  // namespace ZOVA
