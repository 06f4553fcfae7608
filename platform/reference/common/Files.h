#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <string>
#include <string_view>

#include "common/UniqueFd.h"

namespace reference {

enum class ReadResult {
    kGood,
    /** No such file or folder. */
    kMissing,
    /** Not readable, no regular file, too long, or not as private as asked. */
    kRefused,
};

enum class FileTrust {
    kAny,
    /** Owned by root, no link at the end of the path, not writable by others than the owner. */
    kRootOnlyWrites,
    /** As before, and not readable by others either. */
    kRootOnly,
};

/**
 * Reads a regular file of at most `limit` bytes. Never blocks on a pipe or device.
 * @param status receives the file's status if not null.
 */
ReadResult ReadFile(const char* path, size_t limit, FileTrust trust, std::string& content,
                    struct stat* status = nullptr);

/** Reads the rest of the file if it is at most `limit` bytes. */
bool ReadAll(int descriptor, size_t limit, std::string& content);

/** Writes all of it, in as many calls as it takes. */
bool WriteAll(int descriptor, std::string_view content);

/**
 * Makes or replaces a file with mode 0600: the content is written beside it and renamed, so that a reader sees the old
 * content or the new, never a part, after a loss of power too. Nothing is left beside it on failure.
 */
bool ReplaceFile(const std::string& path, std::string_view content);

/**
 * Makes a folder of root's with mode 0700; its parents, with 0755.
 * @return false if it could not be made, or is there but no folder, not root's, or open to others.
 */
bool EnsurePrivateDirectory(const char* path);

/** Makes the folders above the path's last part, each with the mode. False on failure. */
bool MakeParents(const char* path, mode_t mode);

}  // namespace reference
