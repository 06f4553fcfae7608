#pragma once

#include <curl/curl.h>

#include <optional>

namespace ZOVA {

/** What the framework calls of libcurl. */
struct CurlFunctions {
    decltype(&curl_easy_init) easyInit = nullptr;
    CURLcode (*easySetopt)(CURL* handle, CURLoption option, ...) = nullptr;
    decltype(&curl_easy_perform) easyPerform = nullptr;
    decltype(&curl_easy_cleanup) easyCleanup = nullptr;
    decltype(&curl_slist_append) slistAppend = nullptr;
    decltype(&curl_slist_free_all) slistFreeAll = nullptr;
};

/**
 * libcurl, opened at the first use: mapping it costs more than most calls do altogether. It is never closed, as the
 * libraries that it brings along cannot be.
 */
class CurlLibrary {
public:
    CurlLibrary() = default;
    CurlLibrary(const CurlLibrary&) = delete;
    CurlLibrary& operator=(const CurlLibrary&) = delete;
    ~CurlLibrary() = default;

    /** Null, with a line in the log, if the library cannot be opened or lacks a function; the next use tries again. */
    const CurlFunctions* Open();

private:
    std::optional<CurlFunctions> functions;
};

}  // namespace ZOVA
