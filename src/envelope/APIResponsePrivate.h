#pragma once

#include <list>
#include <string>

#include "webapi/APIBase.h"
#include "webapi/APIResponse.h"

namespace ZELM {
class Task;
}

namespace ZOVA {

/** One function to run after the answer. The argument is not owned. */
struct ResponseCallback {
    APIResponse::CallbackFunc function;
    void* argument;
};

using ResponseCallbackList = std::list<ResponseCallback>;

class APIResponsePrivate : public APIBase {
public:
    APIResponsePrivate(APIRequest* request, APIResponse* response);
    APIResponsePrivate(const APIResponsePrivate&) = delete;
    APIResponsePrivate& operator=(const APIResponsePrivate&) = delete;
    ~APIResponsePrivate() override;

    void SetOutcome(int code, const Json::Value& extra);

    bool AddCookie(const std::string& key, const std::string& value, const std::string& path, long expire,
                   const std::string& domain, bool secure, bool httpOnly);
    /** Protocol and host by which the client reached the server; false without a request. */
    bool GetSiteURL(std::string& url) const;

    APIRequest* request;
    APIResponse* response;
    ZELM::Task* task;
    ResponseCallbackList callbacks;
};

}  // namespace ZOVA
