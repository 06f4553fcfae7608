#include <cstring>
#include <ctime>

#include "Seam.h"
#include "common/Accounts.h"
#include "zovaaccesstoken/TokenStore.h"

int ZovaAccessTokenGrant(const std::string* tokenId, const char* api, const char* method, char* user, int userSize) {
    reference::TokenRecord record;
    if (tokenId == nullptr || api == nullptr || method == nullptr || user == nullptr || userSize <= 0 ||
        reference::TokenStore::Load(*tokenId, record) != reference::TokenStore::Result::kGood ||
        !record.IsInForce(time(nullptr)) || !record.Covers(api, method) ||
        !reference::IsInForce(record.user, record.uid) || record.user.size() >= static_cast<size_t>(userSize)) {
        return -1;
    }
    memcpy(user, record.user.c_str(), record.user.size() + 1);
    return 0;
}
