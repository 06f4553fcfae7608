#pragma once

#include <json/value.h>

#include <string>

#include "APIRunner.h"
#include "Export.h"

struct ZovaCgi;

namespace ZOVA {

/**
 * The CGI front end: the request comes from the process environment and standard input, the answer leaves on standard
 * output. A host program makes one per HTTP request and calls `Run` once:
 *
 *     int main(int argc, char** argv) {
 *         ZOVA::WebEntry entry;
 *         entry.SetArgs(argc, argv);
 *         entry.Run(Json::Value());
 *     }
 *
 * The working directory must be the one of the description files. Whatever the client sent, a header block and a JSON
 * body go out, unless the method switched the output off.
 */
class WEBAPI_EXPORT WebEntry : public APIRunner {
public:
    WebEntry();
    ~WebEntry() override;

    /** Serves the call; the argument is not looked at. */
    void Run(const Json::Value& description) override;
    /** Fills the request from environment, query string and body; false with the error in the response. */
    bool Initialize(const Json::Value& description) override;

    /** Login, device token or bearer token, kind of user, application privilege. Logs a failed token. */
    bool CheckPermission(APIRequest* request, APIResponse* response) override;
    /**
     * The authorisation alone, on the process's own request, at most once per value of `allowTimeout`.
     * @return 0 or the error number.
     */
    int CheckPermission(bool allowTimeout);
    /**
     * The gate of sharing links: the method allows them, link and session are good, the project agrees. Error 101, 122
     * to 127 or 150 in the response if not. A link for one named user makes the call one of that user.
     */
    bool CheckSharingPermission(APIRequest* request, APIResponse* response) override;
    /** False only for "authLevel" 0. */
    bool NeedPermission(APIRequest* request) override;
    /** True only for "authLevel" 2. */
    bool SkipPermission(APIRequest* request) override;
    /** Stores an upload's files for the method; 108 in the response if that fails. */
    bool HandleUpload(APIRequest* request, APIResponse* response) override;

    /** Writes the header block to standard output. */
    void OutputHeader();
    /** Writes the body to standard output and flushes it. */
    void OutputBody();
    /** Removes the files that an upload left in a temporary directory. */
    void RemoveTemporaryUploadFile();

    // ---- parameter intake ----

    /** Fills "getParam" and "postParam" of `out` from query string and body. */
    bool InitParam(Json::Value& out);
    /** The query string's parameters; 101 in the response if it is no text. */
    bool InitGetParam(Json::Value& out);
    /** The body's parameters; standard input is at its end afterwards. Logs an exception caught while the body was
     * read. */
    bool InitPostParam(Json::Value& out);
    /** Turns one line of pairs, enciphered or clear, into members of `out`. */
    bool DetectAndDecryptParamLine(const std::string& line, Json::Value& out);
    /** Deciphers an envelope into members of `out`; false, and nothing logged, if it cannot be deciphered. */
    bool DecryptParam(const std::string& cipherText, Json::Value& out);
    /** Deciphers the AES pair among the parameters in place, if there is one; false if it cannot be deciphered. */
    bool DecryptAESParam(Json::Value& params);
    /** The first form fields of an upload, which name the API. */
    bool LoadUploadAPIDesc(Json::Value& out);

    // ---- the project's say about a sharing call ----

    /**
     * Runs the project's check in the project's hat and under the identity of its check library; both are as before
     * afterwards. False also if there is no check. Logs why, but for a check that says no.
     */
    bool CheckSharingAppPermission(APIRequest* request, APIResponse* response);
    /** Makes the call one of the user to whom the visitor's session belongs; leaves it alone if there is none. */
    void InitSharingSession(APIRequest* request);
    /** Path of the project's check library; "" without a usable project name. */
    std::string GetSharingCheckLibPath(APIRequest* request);
    /** Opens the check library, once per path, and asks for its table. Logs failures. */
    bool OpenSharingCheckLib(APIRequest* request, _tag_API_SHARING_CHECK_TABLE** table);
    /** The table of an open check library, which keeps it; false, with a line in the log, if it gives none. */
    bool GetSharingCheckTableFunc(void* handle, _tag_API_SHARING_CHECK_TABLE** table);
    /** The function of the first row that fits the call. Logs rows without an expression. */
    bool GetSharingCheckFunc(APIRequest* request, _tag_API_SHARING_CHECK_TABLE* table,
                             bool (**check)(APIRequest*, APIResponse*));
    /** 0 if the expression is "*" or matches anywhere in the text; another number else, also for a malformed one. */
    int RegexMatch(const char* regex, const char* text);

    /**
     * Passes the call on to the peer device of "relay_zn" and writes the peer's answer as the body. The call must be
     * described here too and its caller be logged in; what the caller may do is the peer's to say. Error in the
     * response if not: as from admission and login, 109 if the peer could not be asked. Logs a failure of the
     * transport.
     */
    bool ProcessRelay(APIRequest* request, APIResponse* response);

private:
    /** Lets the parameters "_sid", "tid", "_sharing_id" and "_sharing_sid" stand in for cookies and headers. */
    bool TakeCredentialParameters();
    /** Asks for the authorisation result and makes the session of the process's own request. */
    int Authorize(bool allowTimeout);

    Json::Value tempUploadFiles;
    ZovaCgi* cgi;
    Json::Value permCache;
};

}  // namespace ZOVA
