#include "webapi/APIDownload.h"

#include "response/APIDownloadPrivate.h"
#include "response/HeaderLine.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"

namespace ZOVA {

APIDownloadPrivate::APIDownloadPrivate(APIDownload* object, APIResponse* given, bool owns)
    : download(object), response(given), ownsResponse(owns) {}

APIDownloadPrivate::~APIDownloadPrivate() {
    if (ownsResponse) {
        delete response;
    }
}

bool APIDownloadPrivate::SetHeader(const std::string& name, const std::string& value) {
    return response != nullptr && response->SetHeader(name, value);
}

bool APIDownloadPrivate::SetHeader(const Json::Value& headers) {
    if (headers.type() != Json::objectValue) {
        return true;
    }
    for (auto header = headers.begin(); header != headers.end(); ++header) {
        if (header->isString() && !SetHeader(header.name(), Json::asString(*header))) {
            return false;
        }
    }
    return true;
}

void APIDownloadPrivate::PrintHeader() const {
    if (response == nullptr) {
        return;
    }
    std::string block;
    const Json::Value headers = response->GetHeaders();
    if (headers.type() == Json::objectValue) {
        for (auto header = headers.begin(); header != headers.end(); ++header) {
            AppendHeaderLine(block, header.name(), *header);
        }
    }
    fwrite(block.data(), 1, block.size(), stdout);
}

bool APIDownloadPrivate::Output(const std::string& path) {
    PrintHeader();
    if (mimeType.empty()) {
        mimeType = HTTPFileOutputer::GetMimeType(path);
    }
    return outputer.Output(path, mimeType);
}

bool APIDownloadPrivate::Output(FILE* stream) {
    PrintHeader();
    if (mimeType.empty()) {
        // A stream has no name that could tell a type.
        mimeType = "application/octet-stream";
    }
    return outputer.Output(stream, "", mimeType);
}

APIDownload::APIDownload() : d(new APIDownloadPrivate(this, new APIResponse(nullptr), true)) {}

APIDownload::APIDownload(APIResponse* response) : d(new APIDownloadPrivate(this, response, false)) {}

APIDownload::~APIDownload() {
    delete d;
}

bool APIDownload::SetHeader(const std::string& name, const std::string& value) {
    return d->SetHeader(name, value);
}

bool APIDownload::SetHeader(const Json::Value& headers) {
    return d->SetHeader(headers);
}

void APIDownload::SetMimeType(const std::string& type) {
    d->mimeType = type;
}

void APIDownload::SetMimeTypeFromFileName(const std::string& fileName) {
    d->mimeType = HTTPFileOutputer::GetMimeType(fileName);
}

bool APIDownload::Output(const std::string& path) {
    return d->Output(path);
}

bool APIDownload::Output(FILE* stream) {
    return d->Output(stream);
}

bool APIDownload::SetXSendFileDisabled() {
    return HTTP::FileOutputerHelper::SetFastOutputEnabled(false);
}

bool APIDownload::GetXSendFileEnabled() {
    return HTTP::FileOutputerHelper::IsFastOutputEnabled();
}

}  // namespace ZOVA
