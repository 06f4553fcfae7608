#pragma GCC visibility push(default)
#include "modules/HttpsModule.h"
#pragma GCC visibility pop

#include <curl/curl.h>
#include <strings.h>

#include <algorithm>
#include <charconv>
#include <ctime>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace {

constexpr long kConnectSeconds = 10;
/** How long the peer may take none of the request that is being sent. */
constexpr time_t kStallSeconds = 60;
constexpr size_t kLargestHeaderBlock = 65536;

constexpr std::string_view kProtocol = "HTTP/";
constexpr std::string_view kInterim = "HTTP/1.1 1";

using Handle = std::unique_ptr<CURL, decltype(&curl_easy_cleanup)>;
using Lines = std::unique_ptr<curl_slist, decltype(&curl_slist_free_all)>;

time_t Now() {
    struct timespec now {};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return now.tv_sec;
}

/** How far one exchange has come. What it is told by libcurl it passes on to the caller's functions. */
struct Exchange {
    explicit Exchange(const ZovaHttpsRequest& wanted) : request(wanted) {}

    const ZovaHttpsRequest& request;
    uint64_t left = request.bodySize;
    /** Time of the last byte that went out. */
    time_t lastSent = Now();
    curl_off_t sent = 0;
    size_t headerBytes = 0;
    bool answerBegun = false;
    bool bodyBegun = false;
    /** Whether the answer says where it ends; in bytes, if it has its end from a length. */
    bool isFramed = false;
    std::optional<uint64_t> length;
    uint64_t received = 0;
    /** The answer has come whole, and the transfer was ended for that. */
    bool isComplete = false;
    /** Why a function below ended the transfer. */
    ZovaHttpsResult stopped = ZOVA_HTTPS_GOOD;
};

/** The body's next piece. A peer that answers before it has all of it wants no more. */
size_t Read(char* buffer, size_t size, size_t count, void* data) {
    auto& exchange = *static_cast<Exchange*>(data);
    const size_t wanted = static_cast<size_t>(std::min<uint64_t>(size * count, exchange.left));
    if (wanted == 0 || exchange.answerBegun) {
        return 0;
    }
    const long got = exchange.request.read(exchange.request.context, buffer, wanted);
    if (got <= 0 || static_cast<size_t>(got) > wanted) {
        exchange.stopped = ZOVA_HTTPS_NO_BODY;
        return CURL_READFUNC_ABORT;
    }
    exchange.left -= static_cast<size_t>(got);
    // The time that the body's source took is not the peer's.
    exchange.lastSent = Now();
    return static_cast<size_t>(got);
}

/** Notes what the header line says of the answer's end: a length, or a coding with an end of its own, which wins. */
void NoteEnd(std::string_view line, Exchange& exchange) {
    constexpr std::string_view kLength = "content-length:";
    constexpr std::string_view kCoding = "transfer-encoding:";
    const auto begins = [&](std::string_view name) {
        return line.size() > name.size() && strncasecmp(line.data(), name.data(), name.size()) == 0;
    };
    if (begins(kCoding) && line.find("chunked") != std::string_view::npos) {
        exchange.isFramed = true;
        exchange.length.reset();
    } else if (begins(kLength)) {
        line.remove_prefix(std::min(line.find_first_not_of(" \t", kLength.size()), line.size()));
        uint64_t length = 0;
        const auto parsed = std::from_chars(line.data(), line.data() + line.size(), length);
        if (parsed.ec == std::errc() && !exchange.isFramed) {
            exchange.length = length;
        }
        exchange.isFramed = true;
    }
}

size_t WriteHeader(char* line, size_t size, size_t count, void* data) {
    auto& exchange = *static_cast<Exchange*>(data);
    const size_t length = size * count;
    if (length > kLargestHeaderBlock - exchange.headerBytes) {
        exchange.stopped = ZOVA_HTTPS_TOO_LARGE;
        return 0;
    }
    exchange.headerBytes += length;
    const std::string_view text(line, length);
    if (text.substr(0, kProtocol.size()) == kProtocol) {
        exchange.answerBegun = text.substr(0, kInterim.size()) != kInterim;
        exchange.isFramed = false;
        exchange.length.reset();
    }
    NoteEnd(text, exchange);
    exchange.bodyBegun = exchange.answerBegun && text == "\r\n";
    return length;
}

size_t WriteBody(char* bytes, size_t size, size_t count, void* data) {
    auto& exchange = *static_cast<Exchange*>(data);
    if (exchange.request.write(exchange.request.context, bytes, size * count) != 0) {
        exchange.stopped = ZOVA_HTTPS_TOO_LARGE;
        return 0;
    }
    exchange.received += size * count;
    return size * count;
}

/**
 * Called at least once a second: ends a transfer that takes too long, and one whose answer is there. libcurl would
 * first send what it has of the body, which a peer that has answered need not take.
 */
int Watch(void* data, curl_off_t, curl_off_t, curl_off_t, curl_off_t sent) {
    auto& exchange = *static_cast<Exchange*>(data);
    if (sent != exchange.sent) {
        exchange.sent = sent;
        exchange.lastSent = Now();
    }
    if (exchange.bodyBegun && exchange.length == exchange.received) {
        exchange.isComplete = true;
        return 1;
    }
    const bool isSent = exchange.left == 0 || exchange.answerBegun;
    const time_t limit = isSent ? exchange.request.answerSeconds : kStallSeconds;
    if (Now() - exchange.lastSent < limit) {
        return 0;
    }
    exchange.stopped = ZOVA_HTTPS_TIMEOUT;
    return 1;
}

template <class Value>
bool Set(CURL* handle, CURLoption option, Value value) {
    return curl_easy_setopt(handle, option, value) == CURLE_OK;
}

/**
 * The request goes where the caller said and nowhere else: no proxy of the environment, where a client's header may
 * stand, no other host or protocol that an answer names.
 */
bool Confine(CURL* handle) {
    return Set(handle, CURLOPT_PROXY, "") && Set(handle, CURLOPT_FOLLOWLOCATION, 0L) &&
           Set(handle, CURLOPT_PROTOCOLS_STR, "https") && Set(handle, CURLOPT_NOSIGNAL, 1L) &&
           Set(handle, CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1)) &&
           Set(handle, CURLOPT_CONNECTTIMEOUT, kConnectSeconds);
}

/** Without an authority the key is the proof; a server without either is never asked. */
bool SetTrust(CURL* handle, const ZovaHttpsRequest& request) {
    const bool isVouchedFor = request.authoritySize > 0;
    if (!isVouchedFor && request.pin == nullptr) {
        return false;
    }
    if (!Set(handle, CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2)) ||
        !Set(handle, CURLOPT_SSL_VERIFYHOST, 2L) || !Set(handle, CURLOPT_SSL_VERIFYPEER, isVouchedFor ? 1L : 0L) ||
        (request.pin != nullptr && !Set(handle, CURLOPT_PINNEDPUBLICKEY, request.pin))) {
        return false;
    }
    // Nobody else vouches: not what the system trusts, nor what the environment names.
    if (!Set(handle, CURLOPT_CAINFO, static_cast<const char*>(nullptr)) ||
        !Set(handle, CURLOPT_CAPATH, static_cast<const char*>(nullptr))) {
        return false;
    }
    curl_blob certificates{const_cast<char*>(request.authority), request.authoritySize, CURL_BLOB_NOCOPY};
    return !isVouchedFor || Set(handle, CURLOPT_CAINFO_BLOB, &certificates);
}

bool SetTarget(CURL* handle, const ZovaHttpsRequest& request, curl_slist* headers, curl_slist* connectTo) {
    return headers != nullptr && (request.connectTo == nullptr || connectTo != nullptr) &&
           Set(handle, CURLOPT_URL, request.url) && Set(handle, CURLOPT_CONNECT_TO, connectTo) &&
           Set(handle, CURLOPT_HTTPHEADER, headers) && Set(handle, CURLOPT_POST, 1L) &&
           Set(handle, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(request.bodySize));
}

bool SetFunctions(CURL* handle, Exchange& exchange) {
    void* const data = &exchange;
    return Set(handle, CURLOPT_READFUNCTION, &Read) && Set(handle, CURLOPT_READDATA, data) &&
           Set(handle, CURLOPT_WRITEFUNCTION, &WriteBody) && Set(handle, CURLOPT_WRITEDATA, data) &&
           Set(handle, CURLOPT_HEADERFUNCTION, &WriteHeader) && Set(handle, CURLOPT_HEADERDATA, data) &&
           Set(handle, CURLOPT_XFERINFOFUNCTION, &Watch) && Set(handle, CURLOPT_XFERINFODATA, data) &&
           Set(handle, CURLOPT_NOPROGRESS, 0L);
}

/** Null if one of the lines could not be added. */
Lines MakeLines(std::initializer_list<const char*> texts) {
    Lines lines(nullptr, curl_slist_free_all);
    for (const char* text : texts) {
        curl_slist* longer = curl_slist_append(lines.get(), text);
        if (longer == nullptr) {
            return Lines(nullptr, curl_slist_free_all);
        }
        static_cast<void>(lines.release());
        lines.reset(longer);
    }
    return lines;
}

int ResultOf(CURLcode code) {
    switch (code) {
        case CURLE_OK:
            return ZOVA_HTTPS_GOOD;
        case CURLE_COULDNT_RESOLVE_HOST:
        case CURLE_COULDNT_CONNECT:
            return ZOVA_HTTPS_NO_CONNECTION;
        case CURLE_SSL_CONNECT_ERROR:
        case CURLE_PEER_FAILED_VERIFICATION:
        case CURLE_SSL_PINNEDPUBKEYNOTMATCH:
        case CURLE_SSL_CACERT_BADFILE:
            return ZOVA_HTTPS_NOT_TRUSTED;
        case CURLE_OPERATION_TIMEDOUT:
            return ZOVA_HTTPS_TIMEOUT;
        case CURLE_OUT_OF_MEMORY:
        case CURLE_FAILED_INIT:
            return ZOVA_HTTPS_FAILED;
        default:
            return ZOVA_HTTPS_BROKEN;
    }
}

}  // namespace

int ZovaHttpsPost(const ZovaHttpsRequest* request, long* status) {
    const Handle handle(curl_easy_init(), curl_easy_cleanup);
    const std::string type = std::string("Content-Type: ") + request->contentType;
    // Without "Expect" the body follows at once.
    const Lines headers = MakeLines({type.c_str(), "Accept: application/json", "Expect:"});
    const Lines connectTo =
        request->connectTo != nullptr ? MakeLines({request->connectTo}) : Lines(nullptr, curl_slist_free_all);
    Exchange exchange(*request);
    if (!handle || !SetTarget(handle.get(), *request, headers.get(), connectTo.get()) ||
        !SetFunctions(handle.get(), exchange) || !SetTrust(handle.get(), *request) || !Confine(handle.get())) {
        return ZOVA_HTTPS_FAILED;
    }
    const CURLcode code = curl_easy_perform(handle.get());
    if (exchange.stopped != ZOVA_HTTPS_GOOD) {
        return exchange.stopped;
    }
    const bool isWhole = code == CURLE_OK || (code == CURLE_ABORTED_BY_CALLBACK && exchange.isComplete);
    if (isWhole && curl_easy_getinfo(handle.get(), CURLINFO_RESPONSE_CODE, status) != CURLE_OK) {
        return ZOVA_HTTPS_FAILED;
    }
    // An end of the connection alone may be anybody's doing: libcurl does not ask for the closing word of TLS.
    if (isWhole) {
        return exchange.isFramed ? ZOVA_HTTPS_GOOD : ZOVA_HTTPS_BROKEN;
    }
    return ResultOf(code);
}
