#include "common/LazyModule.h"

#include <dlfcn.h>
#include <syslog.h>

#include <string>

#include "Paths.h"

namespace reference {

namespace {

/** Folder of the modules with a slash at its end, or "" if it cannot be told. */
std::string ModuleDirectory() {
    if (*paths::kModuleDirectory != '\0') {
        return std::string(paths::kModuleDirectory) + "/";
    }
    static const char kInThisLibrary = 0;
    Dl_info info;
    if (dladdr(&kInThisLibrary, &info) == 0 || info.dli_fname == nullptr || info.dli_fname[0] != '/') {
        return "";
    }
    const std::string library(info.dli_fname);
    return library.substr(0, library.rfind('/')) + "/zova/";
}

}  // namespace

void LazyModule::Open() {
    tried = true;
    const std::string directory = ModuleDirectory();
    if (!directory.empty()) {
        handle = dlopen((directory + fileName).c_str(), RTLD_NOW | RTLD_LOCAL);
    }
    if (handle == nullptr) {
        const char* reason = dlerror();
        syslog(LOG_ERR, "module %s cannot be opened [%s]", fileName, reason != nullptr ? reason : "no folder");
    }
}

void* LazyModule::FindSymbol(const char* name) {
    if (!tried) {
        Open();
    }
    return handle != nullptr ? dlsym(handle, name) : nullptr;
}

}  // namespace reference
