#include "Seam.h"
#include "common/JsonText.h"
#include "common/WithoutBlanks.h"
#include "webapi/FormDecoder.h"
#include "webapi/UrlText.h"

namespace ZOVA {

Json::Value WebAPIUtil::ParseToArray(const char* text, const char* separators) {
    Json::Value elements(Json::arrayValue);
    std::string_view rest(text != nullptr ? text : "");
    const std::string_view stops(separators != nullptr ? separators : "");
    while (!rest.empty()) {
        const size_t length = rest.find_first_of(stops);
        const std::string_view element = reference::WithoutBlanks(rest.substr(0, length));
        rest.remove_prefix(length == std::string_view::npos ? rest.size() : length + 1);
        if (!element.empty()) {
            elements.append(Json::Value(element.data(), element.data() + element.size()));
        }
    }
    return elements;
}

std::string WebAPIUtil::URLDecode(const std::string& text, bool keepPlus) {
    return reference::PercentDecode(text, !keepPlus);
}

std::string WebAPIUtil::URLEncode(const std::string& text) {
    return reference::PercentEncode(text);
}

bool WebAPIUtil::strPairToJsonObj(const std::string& pairs, Json::Value& out, bool typed, bool decode) {
    if (!out.isObject() && !out.isNull()) {
        return false;
    }
    reference::DecodeForm(pairs, out, typed, decode);
    return true;
}

bool WebAPIUtil::SzHashToJsonObj(ZovaSzHash* hash, Json::Value& out) {
    if (hash == nullptr || (!out.isObject() && !out.isNull())) {
        return false;
    }
    for (unsigned int at = 0; at < hash->count; ++at) {
        const ZovaSzPair& pair = hash->pairs[at];
        if (pair.key != nullptr && pair.value != nullptr) {
            out[pair.key] = pair.value;
        }
    }
    return true;
}

bool WebAPIUtil::ReadJsonFile(Json::Value& out, const char* path) {
    constexpr size_t kLargest = 16 * 1024 * 1024;
    return path != nullptr &&
           reference::ReadJson(path, kLargest, reference::FileTrust::kAny, out) == reference::ReadResult::kGood;
}

}  // namespace ZOVA
