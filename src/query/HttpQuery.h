#pragma once

#include <string>

namespace ZOVA {

class CurlLibrary;

/** Largest body and largest header block that an answer may have, in bytes. */
constexpr std::size_t kLargestAnswer = 16 * 1024 * 1024;
constexpr std::size_t kLargestHeaderBlock = 1024 * 1024;

/**
 * One POST to an HTTPS URL, of at most 60 seconds.
 * @param headers request header lines, and then the response's.
 * @param body of the request, and then the response's up to its first NUL byte.
 * @return whether a whole answer came; headers and body are left alone otherwise. Logs only that there is no libcurl.
 */
bool HttpQuery(CurlLibrary& library, const std::string& url, std::string& headers, std::string& body);

}  // namespace ZOVA
