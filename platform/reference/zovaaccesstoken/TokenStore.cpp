#include "zovaaccesstoken/TokenStore.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <tuple>

#include "Paths.h"
#include "common/Crypto.h"
#include "common/Files.h"
#include "common/Hex.h"
#include "common/PrintableText.h"
#include "common/TimedLock.h"
#include "zovacgi/SessionId.h"

namespace reference {

namespace {

constexpr size_t kMostTokens = 5000;
constexpr size_t kMostOfOneUser = 100;
constexpr int kLockSeconds = 10;
constexpr const char* kLockName = ".lock";
constexpr const char* kHalfWritten = ".new-";
/** No write takes as long, in seconds. */
constexpr time_t kHalfWrittenAge = 3600;

std::string PathOf(std::string_view name) {
    std::string path = paths::kAccessTokenDirectory;
    path += '/';
    path += name;
    return path;
}

/** Name of the token's file; "" if the hash cannot be had. */
std::string NameOf(std::string_view token) {
    std::string digest;
    return crypto::Sha256(token, digest) ? HexText(digest) : std::string();
}

bool HasRecordName(std::string_view name) {
    return IsSessionId(name);
}

TokenStore::Result Read(const std::string& name, TokenRecord& record) {
    std::string text;
    switch (ReadFile(PathOf(name).c_str(), kLargestTokenRecord, FileTrust::kRootOnly, text)) {
        case ReadResult::kMissing:
            return TokenStore::Result::kUnknown;
        case ReadResult::kGood:
            if (ParseTokenRecord(text, record)) {
                return TokenStore::Result::kGood;
            }
            break;
        case ReadResult::kRefused:
            break;
    }
    syslog(LOG_ERR, "record of access token %s cannot be used", PrintableText(name).c_str());
    return TokenStore::Result::kFailed;
}

bool EnsureFolder() {
    if (EnsurePrivateDirectory(paths::kAccessTokenDirectory)) {
        return true;
    }
    syslog(LOG_ERR, "folder %s cannot be used", paths::kAccessTokenDirectory);
    return false;
}

void SweepHalfWritten(int folder, const char* name, time_t now) {
    struct stat status;
    if (strncmp(name, kHalfWritten, strlen(kHalfWritten)) == 0 &&
        fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) == 0 && now - status.st_mtime > kHalfWrittenAge) {
        unlinkat(folder, name, 0);
    }
}

/**
 * Calls `visit(name, record)` for each record that has not expired and removes those that have.
 * @param files receives the number of files left, unusable ones included.
 */
template <typename Visit>
bool ForEach(size_t& files, Visit visit) {
    DIR* folder = EnsureFolder() ? opendir(paths::kAccessTokenDirectory) : nullptr;
    if (folder == nullptr) {
        return false;
    }
    const time_t now = time(nullptr);
    files = 0;
    while (const struct dirent* entry = readdir(folder)) {
        const std::string name = entry->d_name;
        if (!HasRecordName(name)) {
            SweepHalfWritten(dirfd(folder), entry->d_name, now);
            continue;
        }
        TokenRecord record;
        const TokenStore::Result result = Read(name, record);
        if (result == TokenStore::Result::kGood && now >= record.expires &&
            unlinkat(dirfd(folder), name.c_str(), 0) == 0) {
            continue;
        }
        ++files;
        if (result == TokenStore::Result::kGood) {
            visit(name, record);
        }
    }
    closedir(folder);
    return true;
}

bool IsOf(const TokenRecord& record, std::string_view user, uid_t uid) {
    return record.user == user && record.uid == uid;
}

}  // namespace

TokenStore::Result TokenStore::Load(std::string_view token, TokenRecord& record) {
    if (!IsSessionId(token)) {
        return Result::kUnknown;
    }
    const std::string name = NameOf(token);
    return name.empty() ? Result::kFailed : Read(name, record);
}

TokenStore::Result TokenStore::Add(std::string_view token, const TokenRecord& record) {
    const std::string name = NameOf(token);
    const UniqueFd lock =
        !name.empty() && EnsureFolder() ? TakeTimedLock(PathOf(kLockName).c_str(), kLockSeconds) : UniqueFd();
    size_t all = 0;
    size_t own = 0;
    if (!lock.IsOpen() || !ForEach(all, [&](const std::string&, const TokenRecord& other) {
            own += IsOf(other, record.user, record.uid) ? 1 : 0;
        })) {
        return Result::kFailed;
    }
    if (all >= kMostTokens || own >= kMostOfOneUser) {
        return Result::kTooMany;
    }
    return ReplaceFile(PathOf(name), WriteTokenRecord(record)) ? Result::kGood : Result::kFailed;
}

TokenStore::Result TokenStore::List(std::string_view user, uid_t uid, std::vector<TokenRecord>& records) {
    size_t all = 0;
    std::vector<TokenRecord> found;
    if (!ForEach(all, [&](const std::string&, const TokenRecord& record) {
            if (IsOf(record, user, uid)) {
                found.push_back(record);
            }
        })) {
        return Result::kFailed;
    }
    std::sort(found.begin(), found.end(), [](const TokenRecord& left, const TokenRecord& right) {
        return std::tie(left.created, left.id) < std::tie(right.created, right.id);
    });
    records.swap(found);
    return Result::kGood;
}

TokenStore::Result TokenStore::Remove(std::string_view user, uid_t uid, std::string_view id) {
    size_t all = 0;
    std::string found;
    if (!ForEach(all, [&](const std::string& name, const TokenRecord& record) {
            if (IsOf(record, user, uid) && record.id == id) {
                found = name;
            }
        })) {
        return Result::kFailed;
    }
    if (found.empty()) {
        return Result::kUnknown;
    }
    if (unlink(PathOf(found).c_str()) == 0) {
        return Result::kGood;
    }
    return errno == ENOENT ? Result::kUnknown : Result::kFailed;
}

}  // namespace reference
