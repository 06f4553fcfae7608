// What a CGI program costs that is written in C++ with jsoncpp and no framework at all: it parses the JSON text that is
// its query string and writes the same answer as the method "hello" of the measured package.

#include <json/reader.h>
#include <json/value.h>
#include <json/writer.h>

#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>

namespace {

constexpr char kHeaders[] =
    "Content-type: application/json; charset=\"UTF-8\"\r\n"
    "X-Content-Type-Options: nosniff\r\n"
    "X-XSS-Protection: 1; mode=block\r\n"
    "Cache-Control: max-age=0, no-cache, no-store, must-revalidate\r\n"
    "Pragma: no-cache\r\n"
    "Expires: 0\r\n"
    "\r\n";

std::string PercentDecode(const char* text) {
    std::string out;
    for (; *text != '\0'; ++text) {
        if (*text == '%' && isxdigit(text[1]) && isxdigit(text[2])) {
            const char digits[] = {text[1], text[2], '\0'};
            out += static_cast<char>(strtol(digits, nullptr, 16));
            text += 2;
        } else {
            out += *text;
        }
    }
    return out;
}

Json::Value ParseQuery() {
    Json::Value parameters;
    if (const char* query = getenv("QUERY_STRING")) {
        const std::string text = PercentDecode(query);
        const Json::CharReaderBuilder builder;
        const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
        reader->parse(text.data(), text.data() + text.size(), &parameters, nullptr);
    }
    return parameters;
}

Json::Value Answer(const Json::Value& parameters) {
    Json::Value answer(Json::objectValue);
    if (parameters.isObject() && parameters["name"].isString()) {
        answer["data"]["greeting"] = "Hello, " + parameters["name"].asString();
        answer["success"] = true;
    } else {
        answer["error"]["code"] = 400;
        answer["success"] = false;
    }
    return answer;
}

}  // namespace

int main() {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    const std::string body = Json::writeString(builder, Answer(ParseQuery()));
    fwrite(kHeaders, 1, sizeof(kHeaders) - 1, stdout);
    fwrite(body.data(), 1, body.size(), stdout);
    return fflush(stdout) == 0 ? 0 : 1;
}
