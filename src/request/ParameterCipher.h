#pragma once

#include <json/value.h>

#include <string>

namespace ZOVA {

/** Parameter names of the two ciphers. */
constexpr const char* kAESTokenKey = "__nEkOtReHpIc";
constexpr const char* kAESCipherTextKey = "__tXeTrEhPiC";
constexpr const char* kEnvelopeKey = "webapi";
constexpr const char* kEnvelopeCipherTextKey = "__cIpHeRtExT";
constexpr const char* kEnvelopeCipherTokenKey = "__cIpHeRtOkEn";

/**
 * Deciphers the AES pair of a parameter object, in place: token and cipher text are removed, the pairs of the clear
 * text are added. Nothing happens unless both are there.
 * @return false if either is empty or deciphering fails. Logs nothing.
 */
bool DecipherAES(Json::Value& params);

/** Deciphers an envelope and adds its pairs to `out`. @return false if it cannot be deciphered or parsed. */
bool DecipherEnvelope(const std::string& cipherText, Json::Value& out);

}  // namespace ZOVA
