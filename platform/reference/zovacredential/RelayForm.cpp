#include "zovacredential/RelayForm.h"

#include <algorithm>
#include <iterator>

#include "common/JsonText.h"
#include "webapi/TypedValue.h"
#include "webapi/UrlText.h"

namespace reference {

namespace {

/** What the call itself says stands in front, once. */
constexpr const char* kNaming[] = {"api", "version", "method"};
constexpr const char* kCredentials[] = {"_sid", "tid", "_oat", "_sharing_id", "_sharing_sid"};
constexpr const char* kCiphers[] = {"__nEkOtReHpIc", "__tXeTrEhPiC", "__cIpHeRtExT", "__cIpHeRtOkEn"};
constexpr const char* kRelay[] = {"relay_zn", "relay_timeout"};
/** An object in which an envelope may stand. */
constexpr const char* kEnvelopeHolder = "webapi";

template <size_t Count>
bool IsOneOf(const char* const (&names)[Count], const std::string& name) {
    return std::any_of(std::begin(names), std::end(names), [&](const char* other) { return name == other; });
}

bool Travels(const std::string& name) {
    return !IsOneOf(kNaming, name) && !IsOneOf(kCredentials, name) && !IsOneOf(kCiphers, name) &&
           !IsOneOf(kRelay, name);
}

/** The object without an envelope in it, nor in an object of that name inside it. */
Json::Value WithoutEnvelope(const Json::Value& holder) {
    Json::Value clear = holder;
    for (Json::Value* level = &clear; level->isObject();) {
        for (const char* name : kCiphers) {
            level->removeMember(name);
        }
        if (!level->isMember(kEnvelopeHolder)) {
            break;
        }
        level = &(*level)[kEnvelopeHolder];
    }
    return clear;
}

std::string Pair(const std::string& name, const std::string& value) {
    return PercentEncode(name) + "=" + PercentEncode(value);
}

}  // namespace

std::string TypedText(const Json::Value& value) {
    if (value.isString()) {
        std::string text = value.asString();
        return TypedValue(text).isString() && TypedValue(text) == value ? text : WriteJson(value);
    }
    return WriteJson(value);
}

std::string CallForm(const RelayCall& call, const std::string& token) {
    return Pair("tid", TypedText(token)) + "&" + Pair("api", TypedText(call.api)) + "&" +
           Pair("version", std::to_string(call.version)) + "&" + Pair("method", TypedText(call.method));
}

std::string CallForm(const RelayCall& call, const std::string& token, const Json::Value& params) {
    std::string form = CallForm(call, token);
    for (auto param = params.begin(); param != params.end(); ++param) {
        const std::string name = param.name();
        if (Travels(name)) {
            form += "&" + Pair(name, TypedText(name == kEnvelopeHolder ? WithoutEnvelope(*param) : *param));
        }
    }
    return form;
}

}  // namespace reference
