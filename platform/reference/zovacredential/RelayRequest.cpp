#include "zovacredential/RelayRequest.h"

#include <syslog.h>

#include <algorithm>
#include <exception>

#include "Paths.h"
#include "common/LazyModule.h"
#include "httpfileoutputer/PipeSignalScope.h"
#include "modules/HttpsModule.h"

namespace reference {

namespace {

constexpr long kGoodStatus = 200;

LazyModule module(paths::kHttpsModule);

/** The two ends of one transfer. Nothing here throws: libcurl stands between. */
struct Transfer {
    RelayRequest& request;
    size_t bodySent = 0;
    uint64_t inLeft = 0;
};

long Read(void* context, char* buffer, size_t size) {
    auto& transfer = *static_cast<Transfer*>(context);
    const std::string& body = transfer.request.body.text;
    if (transfer.bodySent < body.size()) {
        const size_t piece = body.copy(buffer, size, transfer.bodySent);
        transfer.bodySent += piece;
        return static_cast<long>(piece);
    }
    const size_t wanted = static_cast<size_t>(std::min<uint64_t>(size, transfer.inLeft));
    const size_t got = wanted > 0 ? fread(buffer, 1, wanted, transfer.request.in) : 0;
    transfer.inLeft -= got;
    return static_cast<long>(got);
}

int Write(void* context, const char* data, size_t size) {
    std::string& answer = static_cast<Transfer*>(context)->request.answer;
    if (size > RelayRequest::kLargestAnswer - answer.size()) {
        return -1;
    }
    try {
        answer.append(data, size);
        return 0;
    } catch (const std::exception&) {
        return -1;
    }
}

RelayError ErrorOf(int result, long status) {
    switch (result) {
        case ZOVA_HTTPS_GOOD:
            return status == kGoodStatus ? RelayError::kNone : RelayError::kStatus;
        case ZOVA_HTTPS_NO_CONNECTION:
            return RelayError::kNoConnection;
        case ZOVA_HTTPS_NOT_TRUSTED:
            return RelayError::kNotTrusted;
        case ZOVA_HTTPS_TIMEOUT:
            return RelayError::kTimeout;
        case ZOVA_HTTPS_BROKEN:
            return RelayError::kBroken;
        case ZOVA_HTTPS_TOO_LARGE:
            return RelayError::kTooLarge;
        case ZOVA_HTTPS_NO_BODY:
            return RelayError::kClientGone;
        default:
            return RelayError::kFailed;
    }
}

}  // namespace

RelayError RelayRequest::Perform() {
    auto* post = module.Find<decltype(ZovaHttpsPost)>("ZovaHttpsPost");
    if (post == nullptr) {
        LogRelayFailure(number, RelayError::kFailed, 0);
        return RelayError::kFailed;
    }
    Transfer transfer{*this, 0, inSize};
    Secret url;
    url.text = peer.url + (query.text.empty() ? "" : "?" + query.text);
    ZovaHttpsRequest request{};
    request.url = url.text.c_str();
    request.connectTo = peer.connectTo.empty() ? nullptr : peer.connectTo.c_str();
    request.pin = peer.pin.empty() ? nullptr : peer.pin.c_str();
    request.authority = peer.authority.data();
    request.authoritySize = peer.authority.size();
    request.contentType = contentType.c_str();
    request.bodySize = body.text.size() + inSize;
    request.read = Read;
    request.write = Write;
    request.context = &transfer;
    request.answerSeconds = answerSeconds;

    long status = 0;
    int result = ZOVA_HTTPS_FAILED;
    {
        const PipeSignalScope brokenPipe;
        result = post(&request, &status);
    }
    const RelayError error = ErrorOf(result, status);
    if (error != RelayError::kNone) {
        answer.clear();
        LogRelayFailure(number, error, status);
    }
    return error;
}

void LogRelayFailure(long peer, RelayError error, long detail) {
    syslog(LOG_ERR, "no relay to peer %ld: %s [%d, %ld]", peer, TextOf(error), static_cast<int>(error), detail);
}

}  // namespace reference
