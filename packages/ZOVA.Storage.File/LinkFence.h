#pragma once

#include <sys/stat.h>
#include <sys/types.h>
#include <webapi/APIRequest.h>

#include <map>
#include <string>
#include <utility>
#include <vector>

namespace package {

/** What a visitor's call may touch: what lies at the paths that it names, as far as the link shares them. */
class LinkFence {
public:
    /**
     * Asks the platform for each path and notes what lies there. Needs effective root.
     * @return false if one of them is not shared.
     */
    bool Admit(const ZOVA::APIRequest* request, const std::vector<std::string>& paths);

    /** Whether what was opened at an admitted path is still what was looked at. */
    bool IsAdmitted(const std::string& path, const struct stat& status) const;

    /** Whether something below a shared folder is shared with it: a file or folder of the link's owner. */
    bool IsShared(const struct stat& status) const;

private:
    std::map<std::string, std::pair<dev_t, ino_t>> admitted;
    uid_t owner = 0;
};

/** The paths that the link of a visitor's call shares, as its owner named them. */
std::vector<std::string> SharedPaths(const ZOVA::APIRequest* request);

}  // namespace package
