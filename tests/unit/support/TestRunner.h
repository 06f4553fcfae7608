#pragma once

#include <string>
#include <vector>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/WebEntry.h"

namespace unit {

/** A runner whose parts a test can reach, and whose hooks answer what the test sets and note that they were asked. */
class TestRunner : public ZOVA::APIRunner {
public:
    ZOVA::APIRequest* Request() { return request; }
    ZOVA::APIResponse* Response() { return response; }
    Json::Value& Defaults() { return libDefault; }
    Json::Value& Descriptions() { return libDesc; }
    int EntryDepth() const { return entryDepth; }
    std::size_t OpenLibraryCount() const { return openLibraries.size(); }

    bool Initialize(const Json::Value& description) override {
        asked.push_back("Initialize");
        return APIRunner::Initialize(description);
    }
    bool CheckSharingPermission(ZOVA::APIRequest*, ZOVA::APIResponse* answer) override {
        asked.push_back("CheckSharingPermission");
        return Outcome(sharingError, answer);
    }
    bool NeedPermission(ZOVA::APIRequest*) override {
        asked.push_back("NeedPermission");
        return needsPermission;
    }
    bool CheckPermission(ZOVA::APIRequest*, ZOVA::APIResponse* answer) override {
        asked.push_back("CheckPermission");
        return Outcome(permissionError, answer);
    }
    bool HandleUpload(ZOVA::APIRequest* call, ZOVA::APIResponse* answer) override {
        asked.push_back("HandleUpload");
        if (!uploadedParams.isNull()) {
            call->InitParam(uploadedParams, false);
        }
        return Outcome(uploadError, answer);
    }
    bool SkipPermission(ZOVA::APIRequest*) override {
        asked.push_back("SkipPermission");
        return skipsPermission;
    }

    int sharingError = 0;
    int permissionError = 0;
    int uploadError = 0;
    bool needsPermission = false;
    bool skipsPermission = false;
    /** What the form fields of an upload bring. */
    Json::Value uploadedParams;
    std::vector<std::string> asked;

private:
    static bool Outcome(int error, ZOVA::APIResponse* answer) {
        if (error != 0) {
            answer->SetError(error, Json::Value());
        }
        return error == 0;
    }
};

/** A web entry whose parts a test can reach. */
class TestWebEntry : public ZOVA::WebEntry {
public:
    ZOVA::APIRequest* Request() { return request; }
    ZOVA::APIResponse* Response() { return response; }
    Json::Value& Descriptions() { return libDesc; }
};

}  // namespace unit
