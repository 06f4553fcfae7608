#include "Placement.h"

#include <errno.h>
#include <fcntl.h>
#include <stdio.h>
#include <sys/random.h>
#include <sys/sendfile.h>
#include <sys/stat.h>
#include <unistd.h>

#include "../common/UniqueFd.h"
#include "NewThings.h"

namespace package {
namespace {

constexpr std::size_t kLargestStep = std::size_t{1} << 30;

bool IsThere(int folder, const std::string& name) {
    struct stat status;
    return fstatat(folder, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0;
}

/** Hidden, and of random digits, so that nobody has taken it. */
std::string HiddenName() {
    std::uint64_t random[2] = {};
    if (getrandom(random, sizeof(random), 0) != static_cast<ssize_t>(sizeof(random))) {
        return "";
    }
    char text[64];
    snprintf(text, sizeof(text), ".zova-new-%016llx%016llx", static_cast<unsigned long long>(random[0]),
             static_cast<unsigned long long>(random[1]));
    return text;
}

/** Content and time of change are as they are to be, and on the disk. */
bool Settle(int file, const Arrival& arrival) {
    if (arrival.changed) {
        const timespec times[2] = {{0, UTIME_OMIT}, {static_cast<time_t>(*arrival.changed), 0}};
        if (futimens(file, times) != 0) {
            return false;
        }
    }
    return fsync(file) == 0;
}

/** Renames where both lie in one file system; otherwise EXDEV. */
int RenameInto(int from, const std::string& name, int folder, const std::string& newName, bool overwrites) {
    const int result = renameat2(from, name.c_str(), folder, newName.c_str(),
                                 overwrites ? 0U : static_cast<unsigned>(RENAME_NOREPLACE));
    if (result == 0 || overwrites || errno != EINVAL) {
        return result;
    }
    // A file system without such renaming still refuses a second link of one name.
    return linkat(from, name.c_str(), folder, newName.c_str(), 0) == 0 ? unlinkat(from, name.c_str(), 0) : -1;
}

bool Copy(int from, int to, std::uint64_t size) {
    while (size > 0) {
        const ssize_t sent = sendfile(to, from, nullptr, size < kLargestStep ? size : kLargestStep);
        if (sent > 0) {
            size -= static_cast<std::uint64_t>(sent);
        } else if (sent == 0 || errno != EINTR) {
            errno = sent == 0 ? EIO : errno;
            return false;
        }
    }
    return true;
}

FileError CopyInto(int folder, const struct stat& above, int part, const Placed& placed, const Arrival& arrival,
                   bool overwrites) {
    const std::string hidden = HiddenName();
    const UniqueFd copy(
        hidden.empty()
            ? -1
            : openat(folder, hidden.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
    if (!copy.IsOpen()) {
        return ErrorOf(errno, "making a file");
    }
    if (Copy(part, copy.Get(), placed.size) && AdoptFile(copy.Get(), above) && Settle(copy.Get(), arrival) &&
        RenameInto(folder, hidden, folder, arrival.name, overwrites) == 0) {
        unlink(arrival.part.c_str());
        return FILE_OK;
    }
    const int error = errno;
    unlinkat(folder, hidden.c_str(), 0);
    return ErrorOf(error, "writing a file");
}

FileError MoveInto(int folder, const struct stat& above, int part, const Placed& placed, const Arrival& arrival,
                   bool overwrites) {
    struct stat source;
    if (fstat(part, &source) == 0 && source.st_dev == above.st_dev) {
        if (!Settle(part, arrival)) {
            return ErrorOf(errno, "finishing a file");
        }
        if (RenameInto(AT_FDCWD, arrival.part, folder, arrival.name, overwrites) == 0) {
            // Not before: where it came from, others than those of the folder might read it.
            return AdoptFile(part, above) ? FILE_OK : ErrorOf(errno, "giving a file its rights");
        }
        if (errno != EXDEV) {
            return ErrorOf(errno, "moving a file");
        }
    }
    return CopyInto(folder, above, part, placed, arrival, overwrites);
}

}  // namespace

Placed PlaceFile(int folder, const Arrival& arrival, Existing existing) {
    Placed placed;
    struct stat above;
    struct stat source;
    const UniqueFd part(open(arrival.part.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    if (!part.IsOpen() || fstat(part.Get(), &source) != 0 || fstat(folder, &above) != 0) {
        placed.error = ErrorOf(errno, "opening an uploaded file");
        return placed;
    }
    if (!S_ISREG(source.st_mode) || source.st_uid != geteuid()) {
        placed.error = FILE_ERR_WRONG_KIND;
        return placed;
    }
    placed.size = static_cast<std::uint64_t>(source.st_size);
    const bool overwrites = existing == Existing::kOverwrite;
    // Before anything is copied. What comes in between is found by the renaming.
    placed.error = !overwrites && IsThere(folder, arrival.name)
                       ? FILE_ERR_EXISTS
                       : MoveInto(folder, above, part.Get(), placed, arrival, overwrites);
    if (placed.error == FILE_ERR_EXISTS && existing == Existing::kSkip) {
        placed.error = FILE_OK;
        placed.isSkipped = true;
    }
    return placed;
}

}  // namespace package
