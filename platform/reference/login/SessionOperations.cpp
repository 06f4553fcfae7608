#include <cstring>
#include <ctime>

#include "Seam.h"
#include "common/Accounts.h"
#include "common/Base64.h"
#include "common/ControlBytes.h"
#include "common/Crypto.h"
#include "common/DeviceInformation.h"
#include "common/DeviceKeys.h"
#include "common/NetAddress.h"
#include "zovacgi/SessionCheck.h"
#include "zovacgi/SessionId.h"
#include "zovacgi/SessionStore.h"

using reference::SessionStore;

namespace {

constexpr size_t kLongestOption = 255;

bool CopyOption(const char* text, std::string& out) {
    if (text == nullptr) {
        return true;
    }
    if (strnlen(text, kLongestOption + 1) > kLongestOption) {
        return false;
    }
    out = text;
    return !reference::HasControlByte(out);
}

/** False unless the session is bound to an address or is not to be. */
bool TakeOptions(const ZovaLoginOptions& options, reference::Session& session) {
    const auto address = reference::NetAddress::Parse(options.address != nullptr ? options.address : "");
    if (address) {
        session.address = address->Text();
    }
    if (options.skipCheckIP != 0) {
        session.skipCheckIp = true;
    }
    return (address || options.skipCheckIP != 0) && CopyOption(options.app, session.app) &&
           CopyOption(options.webapi, session.webapi);
}

bool TakeAccount(const char* user, reference::Session& session) {
    const auto account = reference::FindAccount(user);
    if (!account || account->uid == 0 || account->name == reference::kSystemUser ||
        account->name.size() > reference::kLongestUserName) {
        return false;
    }
    session.user = account->name;
    session.uid = account->uid;
    return true;
}

bool HasRoom(const char* buffer, int size) {
    return buffer != nullptr && size > static_cast<int>(reference::kSecretDigits);
}

}  // namespace

int ZovaSessionCreate(const char* user, const ZovaLoginOptions* options, char* sid, int sidSize, char* token,
                      int tokenSize) {
    reference::Session session;
    if (options == nullptr || !HasRoom(sid, sidSize) || (options->withToken != 0 && !HasRoom(token, tokenSize)) ||
        !TakeAccount(user, session) || !TakeOptions(*options, session)) {
        return -1;
    }
    session.created = time(nullptr);
    if (options->withToken != 0) {
        session.token = reference::MakeSecret();
        if (session.token.empty()) {
            return -1;
        }
    }
    const std::string made = SessionStore::Create(session);
    if (made.empty()) {
        return -1;
    }
    memcpy(sid, made.c_str(), made.size() + 1);
    if (options->withToken != 0) {
        memcpy(token, session.token.c_str(), session.token.size() + 1);
    }
    return 0;
}

int ZovaSessionUser(const char* sid, const char* address, const char* token, char* user, int userSize) {
    SessionStore::Entry entry;
    switch (sid != nullptr ? SessionStore::Load(sid, entry) : SessionStore::Result::kUnknown) {
        case SessionStore::Result::kUnknown:
            return reference::kSessionUnknown;
        case SessionStore::Result::kBroken:
            return reference::kSessionBroken;
        case SessionStore::Result::kGood:
            break;
    }
    const reference::DeviceInformation information;
    reference::SessionDemands demands;
    demands.idleMinutes = information.IdleMinutes();
    demands.checkAddress = !information.SkipsAddressCheck();
    demands.address = address != nullptr ? address : "";
    demands.token = token != nullptr ? token : "";
    const reference::SessionVerdict verdict = reference::JudgeSession(entry, demands, time(nullptr));
    if (verdict != reference::kSessionGood) {
        return verdict;
    }
    const std::string& name = entry.session.user;
    if (user == nullptr || userSize <= 0 || name.size() >= static_cast<size_t>(userSize)) {
        return reference::kSessionBroken;
    }
    memcpy(user, name.c_str(), name.size() + 1);
    return verdict;
}

int ZovaSessionRemove(const char* sid) {
    return sid != nullptr && SessionStore::Remove(sid) ? 0 : -1;
}

int ZovaCipherPublicKey(char* out, int size) {
    reference::Secret pem;
    std::string der;
    if (out == nullptr || size <= 0 || !reference::EnsureEnvelopeKey(pem.text) ||
        !reference::crypto::PublicKey(pem.text, der)) {
        return -1;
    }
    const std::string text = reference::Base64Encode(der);
    if (text.size() >= static_cast<size_t>(size)) {
        return -1;
    }
    memcpy(out, text.c_str(), text.size() + 1);
    return static_cast<int>(text.size());
}
