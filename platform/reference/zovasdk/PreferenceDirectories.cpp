#include <fcntl.h>
#include <sys/fsuid.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>

#include "Paths.h"
#include "Seam.h"
#include "common/Accounts.h"
#include "common/Files.h"

using reference::UniqueFd;

namespace {

/** File access of a user for as long as it lives, where the process is root. Signals and limits are not touched. */
class [[nodiscard]] FileAccessAs {
public:
    explicit FileAccessAs(const reference::Account& account)
        : oldGroup(setfsgid(account.gid)), oldUser(setfsuid(account.uid)) {
        taken = static_cast<uid_t>(setfsuid(static_cast<uid_t>(-1))) == account.uid &&
                static_cast<gid_t>(setfsgid(static_cast<gid_t>(-1))) == account.gid;
    }
    FileAccessAs(const FileAccessAs&) = delete;
    FileAccessAs& operator=(const FileAccessAs&) = delete;
    ~FileAccessAs() {
        setfsuid(static_cast<uid_t>(oldUser));
        setfsgid(static_cast<gid_t>(oldGroup));
    }
    bool IsTaken() const { return taken; }

private:
    int oldGroup;
    int oldUser;
    bool taken;
};

int CopyOut(const std::string& path, char* buffer, int size) {
    if (buffer == nullptr || size <= 0 || path.size() >= static_cast<size_t>(size)) {
        return -1;
    }
    memcpy(buffer, path.c_str(), path.size() + 1);
    return 0;
}

/** As the user, so that nothing outside the user's own reach is made or taken over through a link in the home. */
bool EnsureFolderInHome(const reference::Account& account, const char* name) {
    const FileAccessAs access(account);
    if (!access.IsTaken()) {
        return false;
    }
    const UniqueFd home(open(account.home.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!home.IsOpen() || (mkdirat(home.Get(), name, 0700) != 0 && errno != EEXIST)) {
        return false;
    }
    struct stat status;
    return fstatat(home.Get(), name, &status, AT_SYMLINK_NOFOLLOW) == 0 && S_ISDIR(status.st_mode) &&
           status.st_uid == account.uid;
}

bool CanBeFileName(const std::string& name) {
    if (name.empty() || name.size() > 255 || name == "." || name == "..") {
        return false;
    }
    for (unsigned char byte : name) {
        if (byte == '/' || byte < 0x20 || byte == 0x7f) {
            return false;
        }
    }
    return true;
}

bool IsDirectory(const std::string& path) {
    struct stat status;
    return lstat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode);
}

}  // namespace

int ZOVAUserPreferenceDirGet(const char* user, char* buffer, int size) {
    constexpr const char* kFolder = ".zova";
    const auto account = reference::FindAccount(user);
    if (!account || account->home.empty() || account->home.front() != '/') {
        return -1;
    }
    return EnsureFolderInHome(*account, kFolder) ? CopyOut(account->home + "/" + kFolder, buffer, size) : -1;
}

int ZOVAGroupPreferenceDirGet(const char* name, char* buffer, int size) {
    const auto group = reference::FindGroup(name);
    if (!group || !CanBeFileName(name)) {
        return -1;
    }
    const std::string path = std::string(reference::paths::kGroupDirectory) + "/" + name;
    constexpr int kKeepMode = 1;
    constexpr unsigned int kMode = 0770;
    if (!IsDirectory(path) && ZOVAFSMkdirP(path.c_str(), 0, kKeepMode, 0, static_cast<int>(group->gid), kMode) < 0) {
        return -1;
    }
    return CopyOut(path, buffer, size);
}
