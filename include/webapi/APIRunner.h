#pragma once

#include <json/value.h>

#include <map>
#include <string>

#include "APITable.h"
#include "Export.h"

namespace ZOVA {

class APIRequest;
class APIResponse;
class APIRunnerPrivate;
class ExecParam;

/**
 * The dispatcher: takes one call from its run description to the method's result.
 *
 * A runner serves one top-level call and whatever calls are nested in it. It changes state of the whole process
 * (identity, hat, nice value, working directory, stream objects, environment) while a method runs and puts it back, so
 * that no two runners may run at once in one process. A bare runner lets everything through; the permission hooks are
 * for derived classes. API descriptions are looked up in the working directory.
 *
 * Functions with a bool result say whether the call went through; the call's outcome is in the response either way.
 */
class WEBAPI_EXPORT APIRunner {
public:
    /** Reads `lib.def` (a missing one leaves no defaults) and makes the process a session leader where it can. */
    APIRunner();
    APIRunner(const APIRunner&) = delete;
    APIRunner& operator=(const APIRunner&) = delete;
    /** Closes the API libraries and gives the process its title, thread name and syslog ident back. */
    virtual ~APIRunner();

    /**
     * Runs one run description: an object with "environ", "session", "attr", "getParam" and "postParam", each
     * optional. Meant to be called once. The result is fetched with `GetResponse`.
     */
    virtual void Run(const Json::Value& description);

    // ---- hooks ----

    /** Whether the call goes to the daemon that the description's "socket" names. */
    virtual bool CanProcessSocket(APIRequest* request);
    /** Fills the top-level request; false with the error in the response. */
    virtual bool Initialize(const Json::Value& description);
    /** The gate of a call through a sharing link. True here; an override that refuses sets the error. */
    virtual bool CheckSharingPermission(APIRequest* request, APIResponse* response);
    /** Whether the call has to pass `CheckPermission`. False here. */
    virtual bool NeedPermission(APIRequest* request);
    /** The gate of any other call. True here; an override that refuses sets the error. */
    virtual bool CheckPermission(APIRequest* request, APIResponse* response);
    /** Takes an upload before the method runs. True here; an override that fails sets the error. */
    virtual bool HandleUpload(APIRequest* request, APIResponse* response);
    /** Whether a refused call goes on all the same, its error standing until the method answers. True here. */
    virtual bool SkipPermission(APIRequest* request);

    // ---- the frame ----

    /** A copy of the body with "httpd_restart" added; null if the runner has no response. */
    Json::Value GetResponse() const;
    /** One call, from admission to the method. */
    bool Process(APIRequest* request, APIResponse* response);
    /** A call of the reserved API "ZOVA.Entry.Request": 110 without "compound"; false for any method but "request". */
    bool ProcessEntry(APIRequest* request, APIResponse* response);
    /** Runs the batch that the request's parameter "compound" holds. */
    bool HandleCompound(APIRequest* request, APIResponse* response);
    /** Runs the response's callbacks in a detached child; returns at once. Logs a hat that cannot be entered or left.
     */
    void HandleCallback(APIResponse* response);
    /** Copies the process environment into `env`, which must be an object; false with error 101 otherwise. */
    bool InitEnv(Json::Value& env);
    /** Lets the process title follow the call; takes the arguments of `main`, whose first one is written over. */
    void SetArgs(int argc, char** argv);
    /** Names process, thread and syslog ident after the call; false with error 101 or 118. Logs a refused name. */
    bool SetProcessName(APIRequest* request, APIResponse* response);

    // ---- admission ----

    /** Whether API, version and method exist and take this kind of request: 101 to 104, 115, 116. */
    bool CheckRequestParam(APIRequest* request, APIResponse* response);
    /** Copies the API's description into the request; false, with no error set, if it is not known. */
    bool AddAPIInfo(APIRequest* request);

    // ---- descriptions ----

    /** Whether one API's description can be used: "lib", "minVersion", "maxVersion", "methods", "priority". */
    bool CheckLibDescription(Json::Value& description);
    /** Completes a description from `lib.def`; returns it. */
    Json::Value& ApplyLibDef(Json::Value& description);
    /** Loads every `.lib` file of the working directory; not for the path of a call. */
    bool InitLibDesc(Json::Value& out);
    /** Loads the file that describes `api`, unless `out` has it. True does not say that the file described it. Logs. */
    bool InitLibDesc(Json::Value& out, const std::string& api);
    /** As above for the request's API; false for a null request. */
    bool InitLibDesc(Json::Value& out, APIRequest* request);
    /** The method's attributes; those of `lib.def` for a method without any. Valid until the next description loads. */
    const Json::Value& GetMethod(const std::string& api, int version, const std::string& method);
    /** One attribute of the method as a bool; absent is false. */
    bool GetMethodAttr(const std::string& api, int version, const std::string& method, const std::string& attr);
    /** The same for the request's call; false for a null request and for an empty name. */
    bool GetMethodAttr(APIRequest* request, const std::string& attr);

    // ---- libraries ----

    /** Opens the library of the request's API, once, and asks for its tables. `checkTable` may be null. Logs failures.
     */
    bool OpenLib(APIRequest* request, _tag_API_TABLE** table, _tag_API_CHECK_TABLE** checkTable);
    /** The handle of the library, owned by the runner and opened once per path; a failure is logged and not kept. */
    bool CacheLib(APIRequest* request, void** handle);
    /** The method table of an open library; false, with a line in the log, if it gives none. */
    bool GetTableFunc(void* handle, _tag_API_TABLE** table);
    /** The check table. True also for a library without one, which leaves `table` alone; a null table is logged. */
    bool GetCheckTableFunc(void* handle, _tag_API_CHECK_TABLE** table);
    /** Closes all libraries; tables and methods of theirs are gone then. */
    void CloseLib();

    // ---- running ----

    /** Runs an admitted call in this process. True if the method was called. */
    bool ProcessLib(APIRequest* request, APIResponse* response);
    /** Forwards an admitted call to its daemon. True if the daemon answered. */
    bool ProcessSocket(APIRequest* request, APIResponse* response);
    /** Counts the call if the device collects usage; never fails the call. */
    void IncreaseCounter(APIRequest* request);

    // ---- running a call out of band, as a named user ----

    /** @return the body of the answer, with "httpd_restart". Needs no runner of the caller's own. */
    static Json::Value Exec(const ExecParam& param);
    /**
     * The same from single values. `fd` of 0 or above gets the method's standard output; it stays the caller's.
     * `params` and `attr` may be null, the three texts may not be empty.
     */
    static void Exec(Json::Value& result, int fd, const char* api, int version, const char* method,
                     const Json::Value& params, const Json::Value& attr, const char* runner);
    /** Without standard output. */
    static void Exec(Json::Value& result, const char* api, int version, const char* method, const Json::Value& params,
                     const Json::Value& attr, const char* runner);
    /** Without standard output and attributes. */
    static void Exec(Json::Value& result, const char* api, int version, const char* method, const Json::Value& params,
                     const char* runner);

protected:
    Json::Value libDefault;
    Json::Value libDesc;
    APIRequest* request;
    APIResponse* response;
    std::map<std::string, void*> openLibraries;
    int entryDepth;

private:
    APIRunnerPrivate* d;
};

}  // namespace ZOVA
