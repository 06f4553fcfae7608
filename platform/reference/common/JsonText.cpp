#include "common/JsonText.h"

#include <json/reader.h>
#include <json/writer.h>

#include <cmath>
#include <exception>
#include <memory>

#include "common/JsonSyntax.h"

namespace reference {

namespace {

std::unique_ptr<Json::CharReader> MakeReader() {
    Json::CharReaderBuilder builder;
    builder["collectComments"] = false;
    builder["allowComments"] = false;
    builder["allowTrailingCommas"] = false;
    builder["failIfExtra"] = true;
    builder["stackLimit"] = kJsonDepth + 2;
    return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

/** What the stock library makes of an infinite number, and does not read again. */
constexpr const char* kInfinity = "1e+9999";

void MakeFinite(Json::Value& value) {
    if (value.type() == Json::realValue) {
        if (!std::isfinite(value.asDouble())) {
            value = Json::Value();
        }
    } else if (value.type() == Json::arrayValue || value.type() == Json::objectValue) {
        for (Json::Value& element : value) {
            MakeFinite(element);
        }
    }
}

}  // namespace

bool ParseJson(std::string_view text, Json::Value& out) {
    if (!IsJsonText(text)) {
        return false;
    }
    try {
        const std::unique_ptr<Json::CharReader> reader = MakeReader();
        Json::Value value;
        if (!reader->parse(text.data(), text.data() + text.size(), &value, nullptr)) {
            return false;
        }
        // A copy drops the offsets into the text that the reader leaves in its values.
        out.swapPayload(value);
        return true;
    } catch (const std::exception&) {
        return false;
    }
}

std::string WriteJson(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    std::string text = Json::writeString(builder, value);
    if (text.find(kInfinity) == std::string::npos) {
        return text;
    }
    Json::Value finite = value;
    MakeFinite(finite);
    return Json::writeString(builder, finite);
}

ReadResult ReadJson(const char* path, size_t limit, FileTrust trust, Json::Value& out) {
    std::string text;
    const ReadResult result = ReadFile(path, limit, trust, text);
    if (result != ReadResult::kGood) {
        return result;
    }
    return ParseJson(text, out) ? ReadResult::kGood : ReadResult::kRefused;
}

std::string JsonTextMember(const Json::Value& value, const char* name, const char* fallback) {
    if (value.isObject() && value.isMember(name) && value[name].isString()) {
        return value[name].asString();
    }
    return fallback;
}

}  // namespace reference
