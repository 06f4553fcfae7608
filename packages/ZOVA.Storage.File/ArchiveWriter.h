#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <cstdint>
#include <string>

#include "ArchiveLibrary.h"

namespace package {

enum class ArchiveFormat { kZip, kTar };

/**
 * An archive that is made entry by entry into a buffer. Names are UTF-8; of an entry's state its time of change and its
 * owner's rights are told, nothing of who owns it.
 *
 * A zip is compressed a little, since some readers take no stored entry whose length follows behind it.
 */
class ArchiveWriter {
public:
    /** @param functions must outlive the writer. */
    ArchiveWriter(const ArchiveLibrary& functions, ArchiveFormat format);
    ArchiveWriter(const ArchiveWriter&) = delete;
    ArchiveWriter& operator=(const ArchiveWriter&) = delete;
    ~ArchiveWriter();

    // Each is false if the archive cannot go on, which is logged.

    /** @param name of the entry, without a slash in front. */
    bool AddFolder(const std::string& name, const struct stat& status);
    /** Begins a file, to be followed by exactly `size` bytes and `EndFile`. */
    bool BeginFile(const std::string& name, const struct stat& status, std::uint64_t size);
    bool Write(const char* data, std::size_t size);
    bool EndFile();
    /** Ends the archive. Nothing may be added then. */
    bool Finish();

    /** What was made and not taken yet. */
    std::string& Output() { return output; }

private:
    bool WriteHeader(const std::string& name, const struct stat& status, mode_t mode, std::uint64_t size);
    bool IsGood(int result);

    const ArchiveLibrary& library;
    struct archive* archive;
    std::string output;
};

}  // namespace package
