#pragma once

#include <json/value.h>

#include <cstdio>
#include <string>

#include "Export.h"

namespace ZOVA {

class APIDownloadPrivate;
class APIResponse;

/**
 * Answers a call with a file in place of JSON: writes the headers of a response to standard output, ends the header
 * block and sends the content.
 *
 * The method needs "allowDownload" in its description and has to call `SetEnableOutput(false)` of its response itself,
 * or the JSON answer follows behind the file. Cookies of the response do not go out with a download. Nothing is logged
 * and nothing thrown. The object serves one `Output`: a second one writes the headers again.
 */
class WEBAPI_EXPORT APIDownload {
public:
    /** With a response of its own, for the headers alone. */
    APIDownload();
    /** With the headers of this response, which is not owned and must outlive the object; null for no headers. */
    explicit APIDownload(APIResponse* response);
    APIDownload(const APIDownload&) = delete;
    APIDownload& operator=(const APIDownload&) = delete;
    ~APIDownload();

    /**
     * Sets a header of the response. "Content-type" in this spelling holds the type of JSON until it is replaced, and
     * goes out in front of the type that the content is sent with.
     * @return false without a response, and for the name "".
     */
    bool SetHeader(const std::string& name, const std::string& value);
    /** Sets each member that is a text; others are passed over. @return false at the first that is refused. */
    bool SetHeader(const Json::Value& headers);

    /** The MIME type to send, whatever the file's name says. */
    void SetMimeType(const std::string& type);
    /** Takes the MIME type from a file name; "application/octet-stream" for one that tells none. */
    void SetMimeTypeFromFileName(const std::string& fileName);

    /**
     * Sends the regular file at the path, or the ranges of it that the client asked for. The client stores it under the
     * file's own name. A link at the end of the path is not followed. Without a MIME type its name tells one.
     * @return false if the file could not be sent whole. The client then got a status and an empty body, or the
     *     connection ends before the content does: nothing more may be written in either case.
     */
    bool Output(const std::string& path);
    /**
     * Sends an open stream from its position to its end, without a file name and, unless one was set, as
     * "application/octet-stream". The caller closes the stream.
     * @return false if not all of it could be sent.
     */
    bool Output(FILE* stream);

    /** Keeps the web server from sending files itself, for the whole process. @return whether that is so now. */
    static bool SetXSendFileDisabled();
    /** Whether the web server is told to send files itself. */
    static bool GetXSendFileEnabled();

private:
    APIDownloadPrivate* d;
};

}  // namespace ZOVA
