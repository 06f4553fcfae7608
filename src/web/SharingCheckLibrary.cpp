#include <dlfcn.h>
#include <regex.h>

#include <cstring>

#include "base/Fence.h"
#include "base/Log.h"
#include "base/Printable.h"
#include "dispatcher/HatScope.h"
#include "dispatcher/IdentityScope.h"
#include "webapi/APIRequest.h"
#include "webapi/Json.h"
#include "webapi/WebEntry.h"
#include "zovacredentials.h"
#include "zovasharing.h"

namespace ZOVA {

namespace {

constexpr const char* kCheckLibraries = "/usr/lib/sharing/permission_lib/";

std::string ProjectOf(const APIRequest& call) {
    return call.GetSharingEntry().get_project_name();
}

bool IsEmpty(const char* regex) {
    return regex == nullptr || *regex == '\0';
}

/** Calls into the project's code: no exception leaves it, and one is a no. */
bool Ask(APICheckFunc check, APIRequest* call, APIResponse* answer) {
    bool agreed = false;
    if (const auto thrown = base::ThrownBy([&] { agreed = check(call, answer); })) {
        WEBAPI_LOG(LOG_ERR, "the sharing check of %s threw: %s", base::Printable(ProjectOf(*call)).c_str(),
                   thrown->c_str());
    }
    return agreed;
}

}  // namespace

bool WebEntry::CheckSharingAppPermission(APIRequest* call, APIResponse* answer) {
    const std::string path = GetSharingCheckLibPath(call);
    const HatScope hat(SharingProject{ProjectOf(*call)});
    _tag_API_SHARING_CHECK_TABLE* table = nullptr;
    APICheckFunc check = nullptr;
    IdentityScope identity;
    if (hat.IsRefused() || !OpenSharingCheckLib(call, &table) || !GetSharingCheckFunc(call, table, &check) ||
        check == nullptr || !identity.Save()) {
        return false;
    }
    InitCredentialsByExecutable(path.c_str(), 1);
    const bool agreed = Ask(check, call, answer);
    identity.RestoreKept();
    return agreed;
}

std::string WebEntry::GetSharingCheckLibPath(APIRequest* call) {
    const std::string project = ProjectOf(*call);
    if (project.empty() || project.find("../") != std::string::npos) {
        return "";
    }
    return kCheckLibraries + project + ".so";
}

bool WebEntry::OpenSharingCheckLib(APIRequest* call, _tag_API_SHARING_CHECK_TABLE** table) {
    const std::string path = GetSharingCheckLibPath(call);
    if (table == nullptr || path.empty()) {
        WEBAPI_LOG(LOG_ERR, "Bad parameters");
        return false;
    }
    const auto known = openLibraries.find(path);
    void* handle = known == openLibraries.end() ? nullptr : known->second;
    if (handle == nullptr) {
        handle = dlopen(path.c_str(), RTLD_LAZY);
        if (handle == nullptr) {
            WEBAPI_LOG(LOG_ERR, "cannot open library: %s. error = %s", base::Printable(path).c_str(),
                       base::Printable(dlerror()).c_str());
            return false;
        }
        openLibraries[path] = handle;
    }
    if (!GetSharingCheckTableFunc(handle, table)) {
        WEBAPI_LOG(LOG_ERR, "Get Sharing Check Table Fail");
        return false;
    }
    return true;
}

bool WebEntry::GetSharingCheckTableFunc(void* handle, _tag_API_SHARING_CHECK_TABLE** table) {
    if (handle == nullptr || table == nullptr) {
        return false;
    }
    dlerror();
    const auto function =
        reinterpret_cast<_tag_API_SHARING_CHECK_TABLE* (*)()>(dlsym(handle, "GetAPISharingCheckTable"));
    if (const char* error = dlerror()) {
        WEBAPI_LOG(LOG_DEBUG, "cannot load sharing check table: %s", error);
        return false;
    }
    *table = function == nullptr ? nullptr : function();
    if (*table == nullptr) {
        WEBAPI_LOG(LOG_ERR, "cannot get sharing check table");
        return false;
    }
    return true;
}

bool WebEntry::GetSharingCheckFunc(APIRequest* call, _tag_API_SHARING_CHECK_TABLE* table,
                                   bool (**check)(APIRequest*, APIResponse*)) {
    if (call == nullptr || table == nullptr || check == nullptr) {
        WEBAPI_LOG(LOG_ERR, "bad parameters");
        return false;
    }
    const std::string project = base::Printable(ProjectOf(*call));
    const std::string api = call->GetAPIClass();
    const std::string method = call->GetAPIMethod();
    const int version = call->GetAPIVersion();
    for (const _tag_API_SHARING_CHECK_TABLE* row = table; row->apiRegex != nullptr; ++row) {
        if (row->version != 0 && row->version != version) {
            continue;
        }
        if (IsEmpty(row->apiRegex)) {
            WEBAPI_LOG(LOG_ERR, "warning: empty api regex in %s", project.c_str());
            continue;
        }
        if (RegexMatch(row->apiRegex, api.c_str()) != 0) {
            continue;
        }
        if (IsEmpty(row->methodRegex)) {
            WEBAPI_LOG(LOG_ERR, "warning: empty method regex in %s", project.c_str());
            continue;
        }
        if (RegexMatch(row->methodRegex, method.c_str()) == 0) {
            *check = row->check;
            return true;
        }
    }
    return false;
}

int WebEntry::RegexMatch(const char* regex, const char* text) {
    if (strcmp(regex, "*") == 0) {
        return 0;
    }
    regex_t compiled;
    const int malformed = regcomp(&compiled, regex, REG_EXTENDED);
    if (malformed != 0) {
        return malformed;
    }
    const int result = regexec(&compiled, text, 0, nullptr, 0);
    regfree(&compiled);
    return result;
}

}  // namespace ZOVA
