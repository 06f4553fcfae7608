#include <dlfcn.h>

#include "base/Log.h"
#include "webapi/APIRequest.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"

namespace ZOVA {

bool APIRunner::OpenLib(APIRequest* call, _tag_API_TABLE** table, _tag_API_CHECK_TABLE** checkTable) {
    if (call == nullptr || table == nullptr) {
        WEBAPI_LOG(LOG_ERR, "Bad parameters");
        return false;
    }
    void* handle = nullptr;
    if (!CacheLib(call, &handle)) {
        return false;
    }
    if (checkTable != nullptr) {
        GetCheckTableFunc(handle, checkTable);
    }
    if (!GetTableFunc(handle, table)) {
        WEBAPI_LOG(LOG_ERR, "Get API Table Fail");
        return false;
    }
    return true;
}

bool APIRunner::CacheLib(APIRequest* call, void** handle) {
    const std::string path = Json::asString(call->GetAPIInfo("lib", ""));
    if (path.empty()) {
        WEBAPI_LOG(LOG_ERR, "library path empty");
        return false;
    }
    const auto known = openLibraries.find(path);
    if (known != openLibraries.end()) {
        *handle = known->second;
        return true;
    }
    *handle = dlopen(path.c_str(), RTLD_LAZY);
    if (*handle == nullptr) {
        WEBAPI_LOG(LOG_ERR, "cannot open library: %s. error = %s", path.c_str(), dlerror());
        return false;
    }
    openLibraries[path] = *handle;
    return true;
}

bool APIRunner::GetTableFunc(void* handle, _tag_API_TABLE** table) {
    if (handle == nullptr || table == nullptr) {
        return false;
    }
    dlerror();
    const auto function = reinterpret_cast<_tag_API_TABLE* (*)()>(dlsym(handle, "GetAPITable"));
    if (const char* error = dlerror()) {
        WEBAPI_LOG(LOG_DEBUG, "cannot load table: %s", error);
        return false;
    }
    *table = function == nullptr ? nullptr : function();
    if (*table == nullptr) {
        WEBAPI_LOG(LOG_ERR, "cannot get api table");
        return false;
    }
    return true;
}

bool APIRunner::GetCheckTableFunc(void* handle, _tag_API_CHECK_TABLE** table) {
    if (handle == nullptr || table == nullptr) {
        return false;
    }
    dlerror();
    const auto function = reinterpret_cast<_tag_API_CHECK_TABLE* (*)()>(dlsym(handle, "GetAPICheckTable"));
    if (dlerror() != nullptr || function == nullptr) {
        return true;
    }
    *table = function();
    if (*table == nullptr) {
        WEBAPI_LOG(LOG_ERR, "cannot get api check table");
        return false;
    }
    return true;
}

void APIRunner::CloseLib() {
    for (const auto& library : openLibraries) {
        dlclose(library.second);
    }
    openLibraries.clear();
}

}  // namespace ZOVA
