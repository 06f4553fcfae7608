#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "FileErrors.h"

namespace package {

/** What happens to a file that is there already. */
enum class Existing { kRefuse, kSkip, kOverwrite };

/** A file on its way to its place. */
struct Arrival {
    /** Where it lies now; it belongs to this process's user. */
    std::string part;
    std::string name;
    /** When it was changed, in seconds since the epoch; none for now. */
    std::optional<std::int64_t> changed;
};

/** What became of it. */
struct Placed {
    FileError error = FILE_OK;
    /** Left out, as something of the name is there. */
    bool isSkipped = false;
    std::uint64_t size = 0;
};

/**
 * Moves a file into a folder, under its name at once and with all its content: by renaming, from another file system
 * by a copy beside it. Of two that come at the same time one is the first, also for who overwrites nothing. The file
 * gets the rights that `AdoptFile` gives; its content is on the disk when this returns. What cannot be moved stays
 * where it is, and nothing is left beside the place.
 * @param folder open as a place.
 */
Placed PlaceFile(int folder, const Arrival& arrival, Existing existing);

}  // namespace package
