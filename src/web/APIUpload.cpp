#include "webapi/APIUpload.h"

#include <limits>

#include "base/DecimalText.h"
#include "base/Log.h"
#include "web/APIUploadPrivate.h"
#include "webapi/APIRequest.h"
#include "webapi/Json.h"
#include "webapiutil.h"
#include "zovacore.h"

namespace ZOVA {

namespace {

constexpr int kHashSize = 256;
constexpr unsigned long long kMargin = 5242880;

/** What a file of `size` bytes needs; the greatest number where the sum does not fit, which no folder has. */
unsigned long long WithMargin(unsigned long long size) {
    constexpr unsigned long long kMost = std::numeric_limits<unsigned long long>::max();
    return size > kMost - kMargin ? kMost : size + kMargin;
}

/** A hash that the library which fills it may move. */
class OwnedHash {
public:
    OwnedHash() : hash(QLIBCSzHashAlloc(kHashSize)) {}
    OwnedHash(const OwnedHash&) = delete;
    OwnedHash& operator=(const OwnedHash&) = delete;
    ~OwnedHash() { QLIBCSzHashFree(hash); }

    ZovaSzHash* Get() const { return hash; }
    ZovaSzHash** Place() { return &hash; }

private:
    ZovaSzHash* hash;
};

void AppendValues(const ZovaSzHash* hash, Json::Value& list) {
    for (unsigned int i = 0; hash != nullptr && i < hash->count; ++i) {
        const ZovaSzPair& pair = hash->pairs[i];
        if (pair.key != nullptr && pair.value != nullptr) {
            list.append(pair.value);
        }
    }
}

}  // namespace

// ---- the face ----

APIUpload::APIUpload(APIRequest* request) : d(new APIUploadPrivate(this, request)) {}

APIUpload::~APIUpload() {
    delete d;
}

void APIUpload::SetUploadCallback(void (*callback)(unsigned long long, unsigned long long)) {
    d->SetUploadCallback(callback);
}

int APIUpload::GetUploadParam(Json::Value& out) {
    return d->GetUploadParam(out);
}

int APIUpload::GetUploadFile(Json::Value& out) {
    return d->GetUploadFile(out);
}

int APIUpload::GetUploadAll(Json::Value& out, Json::Value* tempFiles) {
    return d->GetUploadAll(out, tempFiles);
}

// ---- the work ----

APIUploadPrivate::APIUploadPrivate(APIUpload* face, APIRequest* call) : owner(face), request(call) {
    ZovaCgiInit("", &cgi);
}

APIUploadPrivate::~APIUploadPrivate() {
    ZovaCgiFree(&cgi);
}

int APIUploadPrivate::GetUploadParam(Json::Value& out) {
    if (!Json::isObject(out)) {
        uploadState.status = ZOVA_UPLOAD_NO_MEMORY;
        return uploadState.status;
    }
    const int fields = ZovaCgiLoadUploadParams(&cgi, uploadCallback, &uploadState, boundary, kBoundarySize, fieldName,
                                               kNameSize, fieldValue, kValueSize);
    if (fields > 0) {
        WebAPIUtil::SzHashToJsonObj(cgi.params, out);
    }
    if (fieldName[0] != '\0' && fieldValue[0] != '\0') {
        out[fieldName] = fieldValue;
    }
    return uploadState.status;
}

int APIUploadPrivate::GetUploadFile(Json::Value& out) {
    std::string dir;
    if (boundary[0] == '\0' || fieldName[0] == '\0' || fieldValue[0] == '\0') {
        uploadState.status = ZOVA_UPLOAD_NO_PART_REACHED;
    } else if (uploadState.totalBytes == 0) {
        uploadState.status = ZOVA_UPLOAD_EMPTY;
    } else if (!FindUploadTmpDir(dir, WithMargin(uploadState.totalBytes))) {
        uploadState.status = ZOVA_UPLOAD_NO_ROOM;
    } else if (ZovaCgiLoadUploadFileToDir(&cgi, dir.c_str(), uploadCallback, &uploadState, boundary, fieldName) > 0) {
        WebAPIUtil::SzHashToJsonObj(cgi.params, out);
    }
    return uploadState.status;
}

int APIUploadPrivate::GetUploadAll(Json::Value& out, Json::Value* tempFiles) {
    const std::string length = Json::asString(request->GetEnv("CONTENT_LENGTH", Json::Value()));
    const unsigned long long size = base::UnsignedDecimalNumberThatFits(length).value_or(0);
    if (size == 0) {
        return ZOVA_UPLOAD_EMPTY;
    }
    std::string dir;
    if (!FindUploadTmpDir(dir, WithMargin(size))) {
        return ZOVA_UPLOAD_NO_ROOM;
    }
    OwnedHash params;
    OwnedHash files;
    if (params.Get() == nullptr || files.Get() == nullptr) {
        WEBAPI_LOG(LOG_ERR, "cannot alloc memory for hash!");
        return ZOVA_UPLOAD_NO_MEMORY;
    }
    const int status = ZovaCgiLoadUploadAll(params.Place(), files.Place(), dir.c_str(), 0);
    // Before the status is looked at, so that the files of a broken upload are cleaned up too.
    if (tempFiles != nullptr) {
        AppendValues(files.Get(), *tempFiles);
    }
    if (status != ZOVA_UPLOAD_COMPLETE) {
        return status;
    }
    if (!WebAPIUtil::SzHashToJsonObj(params.Get(), out) || !WebAPIUtil::SzHashToJsonObj(files.Get(), out)) {
        WEBAPI_LOG(LOG_ERR, "cannot convert hash to Json object!");
        return ZOVA_UPLOAD_NO_MEMORY;
    }
    return status;
}

}  // namespace ZOVA
