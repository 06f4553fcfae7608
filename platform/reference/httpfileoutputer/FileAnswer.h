#pragma once

#include <cstdint>
#include <ctime>
#include <string>
#include <string_view>

#include "httpfileoutputer/ClientOutput.h"
#include "httpfileoutputer/Conditions.h"

namespace reference {

/** What a request says of the file that it asks for. */
struct FileRequest {
    /** Conditions and ranges are those of GET; HEAD has no body. */
    bool isGet = false;
    bool isHead = false;
    std::string_view range;
    Conditions conditions;

    /** From the CGI variables of this process; the texts last as long as those. */
    static FileRequest OfEnvironment();
};

/** An open regular file as it is to be sent. */
struct FileContent {
    int file;
    std::uint64_t size;
    Validators validators;
    /** Free of bytes that end a header line, as is the next. */
    std::string type;
    /** Value of Content-Disposition; "" for none. */
    std::string disposition;
};

/** The header lines of every answer with content, each with its end. */
std::string ContentLines(const std::string& type, const std::string& disposition);

/**
 * Ends the header block and sends what the request asks of the file: all of it, ranges, or only the status of a
 * condition or of ranges that lie outside. @return false if not all of that went out.
 */
bool SendFileAnswer(ClientOutput& client, const FileRequest& request, const FileContent& content, time_t now);

}  // namespace reference
