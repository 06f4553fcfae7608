#pragma once

#include <sys/stat.h>

#include <string>

#include "../common/UniqueFd.h"
#include "Caller.h"
#include "FileErrors.h"

namespace package {

/** Where a path leads: into which of the caller's folders, and how on from there. */
struct Location {
    /** Never null in a location that was found. */
    const CallerFolder* folder = nullptr;
    UniqueFd top;
    /** Below `top`; "" for the folder itself. */
    std::string below;
};

/**
 * Finds the folder of the caller's that a path lies in, the innermost if there are several, and opens it.
 * @param path as a client sent it. @param caller must outlive the location.
 */
FileError Locate(const Caller& caller, const std::string& path, Location& out);

/** Opens what lies at the path. @param flags as for `OpenBeneath`. */
FileError OpenThing(const Caller& caller, const std::string& path, int flags, UniqueFd& out);

/** A name in a folder that is open as a place, for making, renaming and removing. */
struct Spot {
    const CallerFolder* top = nullptr;
    UniqueFd folder;
    std::string name;
};

/** Opens the folder that the path's last part lies in, for a change: refused where the caller may not write. */
FileError OpenSpot(const Caller& caller, const std::string& path, Spot& out);

/** Opens a folder in which something is to be made: refused where the caller may not write. */
FileError OpenTarget(const Caller& caller, const std::string& path, UniqueFd& out);

}  // namespace package
