#pragma once

#include <json/value.h>

#include <list>
#include <string>
#include <utility>

#include "APIResponse.h"
#include "Export.h"

namespace ZOVA {

class APIRequest;
class APIRunner;
class Pipe;

/**
 * Runs a batch of calls, each through `APIRunner::Process`, so that each passes admission and permission like a call of
 * its own, and gathers their answers in one response.
 *
 * An entry whose method cannot give its change of identity back runs in a forked child, and so does every entry of a
 * parallel batch; the others run in this process. Request, response and runner are not owned and must outlive it.
 */
class WEBAPI_EXPORT CompoundHandler {
public:
    CompoundHandler(APIRequest* request, APIResponse* response, APIRunner* runner);
    CompoundHandler(const CompoundHandler&) = delete;
    CompoundHandler& operator=(const CompoundHandler&) = delete;
    virtual ~CompoundHandler();

    /**
     * The whole batch. A batch whose entries fail is a success, with "has_fail" true. Logs what fails at batch level.
     * @return false with error 110 or 117 in the response.
     */
    bool Process();

    /** "mode", "stop_when_error" and "compound" of the request. 0, or 110. */
    int ParseParams();
    /** The one request and response that serve all entries. 0, or 117. */
    int PrepareNewCompReqResp();
    /** Runs all entries. Always 0. */
    int CompoundProcess();
    /** Runs one entry. 0, or the entry's own 112, 113 or 117. */
    int CompoundProcessEntry(const Json::Value& entry, unsigned int index);

    bool InitNewPipe(std::pair<Pipe*, unsigned int>& pair, unsigned int index);
    /** Returns in the parent only; false if the fork was refused. */
    bool ProcessFork(std::pair<Pipe*, unsigned int>& pair);

    void PrepareCompundResponse(Json::Value& result, Json::Value& info);
    void PrepareCompundResponse(unsigned int index);
    void PrepareCompundResponseFromChild(std::pair<Pipe*, unsigned int>& pair);
    /** What the entries' answers mean for the batch's own: failure, server error word, restart of the web server. */
    void HandleCompoundInfo();
    void Output(_tag_WEBAPI_ERR code);

private:
    [[noreturn]] WEBAPI_LOCAL void RunChild(Pipe& pipe, int parent);
    WEBAPI_LOCAL int RunInChild(unsigned int index, bool& finished);

    APIRequest* request;
    APIResponse* response;
    APIRunner* runner;
    APIRequest* subRequest;
    APIResponse* subResponse;
    bool stopWhenError;
    bool parallelMode;
    bool hasFail;
    const Json::Value* compoundList;
    Json::Value compoundResult;
    Json::Value compoundInfo;
    std::list<std::pair<Pipe*, unsigned int>> pipeList;
    std::string errorMessage;
};

}  // namespace ZOVA
