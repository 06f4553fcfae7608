#include "query/CurlLibrary.h"

#include <dlfcn.h>

#include "base/Log.h"

namespace ZOVA {

namespace {

constexpr const char* kLibrary = "libcurl.so.4";

template <class Function>
bool Find(void* handle, const char* name, Function& function) {
    function = reinterpret_cast<Function>(dlsym(handle, name));
    return function != nullptr;
}

bool FindAll(void* handle, CurlFunctions& found) {
    return Find(handle, "curl_easy_init", found.easyInit) && Find(handle, "curl_easy_setopt", found.easySetopt) &&
           Find(handle, "curl_easy_perform", found.easyPerform) &&
           Find(handle, "curl_easy_cleanup", found.easyCleanup) &&
           Find(handle, "curl_slist_append", found.slistAppend) &&
           Find(handle, "curl_slist_free_all", found.slistFreeAll);
}

}  // namespace

const CurlFunctions* CurlLibrary::Open() {
    if (functions) {
        return &*functions;
    }
    CurlFunctions found;
    void* handle = dlopen(kLibrary, RTLD_NOW | RTLD_LOCAL);
    if (handle == nullptr || !FindAll(handle, found)) {
        const char* reason = dlerror();
        WEBAPI_LOG(LOG_ERR, "cannot open library: %s. error = %s", kLibrary, reason == nullptr ? "" : reason);
        return nullptr;
    }
    functions = found;
    return &*functions;
}

}  // namespace ZOVA
