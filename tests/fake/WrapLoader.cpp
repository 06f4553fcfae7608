// Loading of libraries: real but for libcurl, recorded, failing on demand.

#include <dlfcn.h>

#include <cerrno>

#include "Wrap.h"

using fake::FakePlatform;
using fake::Shown;

extern "C" {
void* __real_dlopen(const char*, int);
void* __real_dlsym(void*, const char*);
char* __real_dlerror();
int __real_dlclose(void*);
}

namespace {

/** What the next `dlerror` says, if a failure was made up. */
const char* madeUpError = nullptr;

}  // namespace

FAKE_EXPORT void* __wrap_dlopen(const char* path, int mode) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("dlopen", Shown(path) + (mode == RTLD_LAZY ? ", lazy" : ""), ENOMEM)) {
        madeUpError = "made-up loading error";
        return nullptr;
    }
    if (platform != nullptr && path != nullptr && std::string(path) == "libcurl.so.4") {
        return fake::CurlHandle();
    }
    if (platform == nullptr || path == nullptr) {
        return __real_dlopen(path, mode);
    }
    return __real_dlopen(platform->Redirected(path).c_str(), mode);
}

FAKE_EXPORT void* __wrap_dlsym(void* handle, const char* name) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("dlsym", name, ENOENT)) {
        madeUpError = "made-up symbol error";
        return nullptr;
    }
    if (handle == fake::CurlHandle()) {
        return fake::CurlFunction(name);
    }
    return __real_dlsym(handle, name);
}

FAKE_EXPORT char* __wrap_dlerror() {
    if (madeUpError != nullptr) {
        char* error = const_cast<char*>(madeUpError);
        madeUpError = nullptr;
        return error;
    }
    return __real_dlerror();
}

FAKE_EXPORT int __wrap_dlclose(void* handle) {
    if (FakePlatform* platform = FakePlatform::Active()) {
        platform->Enter("dlclose", "", 0);
    }
    return __real_dlclose(handle);
}
