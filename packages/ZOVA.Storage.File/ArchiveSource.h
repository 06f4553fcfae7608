#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "../common/UniqueFd.h"
#include "ArchiveWriter.h"
#include "FolderNames.h"
#include "Viewer.h"

namespace package {

/** Something to put into an archive with all that is in it: where it lies, and its name in the archive. */
struct ArchiveItem {
    std::string path;
    std::string name;
};

/**
 * An archive of files and folders that is made while it is read, of whatever size: it holds one piece of one file, and
 * the folders that lead to it.
 *
 * Links are not followed. They, what is neither file nor folder, what may not be read, and what vanished or got shorter
 * meanwhile are told in a last entry, `kNoteName`, if there is any. A file that got shorter is filled up with zeros, as
 * its length is out by then; one that grew is cut.
 */
class ArchiveSource {
public:
    static constexpr char kNoteName[] = "not-in-this-archive.txt";

    /** @param asker says what may be seen; it and `functions` must outlive the source. */
    ArchiveSource(const ArchiveLibrary& functions, ArchiveFormat format, const Viewer& asker,
                  std::vector<ArchiveItem> items);

    /** The next bytes. @return their number, 0 at the end, -1 if the archive cannot go on. */
    long Read(char* buffer, std::size_t size);

private:
    struct Level {
        FolderNames names;
        /** In the archive. */
        std::string path;
    };

    /** Makes something more. False if the archive cannot go on. */
    bool Step();
    bool AddItem(const ArchiveItem& item);
    bool Add(UniqueFd thing, const struct stat& status, const std::string& path);
    bool AddName(const Level& level, const char* name);
    bool CopyPiece();
    bool EndFile();
    bool AddNote();
    void LeaveOut(const std::string& path, const char* reason);

    ArchiveWriter writer;
    const Viewer& viewer;
    std::vector<ArchiveItem> wanted;
    std::size_t nextItem = 0;
    std::vector<Level> levels;
    UniqueFd file;
    std::string filePath;
    std::uint64_t left = 0;
    bool isFilledUp = false;
    std::string note;
    std::size_t taken = 0;
    bool isDone = false;
};

}  // namespace package
