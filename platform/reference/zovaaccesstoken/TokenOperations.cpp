#include <ctime>

#include "Seam.h"
#include "common/Accounts.h"
#include "common/Hex.h"
#include "common/RandomBytes.h"
#include "zovaaccesstoken/TokenStore.h"
#include "zovacgi/Session.h"
#include "zovacgi/SessionId.h"

using reference::TokenRecord;
using reference::TokenStore;

namespace {

int ResultOf(TokenStore::Result result) {
    switch (result) {
        case TokenStore::Result::kGood:
            return ZOVA_ACCESS_TOKEN_OK;
        case TokenStore::Result::kUnknown:
            return ZOVA_ACCESS_TOKEN_UNKNOWN;
        case TokenStore::Result::kTooMany:
            return ZOVA_ACCESS_TOKEN_TOO_MANY;
        case TokenStore::Result::kFailed:
            break;
    }
    return ZOVA_ACCESS_TOKEN_FAILED;
}

bool TakeAccount(const char* user, TokenRecord& record) {
    const auto account = reference::FindAccount(user);
    if (!account || account->name.size() > reference::kLongestUserName ||
        !reference::IsInForce(account->name, account->uid)) {
        return false;
    }
    record.user = account->name;
    record.uid = account->uid;
    return true;
}

std::string MakeId() {
    char bytes[reference::kTokenIdDigits / 2];
    return reference::FillRandom(bytes, sizeof(bytes)) ? reference::HexText(std::string_view(bytes, sizeof(bytes)))
                                                       : std::string();
}

Json::Value Describe(const TokenRecord& record) {
    Json::Value value(Json::objectValue);
    value["id"] = record.id;
    value["label"] = record.label;
    value["apis"] = reference::TokenScopesJson(record.apis);
    value["created"] = Json::Int64(record.created);
    value["expires"] = Json::Int64(record.expires);
    return value;
}

}  // namespace

int ZovaAccessTokenCreate(const char* user, const char* label, long long seconds, const Json::Value* apis,
                          Json::Value* made) {
    TokenRecord record;
    if (apis == nullptr || made == nullptr || !reference::ParseTokenScopes(*apis, record.apis)) {
        return ZOVA_ACCESS_TOKEN_BAD_APIS;
    }
    if (label == nullptr || !reference::IsTokenLabel(label)) {
        return ZOVA_ACCESS_TOKEN_BAD_LABEL;
    }
    if (seconds < reference::kShortestTokenTime || seconds > reference::kLongestTokenTime) {
        return ZOVA_ACCESS_TOKEN_BAD_TIME;
    }
    if (!TakeAccount(user, record)) {
        return ZOVA_ACCESS_TOKEN_NO_USER;
    }
    record.label = label;
    record.created = time(nullptr);
    record.expires = record.created + seconds;
    record.id = MakeId();
    const std::string token = reference::MakeSecret();
    if (record.id.empty() || token.empty()) {
        return ZOVA_ACCESS_TOKEN_FAILED;
    }
    if (reference::WriteTokenRecord(record).size() > reference::kLargestTokenRecord) {
        return ZOVA_ACCESS_TOKEN_BAD_APIS;
    }
    const int result = ResultOf(TokenStore::Add(token, record));
    if (result == ZOVA_ACCESS_TOKEN_OK) {
        *made = Json::Value(Json::objectValue);
        (*made)["id"] = record.id;
        (*made)["token"] = token;
        (*made)["expires"] = Json::Int64(record.expires);
    }
    return result;
}

int ZovaAccessTokenList(const char* user, Json::Value* tokens) {
    const auto account = reference::FindAccount(user);
    if (!account) {
        return ZOVA_ACCESS_TOKEN_NO_USER;
    }
    std::vector<TokenRecord> records;
    const auto result = TokenStore::List(account->name, account->uid, records);
    if (result == TokenStore::Result::kGood && tokens != nullptr) {
        *tokens = Json::Value(Json::arrayValue);
        for (const TokenRecord& record : records) {
            tokens->append(Describe(record));
        }
    }
    return ResultOf(result);
}

int ZovaAccessTokenRevoke(const char* user, const char* id) {
    const auto account = reference::FindAccount(user);
    if (!account) {
        return ZOVA_ACCESS_TOKEN_NO_USER;
    }
    if (id == nullptr || !reference::IsTokenId(id)) {
        return ZOVA_ACCESS_TOKEN_UNKNOWN;
    }
    return ResultOf(TokenStore::Remove(account->name, account->uid, id));
}
