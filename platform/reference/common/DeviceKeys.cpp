#include "common/DeviceKeys.h"

#include <syslog.h>

#include "Paths.h"
#include "common/Crypto.h"
#include "common/Files.h"
#include "common/RandomBytes.h"
#include "common/TimedLock.h"

namespace reference {

namespace {

constexpr size_t kLargestKey = 16384;
constexpr size_t kSecretSize = 32;
/** Making a key takes most of a second, several on a slow device. */
constexpr int kLockSeconds = 20;

bool MakeSecret(std::string& secret) {
    secret.assign(kSecretSize, '\0');
    return FillRandom(secret.data(), secret.size());
}

/** Reads the file, or makes it if it is not there. One that is there but cannot be trusted is never replaced. */
template <typename Make>
bool EnsureFile(const char* path, std::string& content, Make make) {
    ReadResult read = ReadFile(path, kLargestKey, FileTrust::kRootOnly, content);
    if (read == ReadResult::kMissing) {
        if (!EnsurePrivateDirectory(paths::kSecretDirectory)) {
            syslog(LOG_ERR, "folder %s cannot be used", paths::kSecretDirectory);
            return false;
        }
        const UniqueFd lock = TakeTimedLock(paths::kSecretLock, kLockSeconds);
        if (!lock.IsOpen()) {
            return false;
        }
        read = ReadFile(path, kLargestKey, FileTrust::kRootOnly, content);
        if (read == ReadResult::kMissing) {
            return make(content) && ReplaceFile(path, content);
        }
    }
    if (read != ReadResult::kGood) {
        syslog(LOG_ERR, "secret %s cannot be used", path);
    }
    return read == ReadResult::kGood;
}

}  // namespace

bool ReadEnvelopeKey(std::string& pem) {
    return ReadFile(paths::kEnvelopeKey, kLargestKey, FileTrust::kRootOnly, pem) == ReadResult::kGood;
}

bool EnsureEnvelopeKey(std::string& pem) {
    return EnsureFile(paths::kEnvelopeKey, pem, crypto::MakePrivateKey);
}

bool EnsureDeviceSecret(std::string& secret) {
    return EnsureFile(paths::kDeviceSecret, secret, MakeSecret) && secret.size() == kSecretSize;
}

}  // namespace reference
