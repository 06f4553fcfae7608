#include "ServerRecord.h"

#include <strings.h>
#include <webapi/Json.h>

#include <algorithm>
#include <cstddef>
#include <set>
#include <string>

#include "../common/PlatformText.h"
#include "../common/Text.h"

namespace package {
namespace {

constexpr char kEnabled[] = "enabled";
constexpr char kEndpoint[] = "endpoint";
constexpr char kHeader[] = "header";
constexpr char kParams[] = "params";
constexpr char kExpect[] = "expect";
constexpr const char* kMembers[] = {kEnabled, kEndpoint, kHeader, kParams, kExpect, nullptr};

constexpr char kToken[] = "{access_token}";
constexpr std::size_t kLongestEndpoint = 2048;
constexpr std::size_t kLongestText = 16 << 10;

bool BeginsWith(const std::string& text, const std::string& beginning) {
    return strncasecmp(text.c_str(), beginning.c_str(), beginning.size()) == 0;
}

/** What a URL consists of: printable ASCII without blanks. */
bool IsUrlByte(char c) {
    return c > 0x20 && c < 0x7F;
}

const char* WhyNotEndpoint(const std::string& endpoint) {
    const std::string https = "https://";
    if (endpoint.size() > kLongestEndpoint) {
        return "length";
    }
    if (!std::all_of(endpoint.begin(), endpoint.end(), IsUrlByte)) {
        return "characters";
    }
    if (!BeginsWith(endpoint, https)) {
        return endpoint.find("://") == std::string::npos ? nullptr : "scheme";
    }
    const std::string rest = endpoint.substr(https.size());
    return rest.empty() || rest.find_first_of("/?#:") == 0 ? "host" : nullptr;
}

bool IsNameByte(char c) {
    static const std::string kMarks = "!#$%&'*+-.^_`|~";
    return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') ||
           kMarks.find(c) != std::string::npos;
}

/** "Name: value". A name without a value would take a header away instead of adding one. */
bool IsHeaderLine(const std::string& line) {
    const std::size_t colon = line.find(':');
    if (colon == std::string::npos || colon == 0) {
        return false;
    }
    const std::string name = line.substr(0, colon);
    return std::all_of(name.begin(), name.end(), IsNameByte) &&
           line.find_first_not_of(" \t", colon + 1) != std::string::npos;
}

const char* WhyNotHeader(const std::string& header) {
    if (header.size() > kLongestText) {
        return "length";
    }
    for (std::size_t at = 0; at <= header.size();) {
        const std::size_t end = std::min(header.find('\n', at), header.size());
        std::string line = header.substr(at, end - at);
        if (!line.empty() && !IsHeaderLine(line)) {
            return "line";
        }
        std::replace(line.begin(), line.end(), '\t', ' ');
        if (HasControlBytes(line)) {
            return "characters";
        }
        at = end + 1;
    }
    return nullptr;
}

/** Whether the text names an API of this device, as it has to where no server is named. */
bool IsLocalCall(const std::string& params) {
    Json::Value call(Json::objectValue);
    ZOVA::WebAPIUtil::strPairToJsonObj(params, call, true, false);
    const auto isName = [&](const char* member) { return !Json::asString(Json::member(call, member)).empty(); };
    return isName("api") && isName("method") && Json::asInt(Json::member(call, "version")) > 0;
}

const char* WhyNotParams(const Json::Value& params, bool isLocal) {
    if (!params.isString() && params.type() != Json::objectValue) {
        return "type";
    }
    const std::string text = params.isString() ? Json::asString(params) : Json::toString(params);
    if (text.size() > kLongestText) {
        return "length";
    }
    // What is sent ends at the first NUL.
    if (text.find('\0') != std::string::npos) {
        return "characters";
    }
    if (text.find(kToken) == std::string::npos) {
        return "token";
    }
    return isLocal && !IsLocalCall(text) ? "call" : nullptr;
}

/** Adds the names under which the template stores what it finds in an answer. */
void CollectNames(const Json::Value& expect, std::set<std::string>& names) {
    for (const Json::Value& value : expect) {
        if (value.type() == Json::objectValue) {
            CollectNames(value, names);
            continue;
        }
        const std::string text = value.isString() ? Json::asString(value) : std::string();
        if (text.rfind('{', 0) == 0 && text.find('}') == text.size() - 1) {
            names.insert(text.substr(1, text.size() - 2));
        }
    }
}

const char* WhyNotExpect(const Json::Value& expect) {
    if (expect.type() != Json::objectValue) {
        return "type";
    }
    std::set<std::string> names;
    CollectNames(expect, names);
    return names.count("userName") == 1 && names.count("scope") == 1 ? nullptr : "names";
}

const char* WhyNotOptionalText(const Json::Value& record, const char* name, const char* (*check)(const std::string&)) {
    if (!Json::hasMember(record, name)) {
        return nullptr;
    }
    const Json::Value& text = Json::member(record, name);
    return text.isString() ? check(Json::asString(text)) : "type";
}

}  // namespace

std::optional<RecordProblem> CheckServer(const Json::Value& records, Json::ArrayIndex at) {
    const Json::Value& record = records[at];
    if (auto problem = CheckForm(record, kMembers)) {
        return problem;
    }
    for (const char* required : {kEnabled, kParams, kExpect}) {
        if (!Json::hasMember(record, required)) {
            return RecordProblem{required, "missing"};
        }
    }
    if (!record[kEnabled].isBool()) {
        return RecordProblem{kEnabled, "type"};
    }
    if (const char* reason = WhyNotOptionalText(record, kEndpoint, WhyNotEndpoint)) {
        return RecordProblem{kEndpoint, reason};
    }
    if (const char* reason = WhyNotOptionalText(record, kHeader, WhyNotHeader)) {
        return RecordProblem{kHeader, reason};
    }
    const bool isLocal = Json::asString(Json::member(record, kEndpoint)).empty();
    if (const char* reason = WhyNotParams(record[kParams], isLocal)) {
        return RecordProblem{kParams, reason};
    }
    if (const char* reason = WhyNotExpect(record[kExpect])) {
        return RecordProblem{kExpect, reason};
    }
    return std::nullopt;
}

}  // namespace package
