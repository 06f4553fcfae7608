#pragma once

#include <json/value.h>

#include <string>

#include "APIRunner.h"
#include "Export.h"

namespace ZOVA {

class ExecParamPrivate;

/** What an out-of-band call is to do: API, version, method, parameters, and the user in whose name it runs. */
class WEBAPI_EXPORT ExecParam {
public:
    ExecParam();
    ExecParam(const ExecParam& other);
    /** Takes over what `Serialize` gave elsewhere; `store` comes back holding an empty one. */
    explicit ExecParam(Json::Value& store);
    ExecParam& operator=(const ExecParam& other);
    virtual ~ExecParam();

    const Json::Value& Serialize() const;
    /** Swaps the store with `store`, unchecked. */
    void Deserialize(Json::Value& store);

    // The setters chain. Those that take an object copy its members over what is there, and ignore anything else.

    ExecParam& SetParams(const Json::Value& params);
    ExecParam& SetAPI(const std::string& api);
    ExecParam& SetVersion(int version);
    ExecParam& SetMethod(const std::string& method);
    ExecParam& SetEnv(const Json::Value& env);
    /** The user's login name; the call counts as authorised. */
    ExecParam& SetRunner(const std::string& user);
    ExecParam& SetAttr(const Json::Value& attr);
    /** Descriptor that gets the method's standard output without its header; below 0 for none. Not owned. */
    ExecParam& SetOutputFd(int fd);

    std::string GetAPI() const;
    int GetVersion() const;
    std::string GetMethod() const;
    Json::Value GetParams() const;
    Json::Value GetEnv() const;
    std::string GetRunner() const;
    Json::Value GetAttr() const;
    /** -1 if none was set. */
    int GetOutputFd() const;

private:
    ExecParamPrivate* d;
};

/**
 * Runs an out-of-band call, in this process if the method gives its identity back, otherwise in a forked child.
 *
 * The call is always authorised: its identity is whatever the calling code names as the runner, so never hand on a name
 * that a client sent. Uses the process's working directory and environment meanwhile, and gives the directory back.
 */
class WEBAPI_EXPORT ExecHandler {
public:
    /** `param` is not owned and must outlive the handler. */
    explicit ExecHandler(const ExecParam& param);
    ExecHandler(const ExecHandler&) = delete;
    ExecHandler& operator=(const ExecHandler&) = delete;
    virtual ~ExecHandler();

    /**
     * @return the response body with "httpd_restart"; for what never came to run, "success" false and the error 101
     * (API, method or runner missing) or 117 (no child, or no answer from it). Logs these.
     */
    Json::Value Process();

    bool CheckParams();
    void PrepareReq();
    void Run(bool inChild);
    void RunFork();
    void RunForkForStdout();

    /** What `Process` returns, for those who call its steps one by one. Null before the call has run. */
    const Json::Value& GetResult() const;

private:
    const ExecParam* param;
    APIRunner runner;
    Json::Value runDescription;
    Json::Value execResult;
};

}  // namespace ZOVA
