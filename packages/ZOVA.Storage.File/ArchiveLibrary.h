#pragma once

#include <archive.h>
#include <archive_entry.h>

namespace package {

/**
 * The functions of libarchive that are used. The library is mapped at the first question and not with this package:
 * most calls make no archive.
 */
struct ArchiveLibrary {
    decltype(&::archive_write_new) writeNew;
    decltype(&::archive_write_set_format_zip) setFormatZip;
    decltype(&::archive_write_set_format_pax_restricted) setFormatTar;
    decltype(&::archive_write_set_format_option) setOption;
    decltype(&::archive_write_set_bytes_per_block) setBytesPerBlock;
    decltype(&::archive_write_set_bytes_in_last_block) setBytesInLastBlock;
    decltype(&::archive_write_open) open;
    decltype(&::archive_write_header) writeHeader;
    decltype(&::archive_write_data) writeData;
    decltype(&::archive_write_finish_entry) finishEntry;
    decltype(&::archive_write_close) close;
    decltype(&::archive_write_free) free;
    decltype(&::archive_error_string) errorText;
    decltype(&::archive_entry_new) entryNew;
    decltype(&::archive_entry_free) entryFree;
    decltype(&::archive_entry_set_pathname) setPath;
    decltype(&::archive_entry_set_size) setSize;
    decltype(&::archive_entry_set_mtime) setTime;
    decltype(&::archive_entry_set_mode) setMode;

    /** Null, with a line in the log, where the device lacks the library or one of the functions. */
    static const ArchiveLibrary* Get();
};

}  // namespace package
