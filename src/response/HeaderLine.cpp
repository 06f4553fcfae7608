#include "response/HeaderLine.h"

#include "webapi/Json.h"

namespace ZOVA {

namespace {

void AppendHeaderText(std::string& block, const std::string& text) {
    for (char c : text) {
        block += c == '\r' || c == '\n' || c == '\0' ? ' ' : c;
    }
}

}  // namespace

void AppendHeaderLine(std::string& block, const std::string& name, const Json::Value& value) {
    if (value.isString()) {
        AppendHeaderText(block, name);
        block += ": ";
        AppendHeaderText(block, Json::asString(value));
        block += "\r\n";
    }
}

}  // namespace ZOVA
