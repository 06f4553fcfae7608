// The form decoder, in all its forms, beside a second and plainer reading of the same text.

#include <map>

#include "Check.h"
#include "JsonRoundTrip.h"
#include "Target.h"
#include "webapi/Json.h"
#include "webapiutil.h"

namespace {

using ZOVA::WebAPIUtil;

std::string Decoded(const std::string& text, bool decode) {
    return decode ? WebAPIUtil::URLDecode(text, false) : text;
}

std::map<std::string, std::string> PlainPairs(const std::string& text, bool decode) {
    std::map<std::string, std::string> pairs;
    size_t start = 0;
    while (start <= text.size()) {
        const size_t end = std::min(text.find('&', start), text.size());
        const std::string pair = text.substr(start, end - start);
        const size_t equals = std::min(pair.find('='), pair.size());
        if (!pair.empty()) {
            const std::string value = equals < pair.size() ? pair.substr(equals + 1) : "";
            pairs[Decoded(pair.substr(0, equals), decode)] = Decoded(value, decode);
        }
        start = end + 1;
    }
    return pairs;
}

/** A typed value is what the JSON layer reads from its text, or the text itself. */
void CheckTyped(const Json::Value& value, const std::string& text) {
    if (value.isString() && Json::asString(value) == text) {
        return;
    }
    Json::Value expected;
    FUZZ_CHECK(Json::fromString(expected, text));
    FUZZ_CHECK(Json::toString(value) == Json::toString(expected));
}

void CheckForm(const std::string& text, bool typed, bool decode) {
    Json::Value out;
    FUZZ_CHECK(WebAPIUtil::strPairToJsonObj(text, out, typed, decode));
    FUZZ_CHECK(out.type() == Json::objectValue);
    const std::map<std::string, std::string> pairs = PlainPairs(text, decode);
    FUZZ_CHECK(out.size() == pairs.size());
    for (const auto& [name, value] : pairs) {
        FUZZ_CHECK(Json::hasMember(out, name));
        const Json::Value& member = Json::member(out, name);
        if (typed) {
            CheckTyped(member, value);
        } else {
            FUZZ_CHECK(member.isString() && Json::asString(member) == value);
        }
    }
    fuzz::CheckRoundTrip(out);
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string text = fuzz::TextOf(data, size);
    for (const bool typed : {false, true}) {
        for (const bool decode : {false, true}) {
            CheckForm(text, typed, decode);
        }
    }
    FUZZ_CHECK(WebAPIUtil::URLDecode(WebAPIUtil::URLEncode(text), false) == text);
    FUZZ_CHECK(WebAPIUtil::URLDecode(text, true).size() <= text.size());
    Json::Value list(Json::arrayValue);
    FUZZ_CHECK(!WebAPIUtil::strPairToJsonObj(text, list, true, true) && list.empty());
    return 0;
}
