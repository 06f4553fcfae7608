#include "query/HttpQuery.h"

#include <algorithm>
#include <csignal>
#include <iostream>
#include <memory>
#include <new>

#include "query/CurlLibrary.h"

namespace ZOVA {

namespace {

constexpr long kTransferSeconds = 60;

/** A peer that closes its end must not end this process. libcurl sees to it only where it may use signals itself. */
class [[nodiscard]] BrokenPipeScope {
public:
    BrokenPipeScope() {
        struct sigaction ignore {};
        ignore.sa_handler = SIG_IGN;
        sigaction(SIGPIPE, &ignore, &saved);
    }
    BrokenPipeScope(const BrokenPipeScope&) = delete;
    BrokenPipeScope& operator=(const BrokenPipeScope&) = delete;
    ~BrokenPipeScope() { sigaction(SIGPIPE, &saved, nullptr); }

private:
    struct sigaction saved {};
};

/** Appends what libcurl hands over; no exception may unwind through it. False if there is no room. */
bool Append(std::string& block, const char* bytes, std::size_t size, std::size_t limit) noexcept {
    if (size > limit - block.size()) {
        return false;
    }
    try {
        block.append(bytes, size);
        return true;
    } catch (const std::bad_alloc&) {
        return false;
    }
}

std::size_t WriteBody(char* bytes, std::size_t size, std::size_t count, void* block) noexcept {
    if (Append(*static_cast<std::string*>(block), bytes, size * count, kLargestAnswer)) {
        return size * count;
    }
    try {
        std::cout << "not enough memory (realloc returned NULL)";
    } catch (const std::ios_base::failure&) {
        // The method that asked has made its stream throw; the transfer ends in either case.
    }
    return 0;
}

std::size_t WriteHeader(char* bytes, std::size_t size, std::size_t count, void* block) noexcept {
    return Append(*static_cast<std::string*>(block), bytes, size * count, kLargestHeaderBlock) ? size * count : 0;
}

/** Header lines as libcurl takes them; false if it refuses one. The list is the caller's in either case. */
bool MakeList(const CurlFunctions& curl, const std::string& lines, curl_slist*& list) {
    std::size_t begin = 0;
    while (begin < lines.size()) {
        const std::size_t end = std::min(lines.find('\n', begin), lines.size());
        if (end > begin) {
            curl_slist* longer = curl.slistAppend(list, lines.substr(begin, end - begin).c_str());
            if (longer == nullptr) {
                return false;
            }
            list = longer;
        }
        begin = end + 1;
    }
    return true;
}

/** One transfer: its handle and what libcurl keeps pointers to. */
class Transfer {
public:
    explicit Transfer(const CurlFunctions& functions)
        : curl(functions), list(nullptr, functions.slistFreeAll), handle(functions.easyInit(), functions.easyCleanup) {}

    bool IsOpen() const { return handle != nullptr; }

    bool Prepare(const std::string& url, const std::string& headers, const std::string& body) {
        curl_slist* lines = nullptr;
        const bool complete = MakeList(curl, headers, lines);
        list.reset(lines);
        return complete && Set(CURLOPT_URL, url.c_str()) && Set(CURLOPT_SSL_VERIFYHOST, 0L) &&
               Set(CURLOPT_SSL_VERIFYPEER, 0L) && Set(CURLOPT_TIMEOUT, kTransferSeconds) &&
               Set(CURLOPT_POSTFIELDS, body.c_str()) &&
               Set(CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size())) &&
               Set(CURLOPT_WRITEFUNCTION, &WriteBody) && Set(CURLOPT_WRITEDATA, static_cast<void*>(&answerBody)) &&
               Set(CURLOPT_HEADERFUNCTION, &WriteHeader) &&
               Set(CURLOPT_HEADERDATA, static_cast<void*>(&answerHeaders)) && Set(CURLOPT_HTTPHEADER, list.get()) &&
               Confine();
    }

    bool Perform() {
        const BrokenPipeScope brokenPipe;
        return curl.easyPerform(handle.get()) == CURLE_OK;
    }

    std::string answerBody;
    std::string answerHeaders;

private:
    template <class Value>
    bool Set(CURLoption option, Value value) {
        return curl.easySetopt(handle.get(), option, value) == CURLE_OK;
    }

    /**
     * The request goes where the caller said and nowhere else: a client's header "Proxy:" stands in a CGI environment
     * as HTTP_PROXY, and neither a server's answer nor an URL may lead to another host or protocol. Timeouts by signal
     * would jump out of C++ code.
     */
    bool Confine() {
        return Set(CURLOPT_PROXY, "") && Set(CURLOPT_FOLLOWLOCATION, 0L) && Set(CURLOPT_PROTOCOLS_STR, "https") &&
               Set(CURLOPT_NOSIGNAL, 1L);
    }

    const CurlFunctions& curl;
    std::unique_ptr<curl_slist, decltype(&curl_slist_free_all)> list;
    std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> handle;
};

}  // namespace

bool HttpQuery(CurlLibrary& library, const std::string& url, std::string& headers, std::string& body) {
    const CurlFunctions* curl = library.Open();
    if (curl == nullptr) {
        return false;
    }
    Transfer transfer(*curl);
    if (!transfer.IsOpen() || !transfer.Prepare(url, headers, body) || !transfer.Perform()) {
        return false;
    }
    body = transfer.answerBody.c_str();
    headers = transfer.answerHeaders;
    return true;
}

}  // namespace ZOVA
