#include "ArchiveLibrary.h"

#include <dlfcn.h>
#include <syslog.h>

namespace package {
namespace {

constexpr char kLibrary[] = "libarchive.so.13";

template <class Function>
bool Find(void* library, const char* name, Function& function) {
    function = reinterpret_cast<Function>(dlsym(library, name));
    return function != nullptr;
}

bool FindAll(void* library, ArchiveLibrary& out) {
    return Find(library, "archive_write_new", out.writeNew) &&
           Find(library, "archive_write_set_format_zip", out.setFormatZip) &&
           Find(library, "archive_write_set_format_pax_restricted", out.setFormatTar) &&
           Find(library, "archive_write_set_format_option", out.setOption) &&
           Find(library, "archive_write_set_bytes_per_block", out.setBytesPerBlock) &&
           Find(library, "archive_write_set_bytes_in_last_block", out.setBytesInLastBlock) &&
           Find(library, "archive_write_open", out.open) && Find(library, "archive_write_header", out.writeHeader) &&
           Find(library, "archive_write_data", out.writeData) &&
           Find(library, "archive_write_finish_entry", out.finishEntry) &&
           Find(library, "archive_write_close", out.close) && Find(library, "archive_write_free", out.free) &&
           Find(library, "archive_error_string", out.errorText) && Find(library, "archive_entry_new", out.entryNew) &&
           Find(library, "archive_entry_free", out.entryFree) &&
           Find(library, "archive_entry_set_pathname", out.setPath) &&
           Find(library, "archive_entry_set_size", out.setSize) &&
           Find(library, "archive_entry_set_mtime", out.setTime) &&
           Find(library, "archive_entry_set_mode", out.setMode);
}

/** The library stays open: a call makes one archive at most. */
const ArchiveLibrary* Load() {
    static ArchiveLibrary functions;
    void* library = dlopen(kLibrary, RTLD_NOW | RTLD_LOCAL);
    if (library != nullptr && FindAll(library, functions)) {
        return &functions;
    }
    const char* reason = dlerror();
    syslog(LOG_ERR, "no archives can be made: %s", reason == nullptr ? "a function has no address" : reason);
    return nullptr;
}

}  // namespace

const ArchiveLibrary* ArchiveLibrary::Get() {
    static const ArchiveLibrary* const functions = Load();
    return functions;
}

}  // namespace package
