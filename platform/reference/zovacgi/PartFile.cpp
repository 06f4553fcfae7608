#include "zovacgi/PartFile.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <utility>

#include "common/Files.h"
#include "common/Hex.h"
#include "common/RandomBytes.h"
#include "zovacgi/PublishedFiles.h"

namespace reference {

namespace {

constexpr std::string_view kPrefix = "zova-upload-";
constexpr size_t kRandomBytes = 16;

std::string RandomName() {
    char random[kRandomBytes];
    return FillRandom(random, sizeof(random)) ? std::string(kPrefix) + HexText(std::string_view(random, sizeof(random)))
                                              : std::string();
}

}  // namespace

bool PartFile::IsName(std::string_view name) {
    return name.size() == kPrefix.size() + 2 * kRandomBytes && name.substr(0, kPrefix.size()) == kPrefix &&
           name.find_first_not_of("0123456789abcdef", kPrefix.size()) == std::string_view::npos;
}

PartFile::PartFile(const PartFolder& place)
    : folder(&place), descriptor(openat(place.Get(), ".", O_WRONLY | O_TMPFILE | O_CLOEXEC, 0600)) {
    if (!descriptor.IsOpen() && (errno == EOPNOTSUPP || errno == EISDIR || errno == ENOENT) && !MakeNamed()) {
        return;
    }
    if (descriptor.IsOpen() &&
        (fchmod(descriptor.Get(), 0600) != 0 || flock(descriptor.Get(), LOCK_EX | LOCK_NB) != 0)) {
        descriptor.Reset(-1);
    }
}

bool PartFile::MakeNamed() {
    name = RandomName();
    if (!name.empty()) {
        descriptor.Reset(
            openat(folder->Get(), name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
    }
    if (!descriptor.IsOpen()) {
        name.clear();
    }
    return descriptor.IsOpen();
}

PartFile::PartFile(PartFile&& other) noexcept
    : folder(other.folder), descriptor(std::move(other.descriptor)), name(std::exchange(other.name, std::string())) {}

PartFile::~PartFile() {
    if (!name.empty()) {
        unlinkat(folder->Get(), name.c_str(), 0);
    }
}

bool PartFile::Write(std::string_view bytes) const {
    return WriteAll(descriptor.Get(), bytes);
}

std::string PartFile::Publish() {
    if (name.empty()) {
        const std::string fresh = RandomName();
        const std::string self = "/proc/self/fd/" + std::to_string(descriptor.Get());
        if (fresh.empty() || (linkat(descriptor.Get(), "", folder->Get(), fresh.c_str(), AT_EMPTY_PATH) != 0 &&
                              linkat(AT_FDCWD, self.c_str(), folder->Get(), fresh.c_str(), AT_SYMLINK_FOLLOW) != 0)) {
            return "";
        }
        name = fresh;
    }
    std::string path = folder->Path() + "/" + name;
    KeepPublished(std::move(descriptor), path);
    name.clear();
    return path;
}

}  // namespace reference
