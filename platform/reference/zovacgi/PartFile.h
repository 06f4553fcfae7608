#pragma once

#include <string>
#include <string_view>

#include "common/UniqueFd.h"
#include "zovacgi/PartFolder.h"

namespace reference {

/**
 * A part of an upload on its way into a file of mode 0600. Where the file system can, the file has no name until it is
 * published, so that nothing is left of a body that breaks off, not even by a killed process. It is locked before it
 * has a name and stays so until the process ends: that is how a sweep knows it.
 */
class PartFile {
public:
    /** What its name looks like. */
    static bool IsName(std::string_view name);

    /** Not open, with `errno` set, if it cannot be made. */
    explicit PartFile(const PartFolder& folder);
    PartFile(PartFile&& other) noexcept;
    PartFile(const PartFile&) = delete;
    PartFile& operator=(const PartFile&) = delete;
    /** Takes the file away unless it was published. */
    ~PartFile();

    bool IsOpen() const { return descriptor.IsOpen(); }
    /** False with `errno` set; the file is of no use then. */
    bool Write(std::string_view bytes) const;
    /**
     * Gives the file its name. If it is still there under this name when the process ends, it is removed.
     * @return its path, "" with `errno` set.
     */
    std::string Publish();

private:
    bool MakeNamed();

    const PartFolder* folder;
    UniqueFd descriptor;
    std::string name;
};

}  // namespace reference
