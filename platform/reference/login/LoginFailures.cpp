#include "login/LoginFailures.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "Paths.h"
#include "common/Files.h"
#include "common/Hex.h"
#include "common/TimedLock.h"

namespace reference {

namespace {

constexpr size_t kLargestFile = 128;
constexpr size_t kMostFiles = 20000;
constexpr int kLockSeconds = 5;
constexpr const char* kLockName = ".lock";

/** Runs on while the machine sleeps, and no change of the clock shortens a block. */
int64_t Now() {
    struct timespec now;
    clock_gettime(CLOCK_BOOTTIME, &now);
    return now.tv_sec;
}

UniqueFd Lock() {
    const std::string lock = std::string(paths::kLoginFailureDirectory) + "/" + kLockName;
    if (!EnsurePrivateDirectory(paths::kLoginFailureDirectory)) {
        syslog(LOG_ERR, "folder %s cannot be used", paths::kLoginFailureDirectory);
        return UniqueFd();
    }
    return TakeTimedLock(lock.c_str(), kLockSeconds);
}

bool Read(const std::string& path, FailureCount& count, bool& isNew) {
    std::string text;
    const ReadResult result = ReadFile(path.c_str(), kLargestFile, FileTrust::kRootOnly, text);
    isNew = result == ReadResult::kMissing;
    count = result == ReadResult::kGood ? FailureCount::Parse(text) : FailureCount();
    return result != ReadResult::kRefused;
}

bool Write(const std::string& path, const FailureCount& count) {
    return ReplaceFile(path, count.Text());
}

/** Removes counts that can block nobody any more. Gives the number of the others. */
size_t Sweep() {
    DIR* directory = opendir(paths::kLoginFailureDirectory);
    if (directory == nullptr) {
        return kMostFiles;
    }
    const time_t oldest = time(nullptr) - (kFailureWindow + kBlockTime);
    size_t kept = 0;
    while (const struct dirent* entry = readdir(directory)) {
        struct stat status;
        if (strcmp(entry->d_name, kLockName) == 0 ||
            fstatat(dirfd(directory), entry->d_name, &status, AT_SYMLINK_NOFOLLOW) != 0 || !S_ISREG(status.st_mode)) {
            continue;
        }
        if (status.st_mtime >= oldest || unlinkat(dirfd(directory), entry->d_name, 0) != 0) {
            ++kept;
        }
    }
    closedir(directory);
    return kept;
}

bool RefundFile(const std::string& path) {
    FailureCount count;
    bool isNew = false;
    if (!Read(path, count, isNew)) {
        return false;
    }
    count.Refund();
    return isNew || Write(path, count);
}

}  // namespace

void FailureCount::Charge(int64_t now) {
    if (attempts == 0 || blockedUntil != 0 || now - since > kFailureWindow || now < since) {
        *this = FailureCount();
        since = now;
    }
    if (++attempts >= kFailureLimit) {
        blockedUntil = now + kBlockTime;
    }
}

void FailureCount::Refund() {
    if (attempts > 0 && --attempts < kFailureLimit) {
        blockedUntil = 0;
    }
}

std::string FailureCount::Text() const {
    return std::to_string(attempts) + " " + std::to_string(since) + " " + std::to_string(blockedUntil) + "\n";
}

FailureCount FailureCount::Parse(const std::string& text) {
    FailureCount count;
    char end = '\0';
    if (sscanf(text.c_str(), "%9d %19" SCNd64 " %19" SCNd64 "%c", &count.attempts, &count.since, &count.blockedUntil,
               &end) != 4 ||
        end != '\n' || count.attempts < 0 || count.since < 0 || count.blockedUntil < 0) {
        return FailureCount();
    }
    return count;
}

LoginFailures::LoginFailures(std::string_view user, std::string_view source)
    : accountFile(std::string(paths::kLoginFailureDirectory) + "/account-" + HexText(user)),
      sourceFile(std::string(paths::kLoginFailureDirectory) + "/address-" + std::string(source)) {}

LoginFailures::Result LoginFailures::Charge() const {
    const UniqueFd lock = Lock();
    FailureCount account;
    FailureCount source;
    bool newAccount = false;
    bool newSource = false;
    if (!lock.IsOpen() || !Read(accountFile, account, newAccount) || !Read(sourceFile, source, newSource)) {
        return Result::kFailed;
    }
    const int64_t now = Now();
    if (account.IsBlocked(now) || source.IsBlocked(now)) {
        return Result::kBlocked;
    }
    if ((newAccount || newSource) && Sweep() >= kMostFiles) {
        return Result::kBlocked;
    }
    account.Charge(now);
    source.Charge(now);
    return Write(accountFile, account) && Write(sourceFile, source) ? Result::kMayTry : Result::kFailed;
}

bool LoginFailures::Succeed() const {
    const UniqueFd lock = Lock();
    if (!lock.IsOpen()) {
        return false;
    }
    // Another login of the account at the same time may have removed it first.
    const bool cleared = unlink(accountFile.c_str()) == 0 || errno == ENOENT;
    return cleared && RefundFile(sourceFile);
}

bool LoginFailures::TakeBack() const {
    const UniqueFd lock = Lock();
    return lock.IsOpen() && RefundFile(accountFile) && RefundFile(sourceFile);
}

}  // namespace reference
