#include "FakeTokens.h"

#include <webapi/Json.h>

#include "../../packages/ZOVA.Core.Token/PlatformTokens.h"

FakeTokens& FakeTokens::Instance() {
    static FakeTokens fake;
    return fake;
}

FakeTokens& FakeTokens::Renew() {
    return Instance() = FakeTokens();
}

int ZovaAccessTokenCreate(const char* user, const char* label, long long seconds, const Json::Value* apis,
                          Json::Value* made) {
    FakeTokens& fake = FakeTokens::Instance();
    fake.calls.push_back(std::string("create ") + user + " [" + label + "] " + std::to_string(seconds) + " " +
                         Json::toString(*apis));
    if (fake.result == ZOVA_ACCESS_TOKEN_OK) {
        (*made)["id"] = "id1";
        (*made)["token"] = "token1";
        (*made)["expires"] = 1000;
    }
    return fake.result;
}

int ZovaAccessTokenList(const char* user, Json::Value* tokens) {
    FakeTokens& fake = FakeTokens::Instance();
    fake.calls.push_back(std::string("list ") + user);
    if (fake.result == ZOVA_ACCESS_TOKEN_OK) {
        *tokens = Json::Value(Json::arrayValue);
        tokens->append("described");
    }
    return fake.result;
}

int ZovaAccessTokenRevoke(const char* user, const char* id) {
    FakeTokens& fake = FakeTokens::Instance();
    fake.calls.push_back(std::string("revoke ") + user + " " + id);
    return fake.result;
}
