// Takes the place of common/LazyModule.cpp: the crypto module is linked in, so that it is measured and checked with the
// rest, and needs no installation.

#include <iterator>
#include <string_view>

#include "common/LazyModule.h"
#include "modules/CryptoModule.h"

namespace reference {

namespace {

struct LinkedFunction {
    std::string_view name;
    void* address;
};

const LinkedFunction kFunctions[] = {
    {"ZovaCryptoOpenSealed", reinterpret_cast<void*>(ZovaCryptoOpenSealed)},
    {"ZovaCryptoUnwrapKey", reinterpret_cast<void*>(ZovaCryptoUnwrapKey)},
    {"ZovaCryptoHmacSha256", reinterpret_cast<void*>(ZovaCryptoHmacSha256)},
};

}  // namespace

void* LazyModule::FindSymbol(const char* name) {
    for (const LinkedFunction& function : kFunctions) {
        if (function.name == name) {
            return function.address;
        }
    }
    return nullptr;
}

}  // namespace reference
