#pragma once

#include <dirent.h>

#include "../common/UniqueFd.h"

namespace package {

/** The names in an open folder, one after the other, without "." and "..". */
class FolderNames {
public:
    /** Takes a descriptor that was opened for reading. */
    explicit FolderNames(UniqueFd folder);
    FolderNames(FolderNames&& other) noexcept;
    FolderNames& operator=(FolderNames&&) = delete;
    ~FolderNames();

    bool IsOpen() const { return stream != nullptr; }
    /** The folder's descriptor, which belongs to this object. */
    int Get() const { return dirfd(stream); }
    /**
     * The next one, good until the next call; null at the end.
     * A file system that fails in the middle ends the list, and `errno` is not 0 then.
     */
    const dirent* Next();
    /** Begins anew. */
    void Rewind() { rewinddir(stream); }

private:
    DIR* stream;
};

}  // namespace package
