#include "Cipher.h"

#include "../common/Fence.h"
#include "../common/PlatformLogin.h"

namespace package {
namespace {

constexpr char kScheme[] = "zova-envelope-1";
constexpr int kKeySize = 4096;

}  // namespace

void Cipher(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    Fenced("cipher", response, [&] {
        char key[kKeySize] = {};
        if (ZovaCipherPublicKey(key, kKeySize) < 0 || key[0] == '\0') {
            response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
            return;
        }
        Json::Value data(Json::objectValue);
        data["envelope"]["scheme"] = kScheme;
        data["envelope"]["public_key"] = key;
        response->SetSuccess(data);
    });
}

}  // namespace package
