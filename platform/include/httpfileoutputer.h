#pragma once

// libhttp-file-outputer.so.6: a file as the answer of a CGI program.

#include <cstdio>
#include <string>

/** Ends a header block that the program has begun on standard output, and sends the content of a file behind it. */
class HTTPFileOutputer {
public:
    /** The MIME type of a file of this name; "application/octet-stream" if the name tells none. */
    static std::string GetMimeType(const std::string& fileName);

    /**
     * Sends a regular file, or what the client's request asks of it, as an attachment of the file's own name. A link at
     * the end of the path is not followed.
     * @return false if not all of the answer went out, or if there is no such file to send: the client is told so by
     *     the status and an empty body then.
     */
    bool Output(const std::string& path, const std::string& mimeType);
    /**
     * Sends an open stream from its present position to its end; the caller closes it.
     * @param fileName the name that the client is to store it under, "" to say none.
     * @return false if not all of the answer went out, or if the stream could not be read to its end.
     */
    bool Output(FILE* stream, const std::string& fileName, const std::string& mimeType);
};

namespace ZOVA::HTTP {

/** Whether the web server sends files itself, as it is told by a header. One setting for the process. */
class FileOutputerHelper {
public:
    /** @return whether the setting is now as asked: it stays off where the device does not offer it. */
    static bool SetFastOutputEnabled(bool enable);
    static bool IsFastOutputEnabled();
};

}  // namespace ZOVA::HTTP
