// The smaller closed libraries on the fake platform: addresses, sharing, tokens, ciphers, web server control.

#include <cerrno>
#include <cstring>

#include "Wrap.h"
#include "zovaaccesstoken.h"
#include "zovacloudservice.h"
#include "zovacredential.h"
#include "zovanetsdk.h"
#include "zovasharing.h"
#include "zovaw3.h"

using fake::FakePlatform;
using fake::Shown;

extern "C" {

int ZOVANetGetAddrType(const char* text) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    platform.Enter(__func__, text, 0);
    const auto found = platform.addressTypes.find(text);
    return found == platform.addressTypes.end() ? 0 : found->second;
}

const char* const SZ_X_SHARING_HEADER = "HTTP_X_FAKE_SHARING";

int ZovaSharingIsAuthorized(const ZovaSharingCredentials* credentials) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    for (const void* reserved : credentials->reserved) {
        if (reserved != nullptr) {
            fake::Unmodelled("sharing credentials that are not zeroed");
        }
    }
    const std::string arguments = Shown(credentials->sharingId) + ", " + Shown(credentials->sessionId);
    return platform.Enter(__func__, arguments, EIO) ? platform.sharingResult : 0;
}

int ZovaAccessTokenGrant(const std::string* tokenId, const char* api, const char* method, char* user, int userSize) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, *tokenId + ", " + api + ", " + method + ", " + std::to_string(userSize), EACCES)) {
        return -1;
    }
    const auto found = platform.deviceTokens.find(*tokenId);
    if (found == platform.deviceTokens.end() || found->second.calls.count({api, method}) == 0) {
        return -1;
    }
    strncpy(user, found->second.user.c_str(), static_cast<std::size_t>(userSize) - 1);
    return 0;
}

int ZOVACloudServiceZntokenGenerateToken(const char* token, char* out, int size) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(token) + ", " + std::to_string(size), EIO)) {
        return -1;
    }
    const std::string key = std::string("key of ") + token;
    strncpy(out, key.c_str(), static_cast<std::size_t>(size) - 1);
    return 0;
}

}  // extern "C"

namespace ZOVA {

bool CredRequestUtil::GetDecryptAESString(const std::string& key, const std::string& cipherText, std::string& plain) {
    FakePlatform& platform = FakePlatform::Required("GetDecryptAESString");
    const auto found = platform.cipherAES.find(key + " " + cipherText);
    if (!platform.Enter("GetDecryptAESString", key + ", " + cipherText, EINVAL) || found == platform.cipherAES.end()) {
        return false;
    }
    plain = found->second;
    return true;
}

namespace sharing {

const char* const SZK_SHARING_SID = "sharing_sid";

bool GetSharingURL(const std::string& host, int port, bool https, const std::string& path,
                   const std::string& rewriteApp, std::string& url, _tag_SHARING_URL_TYPE& type) {
    FakePlatform& platform = FakePlatform::Required("GetSharingURL");
    const std::string arguments =
        host + ", " + std::to_string(port) + (https ? ", https, " : ", http, ") + path + ", " + rewriteApp;
    if (!platform.Enter("GetSharingURL", arguments, EINVAL) || platform.sharingURL.empty()) {
        return false;
    }
    url = platform.sharingURL;
    type = SHARING_URL_HOST;
    return true;
}

namespace record {

std::string Entry::get_project_name() const {
    return projectName;
}

int Entry::get_protect_type() const {
    return protectType;
}

bool Entry::get_enable_match_ip() const {
    return matchIp;
}

uid_t Session::get_uid() const {
    return uid;
}

std::int64_t Session::get_timeout() const {
    return timeout;
}

}  // namespace record

namespace db {

BaseDB::~BaseDB() = default;

bool BaseDB::IsGood() const {
    FakePlatform& platform = FakePlatform::Required("SharingDB::IsGood");
    return platform.Enter("SharingDB::IsGood", "", EIO) && platform.sharingDatabaseGood;
}

SharingDB& SharingDB::Instance() {
    static SharingDB database;
    FakePlatform::Required("SharingDB::Instance").Enter("SharingDB::Instance", "", 0);
    return database;
}

EntryDB::EntryDB(BaseDB& base) : database(base) {}

bool EntryDB::GetByHash(const std::string& hash, record::Entry& out) const {
    FakePlatform& platform = FakePlatform::Required("EntryDB::GetByHash");
    if (!platform.Enter("EntryDB::GetByHash", hash, EIO) || platform.sharingEntries.count(hash) == 0) {
        return false;
    }
    out = platform.sharingEntries[hash];
    out.hash = hash;
    return true;
}

SessionDB::SessionDB(BaseDB& base) : database(base) {}

bool SessionDB::GetBySessionId(const std::string& sid, record::Session& out) const {
    FakePlatform& platform = FakePlatform::Required("SessionDB::GetBySessionId");
    if (!platform.Enter("SessionDB::GetBySessionId", sid, EIO) || platform.sharingSession.id == 0) {
        return false;
    }
    out = platform.sharingSession;
    return true;
}

TokenDB::TokenDB(BaseDB& base) : database(base) {}

bool TokenDB::GetBySessionEntry(const record::Session& session, const record::Entry& entry, record::Token& out) const {
    if (!FakePlatform::Required("TokenDB::GetBySessionEntry")
             .Enter("TokenDB::GetBySessionEntry", std::to_string(session.id) + ", " + entry.hash, EIO)) {
        return false;
    }
    out.id = session.id;
    return true;
}

}  // namespace db
}  // namespace sharing
}  // namespace ZOVA

namespace zovaw3 {

class Engine::Private {};

std::shared_ptr<Engine::Private> Engine::CreatePrivate() {
    return std::make_shared<Private>();
}

ZELM::ZELM(std::shared_ptr<Engine::Private> shared) : engine(std::move(shared)) {}

ZELM::~ZELM() = default;

bool ZELM::RestartService() {
    FakePlatform& platform = FakePlatform::Required("RestartService");
    if (!platform.Enter("RestartService", engine == nullptr ? "no engine" : "", EIO)) {
        return false;
    }
    ++platform.serverRestarts;
    return true;
}

std::uint16_t ZELM::GetHttpsPort() {
    FakePlatform& platform = FakePlatform::Required("GetHttpsPort");
    platform.Enter("GetHttpsPort", engine == nullptr ? "no engine" : "", 0);
    return platform.httpsPort;
}

}  // namespace zovaw3
