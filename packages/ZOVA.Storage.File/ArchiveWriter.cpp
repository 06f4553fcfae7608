#include "ArchiveWriter.h"

#include <locale.h>
#include <sys/types.h>
#include <syslog.h>

#include "../common/Text.h"

namespace package {
namespace {

constexpr mode_t kFileRights = 0700;
constexpr mode_t kOthersRead = 0044;

/** The library takes the bytes of names for what the locale says, and the host has none. */
class [[nodiscard]] Utf8Scope {
public:
    Utf8Scope()
        : locale(newlocale(LC_CTYPE_MASK, "C.UTF-8", static_cast<locale_t>(nullptr))),
          before(locale == nullptr ? nullptr : uselocale(locale)) {}
    Utf8Scope(const Utf8Scope&) = delete;
    Utf8Scope& operator=(const Utf8Scope&) = delete;
    ~Utf8Scope() {
        if (locale != nullptr) {
            uselocale(before);
            freelocale(locale);
        }
    }

private:
    locale_t locale;
    locale_t before;
};

la_ssize_t Append(struct archive*, void* output, const void* data, size_t size) {
    static_cast<std::string*>(output)->append(static_cast<const char*>(data), size);
    return static_cast<la_ssize_t>(size);
}

/** The owner's rights for everybody but to write: whoever unpacks it is another one. */
mode_t RightsOf(mode_t mode) {
    const mode_t own = mode & kFileRights;
    const mode_t run = (own & S_IXUSR) != 0 ? S_IXGRP | S_IXOTH : 0;
    return own | S_IRUSR | S_IWUSR | kOthersRead | run;
}

}  // namespace

ArchiveWriter::ArchiveWriter(const ArchiveLibrary& functions, ArchiveFormat format)
    : library(functions), archive(functions.writeNew()) {
    if (archive == nullptr) {
        return;
    }
    const Utf8Scope locale;
    const bool isZip = format == ArchiveFormat::kZip;
    const char* module = isZip ? "zip" : "pax";
    bool isOpen = IsGood(isZip ? library.setFormatZip(archive) : library.setFormatTar(archive)) &&
                  IsGood(library.setOption(archive, module, "hdrcharset", "UTF-8"));
    if (isZip) {
        isOpen = isOpen && IsGood(library.setOption(archive, module, "compression", "deflate")) &&
                 IsGood(library.setOption(archive, module, "compression-level", "1"));
    }
    // No blocks: what was made can go out.
    isOpen = isOpen && IsGood(library.setBytesPerBlock(archive, 0)) &&
             IsGood(library.setBytesInLastBlock(archive, 1)) &&
             IsGood(library.open(archive, &output, nullptr, Append, nullptr));
    if (!isOpen) {
        library.free(archive);
        archive = nullptr;
    }
}

ArchiveWriter::~ArchiveWriter() {
    if (archive != nullptr) {
        library.free(archive);
    }
}

bool ArchiveWriter::IsGood(int result) {
    if (result == ARCHIVE_OK || result == ARCHIVE_WARN) {
        return true;
    }
    const char* text = library.errorText(archive);
    syslog(LOG_ERR, "an archive cannot be made: %s", text == nullptr ? "no reason told" : text);
    return false;
}

bool ArchiveWriter::AddFolder(const std::string& name, const struct stat& status) {
    return WriteHeader(name + "/", status, S_IFDIR | RightsOf(status.st_mode | S_IXUSR), 0) && EndFile();
}

bool ArchiveWriter::BeginFile(const std::string& name, const struct stat& status, std::uint64_t size) {
    return WriteHeader(name, status, S_IFREG | RightsOf(status.st_mode), size);
}

bool ArchiveWriter::WriteHeader(const std::string& name, const struct stat& status, mode_t mode, std::uint64_t size) {
    struct archive_entry* entry = archive == nullptr ? nullptr : library.entryNew();
    if (entry == nullptr) {
        return false;
    }
    const Utf8Scope locale;
    library.setPath(entry, ValidUtf8(name).c_str());
    library.setMode(entry, mode);
    library.setTime(entry, status.st_mtime, 0);
    library.setSize(entry, static_cast<la_int64_t>(size));
    const bool isGood = IsGood(library.writeHeader(archive, entry));
    library.entryFree(entry);
    return isGood;
}

bool ArchiveWriter::Write(const char* data, std::size_t size) {
    while (size > 0) {
        const la_ssize_t written = library.writeData(archive, data, size);
        if (written <= 0) {
            return IsGood(written == 0 ? ARCHIVE_FATAL : static_cast<int>(written));
        }
        data += written;
        size -= static_cast<std::size_t>(written);
    }
    return true;
}

bool ArchiveWriter::EndFile() {
    return IsGood(library.finishEntry(archive));
}

bool ArchiveWriter::Finish() {
    const Utf8Scope locale;
    return archive != nullptr && IsGood(library.close(archive));
}

}  // namespace package
