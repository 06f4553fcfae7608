#include <sys/resource.h>
#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <exception>
#include <limits>
#include <string>
#include <vector>

#include "Seam.h"
#include "zovacgi/PartFile.h"
#include "zovacgi/PartFolder.h"
#include "zovacgi/UploadBody.h"

using reference::PartFile;
using reference::PartFolder;
using reference::UploadBody;
using Event = UploadBody::Event;

namespace {

constexpr int kHashSize = 256;
constexpr int kAllFields = std::numeric_limits<int>::max();

/** A file part that is complete, and the field that it stands under. */
struct StoredPart {
    std::string field;
    PartFile file;
};

/** Copies the text, or nothing of it if it does not fit. */
bool CopyText(const std::string& text, char* buffer, int size) {
    const bool fits = text.size() < static_cast<size_t>(size);
    memcpy(buffer, fits ? text.c_str() : "", fits ? text.size() + 1 : 1);
    return fits;
}

/** The record's hash, empty; null without memory. */
ZovaSzHash* EmptyHash(ZovaCgi& cgi) {
    if (cgi.params == nullptr) {
        cgi.params = QLIBCSzHashAlloc(kHashSize);
    }
    QLIBCHashRemoveAll(cgi.params);
    return cgi.params;
}

int Finish(const UploadBody& body, int status, ZovaCgiUploadState& state) {
    state.readBytes = body.BytesRead();
    state.totalBytes = body.Length();
    state.status = status;
    return status;
}

int FileFailure() {
    const bool noRoom = errno == ENOSPC || errno == EDQUOT || errno == EFBIG;
    syslog(LOG_ERR, "the file of an upload cannot be written: %m");
    return noRoom ? ZOVA_UPLOAD_NO_ROOM : ZOVA_UPLOAD_NO_FILE;
}

/** Writes what the file part under way holds. 0, or a failure. */
int Store(UploadBody& body, const PartFile& file) {
    if (!file.IsOpen()) {
        return FileFailure();
    }
    Event event = body.Next();
    for (; event == Event::kData; event = body.Next()) {
        if (!file.Write(body.Data())) {
            return FileFailure();
        }
    }
    return event == Event::kFileEnd ? 0 : body.Status();
}

/**
 * Reads form fields into the hash until there are `most`, a file is reached or the body ends.
 * @return their number, or a failure.
 */
int ReadFields(UploadBody& body, ZovaSzHash** hash, int most) {
    int fields = 0;
    while (fields < most) {
        switch (body.Next()) {
            case Event::kField:
                if (QLIBCSzHashSetValue(hash, body.Name().c_str(), body.Value().c_str()) < 0) {
                    return ZOVA_UPLOAD_NO_MEMORY;
                }
                ++fields;
                break;
            case Event::kError:
                return body.Status();
            case Event::kFile:
            case Event::kEnd:
                return fields;
            default:
                break;
        }
    }
    return fields;
}

/**
 * Gives the files their names, and the hash their paths, when the whole body is there. Of several files under one field
 * the last one stays, and nothing of the others.
 */
int Publish(std::vector<StoredPart>& parts, ZovaSzHash** files) {
    for (size_t at = 0; at < parts.size(); ++at) {
        bool isLast = true;
        for (size_t later = at + 1; later < parts.size(); ++later) {
            isLast = isLast && parts[later].field != parts[at].field;
        }
        if (!isLast) {
            continue;
        }
        const std::string path = parts[at].file.Publish();
        if (path.empty()) {
            return FileFailure();
        }
        if (QLIBCSzHashSetValue(files, parts[at].field.c_str(), path.c_str()) < 0) {
            unlink(path.c_str());
            return ZOVA_UPLOAD_NO_MEMORY;
        }
    }
    return ZOVA_UPLOAD_COMPLETE;
}

/**
 * Each part file stays open until the process ends, and the usual limit of 1,024 descriptors is no more than the
 * largest form has files. The hard limit holds.
 */
void AllowDescriptors() {
    constexpr rlim_t kWanted = reference::MultipartDecoder::kMostFiles + 1024;
    struct rlimit limit;
    if (getrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_cur < kWanted) {
        limit.rlim_cur = std::min(kWanted, limit.rlim_max);
        setrlimit(RLIMIT_NOFILE, &limit);
    }
}

int LoadAll(UploadBody& body, ZovaSzHash** params, ZovaSzHash** files, const PartFolder& folder) {
    std::vector<StoredPart> parts;
    AllowDescriptors();
    while (body.Status() != ZOVA_UPLOAD_COMPLETE) {
        const int fields = body.IsInFile() ? 0 : ReadFields(body, params, kAllFields);
        if (fields < 0) {
            return fields;
        }
        if (!body.IsInFile()) {
            continue;
        }
        parts.push_back({body.Name(), PartFile(folder)});
        const int failure = Store(body, parts.back().file);
        if (failure != 0) {
            return failure;
        }
    }
    return Publish(parts, files);
}

/** Runs one of the functions below; lack of memory is its only exception, which `state` then tells, if not null. */
template <class Function>
int WithoutException(ZovaCgiUploadState* state, const Function& function) {
    try {
        return function();
    } catch (const std::exception&) {
        if (state != nullptr) {
            state->status = ZOVA_UPLOAD_NO_MEMORY;
        }
        return ZOVA_UPLOAD_NO_MEMORY;
    }
}

}  // namespace

int ZovaCgiLoadUploadNumParams(ZovaCgi* cgi, int count, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state,
                               char* boundary, int boundarySize) {
    if (cgi == nullptr || state == nullptr || boundary == nullptr || boundarySize <= 0) {
        return ZOVA_UPLOAD_NO_UPLOAD;
    }
    return WithoutException(state, [=] {
        UploadBody& body = UploadBody::OfProcess();
        if (EmptyHash(*cgi) == nullptr || !CopyText(body.Boundary(), boundary, boundarySize)) {
            return Finish(body, ZOVA_UPLOAD_NO_MEMORY, *state);
        }
        if (body.IsSlice() && body.Length() > 0) {
            Finish(body, ZOVA_UPLOAD_RUNNING, *state);
            return 0;
        }
        body.SetCallback(callback);
        body.SetExact(true);
        const int fields = ReadFields(body, &cgi->params, count);
        body.SetExact(false);
        Finish(body, fields < 0 ? fields : body.Status(), *state);
        return fields;
    });
}

int ZovaCgiLoadUploadParams(ZovaCgi* cgi, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state, char* boundary,
                            int boundarySize, char* name, int nameSize, char* value, int valueSize) {
    if (cgi == nullptr || state == nullptr || boundary == nullptr || boundarySize <= 0 || name == nullptr ||
        nameSize <= 0 || value == nullptr || valueSize <= 0) {
        return ZOVA_UPLOAD_NO_UPLOAD;
    }
    return WithoutException(state, [=] {
        UploadBody& body = UploadBody::OfProcess();
        name[0] = '\0';
        value[0] = '\0';
        if (EmptyHash(*cgi) == nullptr || !CopyText(body.Boundary(), boundary, boundarySize)) {
            return Finish(body, ZOVA_UPLOAD_NO_MEMORY, *state);
        }
        body.SetCallback(callback);
        // A file that `ZovaCgiLoadUploadNumParams` reached is the next one; any other was not wanted.
        const bool isReached = body.IsInFile() && !body.WasOffered();
        const int fields = isReached ? 0 : ReadFields(body, &cgi->params, kAllFields);
        if (fields >= 0 && body.IsInFile()) {
            body.Offer();
            if (!CopyText(body.Name(), name, nameSize) || !CopyText(body.Value(), value, valueSize)) {
                return Finish(body, ZOVA_UPLOAD_TOO_LARGE, *state);
            }
        }
        Finish(body, fields < 0 ? fields : body.Status(), *state);
        return fields;
    });
}

int ZovaCgiLoadUploadFileToDir(ZovaCgi* cgi, const char* dir, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state,
                               char* boundary, char* name) {
    if (cgi == nullptr || dir == nullptr || state == nullptr || boundary == nullptr || name == nullptr) {
        return ZOVA_UPLOAD_NO_UPLOAD;
    }
    return WithoutException(state, [=] {
        UploadBody& body = UploadBody::OfProcess();
        body.SetCallback(callback);
        if (!body.IsInFile()) {
            return Finish(body, ZOVA_UPLOAD_NO_PART_REACHED, *state);
        }
        const PartFolder folder(dir);
        if (EmptyHash(*cgi) == nullptr || !folder.IsOpen()) {
            return Finish(body, ZOVA_UPLOAD_NO_FILE, *state);
        }
        folder.Sweep();
        PartFile file(folder);
        const int failure = Store(body, file);
        const std::string path = failure == 0 ? file.Publish() : "";
        if (path.empty()) {
            return Finish(body, failure != 0 ? failure : FileFailure(), *state);
        }
        if (QLIBCSzHashSetValue(&cgi->params, name, path.c_str()) < 0) {
            unlink(path.c_str());
            return Finish(body, ZOVA_UPLOAD_NO_MEMORY, *state);
        }
        Finish(body, body.Status(), *state);
        return 1;
    });
}

int ZovaCgiLoadUploadAll(ZovaSzHash** params, ZovaSzHash** files, const char* dir, int) {
    if (params == nullptr || files == nullptr || dir == nullptr) {
        return ZOVA_UPLOAD_NO_UPLOAD;
    }
    return WithoutException(nullptr, [=]() -> int {
        const PartFolder folder(dir);
        if (!folder.IsOpen()) {
            return ZOVA_UPLOAD_NO_FILE;
        }
        folder.Sweep();
        return LoadAll(UploadBody::OfProcess(), params, files, folder);
    });
}
