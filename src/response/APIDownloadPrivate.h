#pragma once

#include <string>

#include "httpfileoutputer.h"
#include "webapi/APIDownload.h"

namespace ZOVA {

class APIDownloadPrivate {
public:
    /** `given` is owned if `owns`, and may be null. */
    APIDownloadPrivate(APIDownload* object, APIResponse* given, bool owns);
    APIDownloadPrivate(const APIDownloadPrivate&) = delete;
    APIDownloadPrivate& operator=(const APIDownloadPrivate&) = delete;
    ~APIDownloadPrivate();

    bool SetHeader(const std::string& name, const std::string& value);
    bool SetHeader(const Json::Value& headers);
    bool Output(const std::string& path);
    bool Output(FILE* stream);

    APIDownload* download;
    APIResponse* response;
    /** Empty until known. */
    std::string mimeType;
    HTTPFileOutputer outputer;
    bool ownsResponse;

private:
    /** The header lines of the response, without the empty line behind them: the outputer adds its own. */
    void PrintHeader() const;
};

}  // namespace ZOVA
