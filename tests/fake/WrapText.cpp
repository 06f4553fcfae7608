// libwebapi.so: the reference text utilities, recorded and failing on demand. Files come from the fake platform.

#include <cerrno>
#include <stdexcept>

#include "Wrap.h"
#include "webapi/Json.h"
#include "zovacore.h"

using fake::FakePlatform;

// The linker wraps C++ functions by their mangled names: these are members of WebAPIUtil.

#define PAIRS_NAME                            \
    "_ZN4ZOVA10WebAPIUtil16strPairToJsonObjE" \
    "RKNSt7__cxx1112basic_stringIcSt11char_"  \
    "traitsIcESaIcEEERN4Json5ValueEbb"
#define READ_NAME "_ZN4ZOVA10WebAPIUtil12ReadJsonFileERN4Json5ValueEPKc"

#define HASH_NAME "_ZN4ZOVA10WebAPIUtil15SzHashToJsonObjEP10ZovaSzHashRN4Json5ValueE"

bool RealHash(ZovaSzHash* hash, Json::Value& out) __asm__("__real_" HASH_NAME);
bool WrappedHash(ZovaSzHash* hash, Json::Value& out) __asm__("__wrap_" HASH_NAME);
bool RealPairs(const std::string& pairs, Json::Value& out, bool typed, bool decode) __asm__("__real_" PAIRS_NAME);
bool WrappedPairs(const std::string& pairs, Json::Value& out, bool typed, bool decode) __asm__("__wrap_" PAIRS_NAME);
bool WrappedRead(Json::Value& out, const char* path) __asm__("__wrap_" READ_NAME);

bool WrappedPairs(const std::string& pairs, Json::Value& out, bool typed, bool decode) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("strPairToJsonObj", pairs, EINVAL)) {
        return false;
    }
    if (platform != nullptr && !pairs.empty() && pairs == platform->pairsThatThrow) {
        throw std::runtime_error("thrown for \"" + pairs + "\"");
    }
    return RealPairs(pairs, out, typed, decode);
}

bool WrappedHash(ZovaSzHash* hash, Json::Value& out) {
    return FakePlatform::Required("SzHashToJsonObj").Enter("SzHashToJsonObj", "", ENOMEM) && RealHash(hash, out);
}

bool WrappedRead(Json::Value& out, const char* path) {
    FakePlatform& platform = FakePlatform::Required("ReadJsonFile");
    const auto file = platform.files.find(path);
    if (!platform.Enter("ReadJsonFile", path, EIO) || file == platform.files.end()) {
        return false;
    }
    return Json::fromString(out, file->second);
}
