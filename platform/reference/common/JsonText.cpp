#include "common/JsonText.h"

#include <json/reader.h>
#include <json/writer.h>

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
    return Json::writeString(builder, value);
}

ReadResult ReadJson(const char* path, size_t limit, FileTrust trust, Json::Value& out) {
    std::string text;
    const ReadResult result = ReadFile(path, limit, trust, text);
    if (result != ReadResult::kGood) {
        return result;
    }
    return ParseJson(text, out) ? ReadResult::kGood : ReadResult::kRefused;
}

}  // namespace reference
