#pragma once

#include <cstddef>
#include <string>

namespace package {

enum class PrivateFileResult {
    kDone,
    /** No such file, or no such folder. Only reading has this result. */
    kMissing,
    /**
     * Folder or file belong to somebody else than the effective user, are open to others, or are no folder and no
     * regular file (a link is neither); or the file is too long.
     */
    kUntrusted,
    /** The system refused a step; `errno` says why. */
    kFailed,
};

/**
 * Reads a file that its owner alone can read and write, in a folder of the same kind.
 * @param limit of its size in bytes.
 * `out` is written only with kDone.
 */
PrivateFileResult ReadPrivateFile(const char* folder, const char* name, std::size_t limit, std::string& out);

/**
 * Makes or replaces such a file, mode 0600, and makes the folder, mode 0700, if it is missing. The content is written
 * beside the file and renamed, so that a reader sees the old content or the new, after a loss of power too; of two
 * writers at once the later wins. A file or folder that is not trusted is left as it is. Nothing is left beside the
 * file on failure; after a kFailed either content may stand.
 */
PrivateFileResult ReplacePrivateFile(const char* folder, const char* name, const std::string& content);

}  // namespace package
