#include "webapi/FormDecoder.h"

#include <string>

#include "webapi/TypedValue.h"
#include "webapi/UrlText.h"

namespace reference {

namespace {

std::string DecodePart(std::string_view part, bool decode) {
    return decode && part.find_first_of("%+") != std::string_view::npos ? PercentDecode(part, true) : std::string(part);
}

}  // namespace

void DecodeForm(std::string_view pairs, Json::Value& out, bool typed, bool decode) {
    if (out.isNull()) {
        out = Json::Value(Json::objectValue);
    }
    while (!pairs.empty()) {
        const size_t length = pairs.find('&');
        const std::string_view pair = pairs.substr(0, length);
        pairs.remove_prefix(length == std::string_view::npos ? pairs.size() : length + 1);
        if (pair.empty()) {
            continue;
        }
        const size_t equals = pair.find('=');
        const std::string name = DecodePart(pair.substr(0, equals), decode);
        const std::string value =
            equals == std::string_view::npos ? std::string() : DecodePart(pair.substr(equals + 1), decode);
        out[name] = typed ? TypedValue(value) : Json::Value(value);
    }
}

}  // namespace reference
