#include "ArchiveSource.h"

#include <errno.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <utility>

#include "../common/Text.h"
#include "Beneath.h"
#include "ClientPath.h"

namespace package {
namespace {

constexpr std::size_t kPiece = std::size_t{64} << 10;
/** Each level holds a descriptor. */
constexpr std::size_t kDeepest = 512;
/** What is left out is told up to here. */
constexpr std::size_t kLongestNote = std::size_t{256} << 10;

constexpr char kKind[] = "neither a file nor a folder";
constexpr char kGone[] = "cannot be read any more";
constexpr char kShorter[] = "got shorter while it was read; its end is zeros";

}  // namespace

ArchiveSource::ArchiveSource(const ArchiveLibrary& functions, ArchiveFormat format, const Viewer& asker,
                             std::vector<ArchiveItem> items)
    : writer(functions, format), viewer(asker), wanted(std::move(items)) {}

long ArchiveSource::Read(char* buffer, std::size_t size) {
    std::string& output = writer.Output();
    while (taken == output.size()) {
        output.clear();
        taken = 0;
        if (isDone) {
            return 0;
        }
        if (!Step()) {
            return -1;
        }
    }
    const std::size_t count = output.copy(buffer, size, taken);
    taken += count;
    return static_cast<long>(count);
}

bool ArchiveSource::Step() {
    if (file.IsOpen()) {
        return left > 0 ? CopyPiece() : EndFile();
    }
    if (!levels.empty()) {
        Level& level = levels.back();
        if (const dirent* entry = level.names.Next()) {
            return AddName(level, std::string(entry->d_name).c_str());
        }
        levels.pop_back();
        return true;
    }
    if (nextItem < wanted.size()) {
        return AddItem(wanted[nextItem++]);
    }
    isDone = true;
    return AddNote() && writer.Finish();
}

bool ArchiveSource::AddItem(const ArchiveItem& item) {
    UniqueFd thing;
    struct stat status;
    if (viewer.Open(item.path, O_RDONLY, thing, status) == FILE_OK &&
        (S_ISREG(status.st_mode) || S_ISDIR(status.st_mode))) {
        return Add(std::move(thing), status, item.name);
    }
    LeaveOut(item.name, kGone);
    return true;
}

bool ArchiveSource::AddName(const Level& level, const char* name) {
    const std::string path = level.path + "/" + name;
    struct stat status;
    UniqueFd thing = OpenBeneath(level.names.Get(), name, O_PATH | O_NOFOLLOW);
    if (!thing.IsOpen() || fstat(thing.Get(), &status) != 0) {
        LeaveOut(path, kGone);
        return true;
    }
    if (!viewer.MaySee(status)) {
        return true;
    }
    if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode)) {
        LeaveOut(path, kKind);
        return true;
    }
    thing = OpenBeneath(level.names.Get(), name, O_RDONLY);
    struct stat opened;
    if (!thing.IsOpen() || fstat(thing.Get(), &opened) != 0 || opened.st_ino != status.st_ino ||
        opened.st_dev != status.st_dev) {
        LeaveOut(path, thing.IsOpen() || errno != EACCES ? kGone : "may not be read");
        return true;
    }
    return Add(std::move(thing), opened, path);
}

bool ArchiveSource::Add(UniqueFd thing, const struct stat& status, const std::string& path) {
    if (S_ISREG(status.st_mode)) {
        file = std::move(thing);
        filePath = path;
        left = static_cast<std::uint64_t>(status.st_size);
        return writer.BeginFile(path, status, left);
    }
    if (levels.size() == kDeepest) {
        LeaveOut(path, "too deep");
        return true;
    }
    FolderNames names(std::move(thing));
    if (!names.IsOpen()) {
        LeaveOut(path, kGone);
        return true;
    }
    levels.push_back({std::move(names), path});
    return writer.AddFolder(path, status);
}

bool ArchiveSource::CopyPiece() {
    std::array<char, kPiece> piece = {};
    const std::size_t wish = std::min<std::uint64_t>(left, kPiece);
    const ssize_t got = isFilledUp ? static_cast<ssize_t>(wish) : read(file.Get(), piece.data(), wish);
    if (got > 0) {
        left -= static_cast<std::uint64_t>(got);
        return writer.Write(piece.data(), static_cast<std::size_t>(got));
    }
    if (got == 0 || errno != EINTR) {
        LeaveOut(filePath, kShorter);
        isFilledUp = true;
    }
    return true;
}

bool ArchiveSource::EndFile() {
    file.Reset(-1);
    isFilledUp = false;
    return writer.EndFile();
}

void ArchiveSource::LeaveOut(const std::string& path, const char* reason) {
    if (note.size() < kLongestNote) {
        note += ValidUtf8(path) + ": " + reason + "\n";
    }
}

bool ArchiveSource::AddNote() {
    if (note.empty()) {
        return true;
    }
    struct stat status = {};
    status.st_mode = S_IFREG | S_IRUSR | S_IWUSR;
    status.st_mtime = time(nullptr);
    return writer.BeginFile(kNoteName, status, note.size()) && writer.Write(note.data(), note.size()) &&
           writer.EndFile();
}

}  // namespace package
