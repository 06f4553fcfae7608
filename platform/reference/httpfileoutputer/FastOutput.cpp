#include "httpfileoutputer/FastOutput.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <optional>

#include "Seam.h"
#include "common/ControlBytes.h"
#include "common/DeviceInformation.h"
#include "common/Utf8.h"
#include "httpfileoutputer/PercentText.h"

namespace reference {

namespace {

constexpr std::string_view kSendfile = "X-Sendfile";

/** Read at the first question; what a method sets afterwards holds for the process. */
std::optional<bool> isEnabled;

const FastOutput& DeviceFastOutput() {
    static const FastOutput device = [] {
        const DeviceInformation information;
        return ReadFastOutput(information.FastDownload(), information.FastDownloadLocation());
    }();
    return device;
}

bool IsEnabled() {
    if (!isEnabled) {
        isEnabled = !DeviceFastOutput().header.empty();
    }
    return *isEnabled;
}

bool IsLocation(std::string_view text) {
    return !text.empty() && text.front() == '/' && text.back() != '/' &&
           std::all_of(text.begin(), text.end(), [](char byte) {
               return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') ||
                      byte == '/' || byte == '-' || byte == '_' || byte == '.';
           });
}

/** The path of an open file, free of links; empty if it has none. */
std::string PathOf(int file) {
    char path[PATH_MAX];
    const ssize_t length = readlink(("/proc/self/fd/" + std::to_string(file)).c_str(), path, sizeof(path));
    return length > 0 && length < static_cast<ssize_t>(sizeof(path)) && path[0] == '/'
               ? std::string(path, static_cast<size_t>(length))
               : "";
}

bool OnlyRootWritesAndAllRead(const struct stat& status) {
    return status.st_uid == 0 && (status.st_mode & 022) == 0 && (status.st_mode & S_IROTH) != 0;
}

/** In a folder like /tmp, in which each may change their own only, what is root's stays as it is. */
bool KeepsWhatIsRoots(const struct stat& folder) {
    return S_ISDIR(folder.st_mode) && folder.st_uid == 0 &&
           ((folder.st_mode & 022) == 0 || (folder.st_mode & S_ISVTX) != 0);
}

bool IsOpenToAll(const struct stat& folder) {
    return (folder.st_mode & S_IXOTH) != 0;
}

/** Whether root alone can change which file the path leads to, and the file itself, and everybody can read it. */
bool IsTheSameForAll(const std::string& path, const struct stat& file) {
    struct stat status;
    for (size_t slash = 0; slash != std::string::npos; slash = path.find('/', slash + 1)) {
        const std::string folder = slash == 0 ? "/" : path.substr(0, slash);
        if (lstat(folder.c_str(), &status) != 0 || !KeepsWhatIsRoots(status) || !IsOpenToAll(status)) {
            return false;
        }
    }
    return lstat(path.c_str(), &status) == 0 && status.st_dev == file.st_dev && status.st_ino == file.st_ino &&
           OnlyRootWritesAndAllRead(status);
}

}  // namespace

FastOutput ReadFastOutput(std::string_view header, std::string_view location) {
    if (header == kSendfile) {
        return {std::string(header), ""};
    }
    if (header == "X-Accel-Redirect" && IsLocation(location)) {
        return {std::string(header), std::string(location)};
    }
    return {};
}

std::string FastOutputLine(int file) {
    if (!IsEnabled()) {
        return "";
    }
    struct stat status;
    const std::string path = PathOf(file);
    // Web servers refuse names that are no UTF-8, and look for another file where a name holds control bytes.
    if (path.empty() || !IsUtf8(path) || HasControlByte(path) || fstat(file, &status) != 0 ||
        !IsTheSameForAll(path, status)) {
        return "";
    }
    const FastOutput& device = DeviceFastOutput();
    const std::string text = PercentText(path, "/");
    // Some web servers take the path of this header as it stands, others decode it.
    if (device.header == kSendfile && text != path) {
        return "";
    }
    return device.header + ": " + device.location + text;
}

}  // namespace reference

namespace ZOVA::HTTP {

bool FileOutputerHelper::SetFastOutputEnabled(bool enable) {
    reference::isEnabled = enable && !reference::DeviceFastOutput().header.empty();
    return *reference::isEnabled == enable;
}

bool FileOutputerHelper::IsFastOutputEnabled() {
    return reference::IsEnabled();
}

}  // namespace ZOVA::HTTP
