#pragma once

#include <string>

#include "common/UniqueFd.h"

namespace reference {

/**
 * A folder for part files. Where root opens it, it becomes as every folder for temporary files is, mode 1777: everybody
 * reaches a file of theirs whose name they know, and nobody moves or removes a file of somebody else.
 */
class PartFolder {
public:
    /** Not open unless the path is a folder of root's, no link, in which nobody moves the files of others. */
    explicit PartFolder(const char* path);

    bool IsOpen() const { return descriptor.IsOpen(); }
    int Get() const { return descriptor.Get(); }
    const std::string& Path() const { return path; }

    /**
     * Removes part files that a killed process left: those that are a minute old and that nobody holds locked. Does
     * something for root alone, and looks at a bounded number of files.
     */
    void Sweep() const;

private:
    std::string path;
    UniqueFd descriptor;
};

}  // namespace reference
