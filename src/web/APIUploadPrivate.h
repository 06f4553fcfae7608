#pragma once

#include <json/value.h>

#include <string>

#include "zovacgi.h"

namespace ZOVA {

class APIRequest;
class APIUpload;

/** The work of `APIUpload`: the position in the body, and the choice of a folder for its files. */
class APIUploadPrivate {
public:
    APIUploadPrivate(APIUpload* owner, APIRequest* request);
    APIUploadPrivate(const APIUploadPrivate&) = delete;
    APIUploadPrivate& operator=(const APIUploadPrivate&) = delete;
    ~APIUploadPrivate();

    void SetUploadCallback(ZovaCgiUploadCallback callback) { uploadCallback = callback; }
    int GetUploadParam(Json::Value& out);
    int GetUploadFile(Json::Value& out);
    int GetUploadAll(Json::Value& out, Json::Value* tempFiles);

    /** The folder with room for `size` bytes: of a data volume, of "/tmp", of the root file system. */
    bool FindUploadTmpDir(std::string& dir, unsigned long long size);
    /** Without room the core library's error code is set; so in the next function. */
    bool CanUploadtoTmp(std::string& dir, unsigned long long size);
    /** Leaves 200 MiB of the root file system free. */
    bool CanUploadtoRoot(std::string& dir, unsigned long long size);

private:
    static constexpr int kBoundarySize = 256;
    static constexpr int kNameSize = 64;
    static constexpr int kValueSize = 491;

    [[maybe_unused]] APIUpload* owner;
    APIRequest* request;
    ZovaCgiUploadCallback uploadCallback = nullptr;
    ZovaCgiUploadState uploadState{};
    ZovaCgi cgi{};
    char boundary[kBoundarySize] = "";
    char fieldName[kNameSize] = "";
    char fieldValue[kValueSize] = "";
};

}  // namespace ZOVA
