// Deciphering of parameters: the envelope, alone and as a line, and the parameter pair.

#include <cstring>
#include <string_view>
#include <vector>

#include "Check.h"
#include "CipherTexts.h"
#include "Target.h"
#include "envelope/APIRequestPrivate.h"
#include "request/ParameterCipher.h"
#include "webapi/Json.h"
#include "webapi/WebEntry.h"
#include "webapiutil.h"
#include "zovacgi.h"

namespace {

constexpr std::string_view kLinePrefix = "__cIpHeRtExT=";

std::vector<char> Copy(const std::string& text) {
    return {text.c_str(), text.c_str() + text.size() + 1};
}

bool IsKnown(const char* clear) {
    for (const char* known : fuzz::kClearTexts) {
        if (strcmp(clear, known) == 0) {
            return true;
        }
    }
    return false;
}

void CheckEnvelope(const std::string& text) {
    std::vector<char> place = Copy(text);
    if (ZovaCgiDecryptParam(place.data()) != 0) {
        FUZZ_CHECK(IsKnown(place.data()));
    } else {
        FUZZ_CHECK(memcmp(place.data(), text.c_str(), place.size()) == 0);
    }
    Json::Value out;
    FUZZ_CHECK(!ZOVA::DecipherEnvelope(text, out) || out.type() == Json::objectValue);
}

void CheckLine(const std::string& text) {
    std::vector<char> place = Copy(text);
    const char* result = ZovaCgiDetectAndDecryptParamLine(place.data());
    FUZZ_CHECK(result == nullptr || result == place.data());
    const bool isClear = text.compare(0, kLinePrefix.size(), kLinePrefix) != 0;
    FUZZ_CHECK(!isClear || result != nullptr);
    if (isClear || result == nullptr) {
        FUZZ_CHECK(memcmp(place.data(), text.c_str(), place.size()) == 0);
    }
}

void CheckPair(Json::Value params) {
    const bool both = Json::hasMember(params, ZOVA::kAESTokenKey) && Json::hasMember(params, ZOVA::kAESCipherTextKey);
    const Json::Value before = params;
    const bool good = ZOVA::DecipherAES(params);
    FUZZ_CHECK(params.type() == Json::objectValue);
    if (!both) {
        FUZZ_CHECK(good && params == before);
    } else if (!good) {
        FUZZ_CHECK(!Json::hasMember(params, ZOVA::kAESTokenKey) && !Json::hasMember(params, ZOVA::kAESCipherTextKey));
    }
}

Json::Value Pair(const char* token, const std::string& cipherText) {
    Json::Value params(Json::objectValue);
    params[ZOVA::kAESTokenKey] = token;
    params[ZOVA::kAESCipherTextKey] = cipherText;
    return params;
}

void CheckParameters(const std::string& text) {
    ZOVA::APIRequest request{Json::Value()};
    Json::Value params(Json::objectValue);
    params["other"] = 1;
    params[ZOVA::kEnvelopeCipherTextKey] = text;
    params[ZOVA::kEnvelopeKey] = params;
    const bool good = ZOVA::APIRequestPrivate::Of(request).DecryptParam(params);
    for (const Json::Value* object : {&params, &params[ZOVA::kEnvelopeKey]}) {
        FUZZ_CHECK(Json::asInt(Json::member(*object, "other")) == 1);
        FUZZ_CHECK(!good || !Json::hasMember(*object, ZOVA::kEnvelopeCipherTextKey));
    }
}

void CheckIntake(const std::string& text) {
    static ZOVA::WebEntry entry;
    Json::Value out;
    if (entry.DetectAndDecryptParamLine(text, out)) {
        FUZZ_CHECK(out.type() == Json::objectValue);
    }
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    // The libraries take texts that end at a NUL.
    const std::string text = fuzz::TextOf(data, size).c_str();
    CheckLine(text);
    CheckEnvelope(text.compare(0, kLinePrefix.size(), kLinePrefix) == 0 ? text.substr(kLinePrefix.size()) : text);
    CheckPair(Pair(fuzz::kToken, text));
    CheckParameters(text);
    Json::Value form;
    if (ZOVA::WebAPIUtil::strPairToJsonObj(text, form, true, true)) {
        CheckPair(form);
    }
    CheckIntake(text);
    CheckIntake("webapi=" + ZOVA::WebAPIUtil::URLEncode(text));
    return 0;
}
