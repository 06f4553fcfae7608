#include "FolderNames.h"

#include <errno.h>
#include <string.h>

#include <utility>

namespace package {

FolderNames::FolderNames(UniqueFd folder) : stream(folder.IsOpen() ? fdopendir(folder.Get()) : nullptr) {
    if (stream != nullptr) {
        static_cast<void>(folder.Release());
    }
}

FolderNames::FolderNames(FolderNames&& other) noexcept : stream(std::exchange(other.stream, nullptr)) {}

FolderNames::~FolderNames() {
    if (stream != nullptr) {
        closedir(stream);
    }
}

const dirent* FolderNames::Next() {
    for (;;) {
        errno = 0;
        const dirent* entry = readdir(stream);
        if (entry == nullptr || (strcmp(entry->d_name, ".") != 0 && strcmp(entry->d_name, "..") != 0)) {
            return entry;
        }
    }
}

}  // namespace package
