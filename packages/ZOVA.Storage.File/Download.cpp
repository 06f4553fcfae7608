#include "Download.h"

#include <errno.h>
#include <fcntl.h>
#include <stdio.h>
#include <sys/stat.h>
#include <webapi/APIDownload.h>

#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "../common/Fence.h"
#include "ArchiveSource.h"
#include "Attachment.h"
#include "ClientPath.h"
#include "Requests.h"
#include "Viewer.h"

namespace package {
namespace {

constexpr const char* kFormats[] = {"zip", "tar", nullptr};
constexpr const char* kTypes[] = {"application/zip", "application/x-tar"};
constexpr int kNoFormat = -1;
/** What an archive of several things is called. */
constexpr char kSeveral[] = "files";

struct StreamEnd {
    void operator()(FILE* stream) const { fclose(stream); }
};
using Stream = std::unique_ptr<FILE, StreamEnd>;

/** Opens for reading what is a file or a folder. */
FileError OpenContent(const Viewer& viewer, const std::string& path, UniqueFd& out, struct stat& status) {
    // A device is looked at and not opened.
    FileError error = viewer.Open(path, O_PATH | O_NOFOLLOW, out, status);
    if (error == FILE_OK && !S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode)) {
        error = FILE_ERR_WRONG_KIND;
    }
    if (error == FILE_OK) {
        error = viewer.Open(path, O_RDONLY, out, status);
    }
    return error == FILE_OK && !S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode) ? FILE_ERR_WRONG_KIND : error;
}

void Send(ZOVA::APIResponse* response, ZOVA::APIDownload& download, const std::string& type, const std::string& name,
          FILE* stream) {
    download.SetMimeType(type);
    download.SetHeader("Content-type", type);
    download.SetHeader("Content-Disposition", AttachmentNamed(name));
    response->SetEnableOutput(false);
    response->SetSuccess(Json::Value());
    download.Output(stream);
}

void SendFile(ZOVA::APIResponse* response, UniqueFd file, const std::string& name) {
    const Stream stream(fdopen(file.Get(), "r"));
    if (stream == nullptr) {
        Refuse(response, ErrorOf(errno, "reading a file"));
        return;
    }
    static_cast<void>(file.Release());
    // By its path the web server might find something else there.
    ZOVA::APIDownload::SetXSendFileDisabled();
    ZOVA::APIDownload download(response);
    Send(response, download, "application/octet-stream", name, stream.get());
}

/** A name that is none of those taken: "name (2)" and so on. */
std::string OwnName(const std::string& name, std::set<std::string>& taken) {
    std::string own = name;
    for (int number = 2; !taken.insert(own).second; ++number) {
        own = name + " (" + std::to_string(number) + ")";
    }
    return own;
}

ssize_t ReadArchive(void* source, char* buffer, size_t size) {
    const long count = static_cast<ArchiveSource*>(source)->Read(buffer, size);
    errno = count < 0 ? EIO : errno;
    return count;
}

void SendArchive(ZOVA::APIResponse* response, const Viewer& viewer, const std::vector<std::string>& paths, int format) {
    const ArchiveLibrary* library = ArchiveLibrary::Get();
    if (library == nullptr) {
        Refuse(response, FILE_ERR_NO_ARCHIVER);
        return;
    }
    std::vector<ArchiveItem> items;
    std::set<std::string> taken{ArchiveSource::kNoteName};
    for (const std::string& path : paths) {
        items.push_back({path, OwnName(NameOf(path), taken)});
    }
    ArchiveSource source(*library, static_cast<ArchiveFormat>(format), viewer, std::move(items));
    const Stream stream(fopencookie(&source, "r", {ReadArchive, nullptr, nullptr, nullptr}));
    if (stream == nullptr) {
        Refuse(response, ErrorOf(errno, "making an archive"));
        return;
    }
    ZOVA::APIDownload download(response);
    const std::string name = paths.size() == 1 ? NameOf(paths.front()) : kSeveral;
    Send(response, download, kTypes[format], name + "." + kFormats[format], stream.get());
}

void Answer(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::vector<std::string> paths;
    int format = kNoFormat;
    Viewer viewer;
    if (!ReadPaths(request, response, paths) || !ReadWord(request, response, "format", kFormats, format) ||
        !viewer.Begin(request, response, paths)) {
        return;
    }
    Results results;
    for (const std::string& path : paths) {
        UniqueFd thing;
        struct stat status;
        results.Add(path, OpenContent(viewer, path, thing, status));
        if (results.FirstError() != FILE_OK) {
            results.Answer(response);
            return;
        }
        if (paths.size() == 1 && format == kNoFormat && S_ISREG(status.st_mode)) {
            SendFile(response, std::move(thing), NameOf(path));
            return;
        }
    }
    SendArchive(response, viewer, paths, format == kNoFormat ? 0 : format);
}

}  // namespace

void Download(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("download", response, [&] { Answer(request, response); });
}

}  // namespace package
