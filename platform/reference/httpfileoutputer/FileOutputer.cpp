#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>

#include "Seam.h"
#include "common/UniqueFd.h"
#include "httpfileoutputer/ClientOutput.h"
#include "httpfileoutputer/ContentDisposition.h"
#include "httpfileoutputer/FileAnswer.h"
#include "httpfileoutputer/MimeTypes.h"

using reference::ClientOutput;
using reference::FileContent;
using reference::FileRequest;
using reference::UniqueFd;

namespace {

/** The type in which no byte can end the header line. */
std::string SafeType(const std::string& type) {
    std::string safe = type.empty() ? reference::kUnknownMimeType : type;
    for (char& byte : safe) {
        if (static_cast<unsigned char>(byte) < 0x20 || byte == 0x7f) {
            byte = ' ';
        }
    }
    return safe;
}

/** Sends first what the program has written to standard output, the beginning of the header block. */
bool FlushStandardOutput() {
    const reference::PipeSignalScope signal;
    return fflush(stdout) == 0;
}

/** Ends the header block where there is nothing to send. Always false. */
bool Refuse(const char* status) {
    ClientOutput(fileno(stdout)).Write(std::string("Status: ") + status + "\r\nContent-Length: 0\r\n\r\n");
    return false;
}

const char* StatusOf(int error) {
    switch (error) {
        case ENOENT:
        case ENOTDIR:
        case ENAMETOOLONG:
            return "404 Not Found";
        case EACCES:
        case EPERM:
        case ELOOP:
            return "403 Forbidden";
        default:
            return "500 Internal Server Error";
    }
}

bool SendRegularFile(int file, const struct stat& status, const std::string& name, const std::string& type) {
    const time_t now = time(nullptr);
    ClientOutput client(fileno(stdout));
    return SendFileAnswer(
        client, FileRequest::OfEnvironment(),
        FileContent{file, static_cast<std::uint64_t>(status.st_size), reference::ValidatorsOf(status, now),
                    SafeType(type), reference::AttachmentNamed(name)},
        now);
}

/** What has no beginning to come back to goes out once and as a whole; its length is not known. */
bool SendOnce(FILE* stream, const std::string& name, const std::string& type) {
    ClientOutput client(fileno(stdout));
    const std::string lines = reference::ContentLines(SafeType(type), reference::AttachmentNamed(name));
    return client.Write(lines + "Accept-Ranges: none\r\n\r\n") &&
           (FileRequest::OfEnvironment().isHead || client.SendStream(stream));
}

/** Whether the stream stands at the beginning of a regular file. What it holds unwritten goes to the file. */
bool IsWholeFile(FILE* stream, struct stat& status) {
    const int file = fileno(stream);
    return file >= 0 && fstat(file, &status) == 0 && S_ISREG(status.st_mode) && ftello(stream) == 0 &&
           fflush(stream) == 0 && fstat(file, &status) == 0;
}

}  // namespace

std::string HTTPFileOutputer::GetMimeType(const std::string& fileName) {
    return reference::MimeTypeOf(fileName);
}

bool HTTPFileOutputer::Output(const std::string& path, const std::string& mimeType) {
    if (!FlushStandardOutput()) {
        return false;
    }
    if (path.empty() || path.find('\0') != std::string::npos) {
        return Refuse(StatusOf(ENOENT));
    }
    const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW | O_NOCTTY));
    if (!file.IsOpen()) {
        return Refuse(StatusOf(errno));
    }
    struct stat status;
    if (fstat(file.Get(), &status) != 0 || !S_ISREG(status.st_mode)) {
        return Refuse(StatusOf(EACCES));
    }
    return SendRegularFile(file.Get(), status, path, mimeType);
}

bool HTTPFileOutputer::Output(FILE* stream, const std::string& fileName, const std::string& mimeType) {
    if (!FlushStandardOutput()) {
        return false;
    }
    if (stream == nullptr) {
        return Refuse(StatusOf(EBADF));
    }
    struct stat status;
    if (IsWholeFile(stream, status)) {
        return SendRegularFile(fileno(stream), status, fileName, mimeType);
    }
    return SendOnce(stream, fileName, mimeType);
}
