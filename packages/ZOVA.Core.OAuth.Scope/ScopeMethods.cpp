#include "ScopeMethods.h"

#include "../common/Fence.h"
#include "../common/RecordList.h"
#include "ScopeRecord.h"

namespace package {
namespace {

constexpr RecordList kScopes = {"oauth-scopes.json", "scope", 256, CheckScope};

}  // namespace

void GetScopes(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    Fenced("get", response, [&] {
        Json::Value scopes;
        if (ReadRecords(kScopes, response, scopes)) {
            Json::Value data(Json::objectValue);
            data["scope"] = scopes;
            response->SetSuccess(data);
        }
    });
}

void SetScopes(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("set", response, [&] { ReplaceRecords(kScopes, request, response); });
}

}  // namespace package
