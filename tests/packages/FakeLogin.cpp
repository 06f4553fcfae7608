#include "FakeLogin.h"

#include <cstdio>

#include "../../packages/common/PlatformAccounts.h"
#include "../../packages/common/PlatformLogin.h"

FakeLogin& FakeLogin::Instance() {
    static FakeLogin fake;
    return fake;
}

FakeLogin& FakeLogin::Renew() {
    return Instance() = FakeLogin();
}

int ZovaLoginCheckPassword(const char* user, const char* password, const char* address) {
    FakeLogin& fake = FakeLogin::Instance();
    fake.checks.push_back(std::string(user) + "@" + address);
    if (fake.passwordCheckFails) {
        return ZOVA_LOGIN_FAILED;
    }
    if (fake.blockedAddresses.count(address) != 0) {
        return ZOVA_LOGIN_BLOCKED;
    }
    const auto known = fake.passwords.find(user);
    return known != fake.passwords.end() && known->second == password ? ZOVA_LOGIN_OK : ZOVA_LOGIN_REFUSED;
}

int ZovaSessionCreate(const char* user, const ZovaLoginOptions* options, char* sid, int sidSize, char* token,
                      int tokenSize) {
    FakeLogin& fake = FakeLogin::Instance();
    if (fake.createFails || sidSize < 65 || (options->withToken != 0 && tokenSize < 65)) {
        return -1;
    }
    ++fake.created;
    std::snprintf(sid, sidSize, "sid%d", fake.created);
    FakeLogin::Session session;
    session.user = user;
    session.address = options->address;
    if (options->withToken != 0) {
        std::snprintf(token, tokenSize, "token%d", fake.created);
        session.token = token;
    }
    fake.sessions[sid] = session;
    return 0;
}

int ZovaSessionUser(const char* sid, const char* address, const char* token, char* user, int userSize) {
    FakeLogin& fake = FakeLogin::Instance();
    const auto known = fake.sessions.find(sid);
    if (known == fake.sessions.end()) {
        return -5;
    }
    const FakeLogin::Session& session = known->second;
    if (session.timedOut) {
        return -1;
    }
    if (session.address != address) {
        return -8;
    }
    if (!session.token.empty() && (token == nullptr || session.token != token)) {
        return -7;
    }
    std::snprintf(user, userSize, "%s", session.user.c_str());
    return 1;
}

int ZovaSessionRemove(const char* sid) {
    FakeLogin& fake = FakeLogin::Instance();
    return !fake.removeFails && fake.sessions.erase(sid) != 0 ? 0 : -1;
}

int ZovaCipherPublicKey(char* out, int size) {
    const std::string& key = FakeLogin::Instance().publicKey;
    if (key.empty()) {
        return -1;
    }
    return std::snprintf(out, size, "%s", key.c_str());
}

int QLIBGroupIsAdminGroupMem(const char* user, int) {
    return FakeLogin::Instance().administrators.count(user) != 0 ? 1 : 0;
}
