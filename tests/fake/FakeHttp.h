#pragma once

#include <map>
#include <string>
#include <vector>

namespace fake {

/** What libcurl was told of one transfer. */
struct HttpRequest {
    /** Values by the option's name without "CURLOPT_", numbers as text. "POSTFIELDS" is cut to the size given. */
    std::map<std::string, std::string> options;
    std::vector<std::string> headers;
};

/** What a server sends, in the pieces in which libcurl hands it over. */
struct HttpAnswer {
    std::vector<std::string> headers;
    std::vector<std::string> body;
};

/** The handle that the fake libcurl is opened as. */
void* CurlHandle();

/** The fake's function of that name; null if libcurl has none. */
void* CurlFunction(const char* name);

}  // namespace fake
