#pragma once

#include <json/value.h>

#include "Export.h"

namespace ZOVA {

class APIRequest;
class APIUploadPrivate;

/**
 * Takes the body of an upload step by step, for methods with the attribute "deferUpload":
 *
 *     ZOVA::APIUpload upload(request);
 *     Json::Value fields(Json::objectValue);
 *     while (upload.GetUploadParam(fields) == 0 && upload.GetUploadFile(fields) == 0) {
 *         // fields["file"] is the path of the part's file: move it away, or remove it.
 *     }
 *
 * One object has to serve the whole body: the position goes with it. A status is 1 when the body is complete, 0 while
 * it goes on, and below 0 for a failure; -2: no room, -6: empty body, -8: no file part reached, -9: no memory, other
 * values are the CGI library's. The files belong to the identity that the process has when they are made. Nothing is
 * thrown.
 */
class WEBAPI_EXPORT APIUpload {
public:
    /** `request` is not owned and must outlive the object. */
    explicit APIUpload(APIRequest* request);
    APIUpload(const APIUpload&) = delete;
    APIUpload& operator=(const APIUpload&) = delete;
    ~APIUpload();

    /** Called now and then while the body is read, with the bytes taken so far and the length of the body. */
    void SetUploadCallback(void (*callback)(unsigned long long, unsigned long long));

    /**
     * Reads form fields up to the next file part and adds them to `out` as texts, and under the part's own field the
     * client's name for the file, which is no path and may hold any characters.
     * @return the status.
     */
    int GetUploadParam(Json::Value& out);

    /**
     * Stores the file part that `GetUploadParam` reached and puts the path of its file under the part's field in
     * `out`. The file is the caller's to move or remove.
     * @return the status.
     */
    int GetUploadFile(Json::Value& out);

    /**
     * Stores the whole rest of the body: form fields as texts and paths of files are added to `out`. Logs what cannot
     * be had for lack of memory.
     * @param tempFiles if not null, the paths of all files are appended, those of a body that failed as well.
     * @return the status, 1 on success; `out` is left alone otherwise, except by -9.
     */
    int GetUploadAll(Json::Value& out, Json::Value* tempFiles);

private:
    APIUploadPrivate* d;
};

}  // namespace ZOVA
