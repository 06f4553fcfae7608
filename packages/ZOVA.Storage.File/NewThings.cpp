#include "NewThings.h"

#include <errno.h>
#include <unistd.h>

namespace package {
namespace {

constexpr mode_t kAllRights = 0777;
constexpr mode_t kStrangersWrite = 0002;
constexpr mode_t kExecute = 0111;
constexpr mode_t kOwners = 0700;

/** The process's mask, which would take rights away, is off while this lives. */
class [[nodiscard]] MaskScope {
public:
    MaskScope() : before(umask(0)) {}
    MaskScope(const MaskScope&) = delete;
    MaskScope& operator=(const MaskScope&) = delete;
    ~MaskScope() { umask(before); }

private:
    mode_t before;
};

}  // namespace

mode_t ModeOfNewFolder(const struct stat& above) {
    return ((above.st_mode & kAllRights) | kOwners) & ~kStrangersWrite;
}

mode_t ModeOfNewFile(const struct stat& above) {
    return ModeOfNewFolder(above) & ~kExecute;
}

FileError MakeFolderIn(int above, const std::string& name) {
    struct stat status;
    if (fstat(above, &status) != 0) {
        return ErrorOf(errno, "looking at a folder");
    }
    const MaskScope mask;
    return mkdirat(above, name.c_str(), ModeOfNewFolder(status)) == 0 ? FILE_OK : ErrorOf(errno, "making a folder");
}

bool AdoptFile(int file, const struct stat& above) {
    // The group first: changing it may take rights away. A member of the group can, and for others it stays theirs.
    const bool hasGroup = (above.st_mode & S_ISGID) == 0 || fchown(file, static_cast<uid_t>(-1), above.st_gid) == 0;
    const mode_t mode = ModeOfNewFile(above);
    return fchmod(file, hasGroup ? mode : mode & ~static_cast<mode_t>(S_IRWXG)) == 0;
}

}  // namespace package
