#include "request/ParameterCipher.h"

#include <vector>

#include "envelope/APIRequestPrivate.h"
#include "webapi/Json.h"
#include "webapiutil.h"
#include "zovacgi.h"
#include "zovacloudservice.h"
#include "zovacredential.h"

namespace ZOVA {

namespace {

constexpr int kKeyTextSize = 33;

/** Takes a member out as text. */
std::string TakeText(Json::Value& object, const char* name) {
    std::string text = Json::asString(object[name]);
    object.removeMember(name);
    return text;
}

/** What is enciphered in the object itself. */
bool DecipherObject(Json::Value& object) {
    return (!Json::hasMember(object, kEnvelopeCipherTextKey) ||
            DecipherEnvelope(TakeText(object, kEnvelopeCipherTextKey), object)) &&
           DecipherAES(object);
}

}  // namespace

bool DecipherAES(Json::Value& params) {
    if (!Json::hasMember(params, kAESTokenKey) || !Json::hasMember(params, kAESCipherTextKey)) {
        return true;
    }
    const std::string token = TakeText(params, kAESTokenKey);
    const std::string cipherText = TakeText(params, kAESCipherTextKey);
    if (token.empty() || cipherText.empty()) {
        return false;
    }
    char key[kKeyTextSize] = "";
    std::string plain;
    return ZOVACloudServiceZntokenGenerateToken(token.c_str(), key, kKeyTextSize) >= 0 &&
           CredRequestUtil::GetDecryptAESString(key, cipherText, plain) &&
           WebAPIUtil::strPairToJsonObj(plain, params, true, true);
}

bool DecipherEnvelope(const std::string& cipherText, Json::Value& out) {
    std::vector<char> text(cipherText.c_str(), cipherText.c_str() + cipherText.size() + 1);
    return ZovaCgiDecryptParam(text.data()) != 0 && WebAPIUtil::strPairToJsonObj(text.data(), out, true, true);
}

bool APIRequestPrivate::DecryptParam(Json::Value& params) {
    Json::Value* object = &params;
    // A deciphered text may bring an envelope that nests as deep as a document may, and so on: the way down has an end
    // of its own.
    for (int level = 0; level <= Json::kMaximumDepth; ++level) {
        if (!DecipherObject(*object)) {
            return false;
        }
        if (!Json::hasMember(*object, kEnvelopeKey)) {
            return true;
        }
        object = &(*object)[kEnvelopeKey];
    }
    return false;
}

bool APIRequestPrivate::DecryptAESParam(Json::Value& params) {
    return DecipherAES(params);
}

}  // namespace ZOVA
