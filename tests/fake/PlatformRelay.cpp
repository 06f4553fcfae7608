// Requests to peer devices on the fake platform.

#include <cerrno>
#include <cstdlib>
#include <vector>

#include "Wrap.h"
#include "webapi/Json.h"
#include "zovacredential.h"

using fake::FakePlatform;
using fake::Shown;

namespace ZOVA {

class CredRequest::Private {
public:
    std::string answer;
};

class CredRequestMgr::Private {
public:
    /** Notes the call, with the user in whose name it is made, and queues the answer. */
    int Queue(const char* function, long peer, const std::string& call) {
        FakePlatform& platform = FakePlatform::Required(function);
        const auto found = platform.peers.find(peer);
        const char* user = getenv("ZOVA_WEBAPI_USERNAME");
        const std::string text = Shown(peer) + ", " + call + ", " + Shown(user);
        if (!platform.Enter(function, text, EIO) || found == platform.peers.end()) {
            return -1;
        }
        auto request = std::make_unique<CredRequest::Private>();
        request->answer = found->second;
        requests.push_back(std::make_unique<CredRequest>(std::move(request)));
        return kFirst + static_cast<int>(requests.size()) - 1;
    }

    CredRequest& At(int number) { return *requests.at(static_cast<std::size_t>(number - kFirst)); }

    /** No number that a careless caller could guess. */
    static constexpr int kFirst = 40;

    std::vector<std::unique_ptr<CredRequest>> requests;
    bool ran = false;
};

CredRequest::CredRequest(std::unique_ptr<Private> given) : data(std::move(given)) {}

CredRequest::~CredRequest() = default;

void CredRequest::SetResponseTimeout(long seconds) {
    FakePlatform::Required("SetResponseTimeout").Enter("SetResponseTimeout", Shown(seconds), 0);
}

CredRequestMgr::CredRequestMgr() : data(std::make_unique<Private>()) {}

CredRequestMgr::~CredRequestMgr() = default;

int CredRequestMgr::AddWebAPIRequest(long peer, const std::string& api, int version, const std::string& method,
                                     const Json::Value& params) {
    return data->Queue("AddWebAPIRequest", peer,
                       api + ", " + Shown(version) + ", " + method + ", " + Json::toString(params));
}

int CredRequestMgr::AddRelayRequest(long peer, const std::string& api, int version, const std::string& method,
                                    const Json::Value& headers, FILE* in, FILE* out) {
    if (out != nullptr) {
        fake::Unmodelled("a relay whose answer goes to a file");
    }
    std::string body;
    for (int byte = fgetc(in); byte != EOF; byte = fgetc(in)) {
        body += static_cast<char>(byte);
    }
    return data->Queue("AddRelayRequest", peer,
                       api + ", " + Shown(version) + ", " + method + ", " + Json::toString(headers) + ", " + body);
}

CredRequest* CredRequestMgr::GetRequest(int number) {
    return &data->At(number);
}

bool CredRequestMgr::Run() {
    data->ran = FakePlatform::Required("CredRequestMgr::Run").Enter("CredRequestMgr::Run", "", EIO);
    return data->ran;
}

std::string CredRequestMgr::GetResponse(int number) const {
    return data->ran ? data->At(number).data->answer : "";
}

int CredRequestMgr::GetError() const {
    return FakePlatform::Required("CredRequestMgr::GetError").relayError;
}

}  // namespace ZOVA
