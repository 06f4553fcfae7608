#include "ScopeRecord.h"

#include <webapi/Json.h>

#include <cstddef>
#include <string>

#include "../common/PlatformText.h"
#include "../common/Text.h"

namespace package {
namespace {

constexpr char kId[] = "id";
constexpr char kApis[] = "apis";
constexpr const char* kScopeMembers[] = {kId, kApis, nullptr};

constexpr char kEndpoint[] = "endpoint";
constexpr char kParams[] = "params";
constexpr const char* kApiMembers[] = {kEndpoint, kParams, nullptr};

constexpr std::size_t kLongestId = 255;
constexpr std::size_t kLongestEndpoint = 2048;
constexpr std::size_t kLongestFilter = 4096;

std::string Element(const std::string& array, Json::ArrayIndex at) {
    return array + "[" + std::to_string(at) + "]";
}

/** Why a value is no text of at most `longest` bytes without control bytes; null if it is one. */
const char* WhyNotText(const Json::Value& value, std::size_t longest) {
    if (!value.isString()) {
        return "type";
    }
    const std::string text = Json::asString(value);
    if (text.size() > longest) {
        return "length";
    }
    return HasControlBytes(text) ? "characters" : nullptr;
}

const char* WhyNotId(const Json::Value& records, Json::ArrayIndex at) {
    const Json::Value& id = records[at][kId];
    if (const char* reason = WhyNotText(id, kLongestId)) {
        return reason;
    }
    const std::string text = Json::asString(id);
    if (text.empty()) {
        return "length";
    }
    // A token names its scopes with blanks between them.
    if (text.find(' ') != std::string::npos) {
        return "characters";
    }
    for (Json::ArrayIndex earlier = 0; earlier < at; ++earlier) {
        if (Json::member(records[earlier], kId) == id) {
            return "twice";
        }
    }
    return nullptr;
}

/** An empty prefix would open every API, and no method is empty. */
bool IsTextIfThere(const Json::Value& filter, const char* name) {
    return !Json::hasMember(filter, name) || (filter[name].isString() && !Json::asString(filter[name]).empty());
}

bool IsVersionIfThere(const Json::Value& filter) {
    return !Json::hasMember(filter, "version") || (filter["version"].isInt() && filter["version"].asInt() > 0);
}

const char* WhyNotFilter(const Json::Value& line) {
    if (const char* reason = WhyNotText(line, kLongestFilter)) {
        return reason;
    }
    Json::Value filter(Json::objectValue);
    if (!ZOVA::WebAPIUtil::strPairToJsonObj(Json::asString(line), filter, true, false) || filter.empty()) {
        return "pairs";
    }
    return IsTextIfThere(filter, "api") && IsTextIfThere(filter, "method") && IsVersionIfThere(filter) ? nullptr
                                                                                                       : "value";
}

std::optional<RecordProblem> CheckApi(const Json::Value& api, const std::string& place) {
    if (auto problem = CheckForm(api, kApiMembers)) {
        return RecordProblem{problem->member.empty() ? place : place + "." + problem->member, problem->reason};
    }
    if (Json::hasMember(api, kEndpoint)) {
        if (const char* reason = WhyNotText(api[kEndpoint], kLongestEndpoint)) {
            return RecordProblem{place + "." + kEndpoint, reason};
        }
    }
    const std::string paramsPlace = place + "." + kParams;
    if (!Json::hasMember(api, kParams)) {
        return RecordProblem{paramsPlace, "missing"};
    }
    const Json::Value& params = api[kParams];
    if (params.type() != Json::arrayValue) {
        return RecordProblem{paramsPlace, "type"};
    }
    if (params.empty()) {
        return RecordProblem{paramsPlace, "length"};
    }
    for (Json::ArrayIndex at = 0; at < params.size(); ++at) {
        if (const char* reason = WhyNotFilter(params[at])) {
            return RecordProblem{Element(paramsPlace, at), reason};
        }
    }
    return std::nullopt;
}

}  // namespace

std::optional<RecordProblem> CheckScope(const Json::Value& records, Json::ArrayIndex at) {
    const Json::Value& record = records[at];
    if (auto problem = CheckForm(record, kScopeMembers)) {
        return problem;
    }
    for (const char* required : {kId, kApis}) {
        if (!Json::hasMember(record, required)) {
            return RecordProblem{required, "missing"};
        }
    }
    if (const char* reason = WhyNotId(records, at)) {
        return RecordProblem{kId, reason};
    }
    const Json::Value& apis = record[kApis];
    if (apis.type() != Json::arrayValue) {
        return RecordProblem{kApis, "type"};
    }
    for (Json::ArrayIndex api = 0; api < apis.size(); ++api) {
        if (auto problem = CheckApi(apis[api], Element(kApis, api))) {
            return problem;
        }
    }
    return std::nullopt;
}

}  // namespace package
