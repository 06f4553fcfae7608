// The upload functions of libzovacgi.so.6, the string hash of libzovacore.so.6 and the volumes of libzovasdk.so.6 on
// the fake platform.

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "FakePlatform.h"
#include "zovacgi.h"
#include "zovacore.h"
#include "zovasdk.h"

using fake::FakePlatform;
using fake::FakeUpload;

namespace {

void Fill(ZovaSzHash** hash, const FakeUpload::Pairs& pairs) {
    for (const auto& [key, value] : pairs) {
        QLIBCSzHashSetValue(hash, key.c_str(), value.c_str());
    }
}

/** The record's hash with these pairs alone. */
void Refill(ZovaCgi* cgi, const FakeUpload::Pairs& pairs) {
    if (cgi->params == nullptr) {
        cgi->params = QLIBCSzHashAlloc(1);
    }
    QLIBCHashRemoveAll(cgi->params);
    Fill(&cgi->params, pairs);
}

void Tell(const FakeUpload& upload, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state, char* boundary,
          int status) {
    *state = {upload.readBytes, upload.totalBytes, status};
    strcpy(boundary, upload.boundary.c_str());
    if (callback != nullptr) {
        callback(upload.readBytes, upload.totalBytes);
    }
}

}  // namespace

extern "C" {

int ZovaCgiLoadUploadNumParams(ZovaCgi* cgi, int count, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state,
                               char* boundary, int boundarySize) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (cgi->params == nullptr || cgi->params->count != 0 || callback != nullptr || boundary[0] != '\0') {
        fake::Unmodelled("first form fields of an upload without an empty hash");
    }
    if (!platform.Enter(__func__, std::to_string(count) + ", " + std::to_string(boundarySize), EIO)) {
        return -1;
    }
    Fill(&cgi->params, platform.upload.fields);
    Tell(platform.upload, callback, state, boundary, 0);
    return static_cast<int>(platform.upload.fields.size());
}

int ZovaCgiLoadUploadParams(ZovaCgi* cgi, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state, char* boundary,
                            int boundarySize, char* name, int nameSize, char* value, int valueSize) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(
            __func__, std::to_string(boundarySize) + ", " + std::to_string(nameSize) + ", " + std::to_string(valueSize),
            EIO)) {
        state->status = -1;
        return -1;
    }
    const FakeUpload& upload = platform.upload;
    Refill(cgi, upload.fields);
    Tell(upload, callback, state, boundary, upload.status);
    strcpy(name, upload.partName.c_str());
    strcpy(value, upload.partValue.c_str());
    return static_cast<int>(upload.fields.size());
}

int ZovaCgiLoadUploadFileToDir(ZovaCgi* cgi, const char* dir, ZovaCgiUploadCallback callback, ZovaCgiUploadState* state,
                               char* boundary, char* name) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::string(dir) + ", " + boundary + ", " + name, EIO)) {
        state->status = -4;
        return -4;
    }
    Refill(cgi, platform.upload.files);
    Tell(platform.upload, callback, state, boundary, platform.upload.status);
    return 1;
}

int ZovaCgiLoadUploadAll(ZovaSzHash** params, ZovaSzHash** files, const char* dir, int unused) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    const bool good = platform.Enter(__func__, std::string(dir) + ", " + std::to_string(unused), EIO);
    Fill(params, platform.upload.fields);
    Fill(files, platform.upload.files);
    return good ? platform.upload.status : -1;
}

ZovaSzHash* QLIBCSzHashAlloc(int size) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::to_string(size), ENOMEM)) {
        return nullptr;
    }
    ++platform.openHashes;
    return new ZovaSzHash{};
}

int QLIBCSzHashSetValue(ZovaSzHash** hash, const char* key, const char* value) {
    ZovaSzHash& all = **hash;
    all.pairs = static_cast<ZovaSzPair*>(realloc(all.pairs, (all.count + 1) * sizeof(ZovaSzPair)));
    all.pairs[all.count++] = {strdup(key), strdup(value)};
    return 0;
}

void QLIBCHashRemoveAll(ZovaSzHash* hash) {
    for (unsigned int at = 0; at < hash->count; ++at) {
        free(hash->pairs[at].key);
        free(hash->pairs[at].value);
    }
    hash->count = 0;
}

void QLIBCSzHashFree(ZovaSzHash* hash) {
    if (hash != nullptr) {
        --FakePlatform::Required(__func__).openHashes;
        QLIBCHashRemoveAll(hash);
        free(hash->pairs);
        delete hash;
    }
}

void QLIBCErrSetEx(int code, const char* file, int) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (strlen(file) == 0) {
        fake::Unmodelled("an error code without a file");
    }
    platform.coreErrors.push_back(code);
}

int VolumeAvailGet(unsigned long long size, ZovaVolumeInfo* info, int* id, int unused) {
    FakePlatform& platform = FakePlatform::Required(__func__);
    if (!platform.Enter(__func__, std::to_string(size) + ", " + std::to_string(*id) + ", " + std::to_string(unused),
                        EIO) ||
        platform.volume.empty()) {
        return 0;
    }
    strcpy(info->path, platform.volume.c_str());
    *id = 1;
    return 1;
}

}  // extern "C"
