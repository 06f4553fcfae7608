#include <charconv>
#include <cstdlib>
#include <exception>
#include <limits>
#include <optional>
#include <utility>
#include <vector>

#include "Seam.h"
#include "common/ControlBytes.h"
#include "common/JsonText.h"
#include "zovacgi/MultipartDecoder.h"
#include "zovacgi/UploadBody.h"
#include "zovacredential/RelayForm.h"
#include "zovacredential/RelayRequest.h"

using reference::RelayError;
using reference::RelayRequest;

namespace {

constexpr const char* kUserVariable = "ZOVA_WEBAPI_USERNAME";
constexpr size_t kLongestContentType = 1024;

/** The user whom the permission gate of this process has let through; "" if there was none. */
std::string UserOfProcess() {
    const char* user = getenv(kUserVariable);
    return user != nullptr ? user : "";
}

/** A decimal number of more than 0 and nothing else. */
std::optional<uint64_t> Length(const std::string& text) {
    uint64_t length = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, length);
    constexpr uint64_t kMost = std::numeric_limits<int64_t>::max() / 2;
    if (error != std::errc() || stop != end || length == 0 || length > kMost) {
        return std::nullopt;
    }
    return length;
}

bool IsMultipart(const std::string& contentType) {
    return contentType.size() <= kLongestContentType && !reference::HasControlByte(contentType) &&
           !reference::MultipartDecoder::BoundaryOf(contentType).empty();
}

/** Takes over the body of an upload that stands in `in`; false if it cannot be sent from there. */
bool TakeBody(const Json::Value& headers, FILE* in, RelayRequest& request) {
    request.contentType = reference::JsonTextMember(headers, "Content-Type");
    const auto length = Length(reference::JsonTextMember(headers, "Content-Length"));
    if (in == nullptr || !length || !IsMultipart(request.contentType)) {
        return false;
    }
    if (in == stdin) {
        const auto& begun = reference::UploadBody::OfProcess();
        if (begun.IsInFile()) {
            // The file's own header lines are gone: the rest is no form any more.
            return false;
        }
        request.body.text = begun.DelimiterBeforeRest();
    }
    request.in = in;
    request.inSize = *length;
    return true;
}

}  // namespace

namespace ZOVA {

class CredRequest::Private : public RelayRequest {};

class CredRequestMgr::Private {
public:
    /** Runs `fill` on a new request to the peer and queues it. @return its number, negative on failure. */
    template <class Fill>
    int Queue(long peer, const Fill& fill) {
        RelayError failure = RelayError::kFailed;
        try {
            auto request = std::make_unique<CredRequest::Private>();
            request->number = peer;
            failure = reference::FindPeer(peer, UserOfProcess(), request->peer);
            if (failure == RelayError::kNone) {
                failure = fill(*request);
            }
            if (failure == RelayError::kNone) {
                requests.push_back(std::make_unique<CredRequest>(std::move(request)));
                return static_cast<int>(requests.size()) - 1;
            }
        } catch (const std::exception&) {
            failure = RelayError::kFailed;
        }
        error = failure;
        reference::LogRelayFailure(peer, failure, 0);
        return -1;
    }

    CredRequest* At(int number) const {
        const bool isKnown = number >= 0 && static_cast<size_t>(number) < requests.size();
        return isKnown ? requests[static_cast<size_t>(number)].get() : nullptr;
    }

    std::vector<std::unique_ptr<CredRequest>> requests;
    RelayError error = RelayError::kNone;
};

CredRequest::CredRequest(std::unique_ptr<Private> given) : data(std::move(given)) {}

CredRequest::~CredRequest() = default;

void CredRequest::SetResponseTimeout(long seconds) {
    if (seconds > 0) {
        data->answerSeconds = std::min(seconds, RelayRequest::kMostAnswerSeconds);
    }
}

CredRequestMgr::CredRequestMgr() : data(std::make_unique<Private>()) {}

CredRequestMgr::~CredRequestMgr() = default;

int CredRequestMgr::AddWebAPIRequest(long peer, const std::string& api, int version, const std::string& method,
                                     const Json::Value& params) {
    return data->Queue(peer, [&](RelayRequest& request) {
        if (!params.isObject() && !params.isNull()) {
            return RelayError::kBadRequest;
        }
        request.contentType = "application/x-www-form-urlencoded";
        request.body.text = reference::CallForm({api, version, method}, request.peer.token.text, params);
        return RelayError::kNone;
    });
}

int CredRequestMgr::AddRelayRequest(long peer, const std::string& api, int version, const std::string& method,
                                    const Json::Value& headers, FILE* in, FILE* out) {
    return data->Queue(peer, [&](RelayRequest& request) {
        if (out != nullptr || !TakeBody(headers, in, request)) {
            return RelayError::kBadRequest;
        }
        request.query.text = reference::CallForm({api, version, method}, request.peer.token.text);
        return RelayError::kNone;
    });
}

CredRequest* CredRequestMgr::GetRequest(int number) {
    return data->At(number);
}

bool CredRequestMgr::Run() {
    try {
        for (const auto& request : data->requests) {
            RelayRequest& relay = *request->data;
            if (!relay.isDone) {
                data->error = relay.Perform();
                if (data->error != RelayError::kNone) {
                    return false;
                }
                relay.isDone = true;
            }
        }
        return true;
    } catch (const std::exception&) {
        data->error = RelayError::kFailed;
        return false;
    }
}

std::string CredRequestMgr::GetResponse(int number) const {
    const CredRequest* request = data->At(number);
    return request != nullptr && request->data->isDone ? request->data->answer : "";
}

int CredRequestMgr::GetError() const {
    return static_cast<int>(data->error);
}

}  // namespace ZOVA
