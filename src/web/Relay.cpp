#include <cstdio>
#include <string>

#include "base/Log.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"
#include "webapi/WebEntry.h"
#include "zovacredential.h"

namespace ZOVA {

namespace {

constexpr const char* kPeer = "relay_zn";
constexpr const char* kTimeout = "relay_timeout";

/** What a relayed call is made of, beside its parameters. */
struct RelayedCall {
    explicit RelayedCall(APIRequest& request)
        : api(request.GetAPIClass()),
          version(request.GetAPIVersion()),
          method(request.GetAPIMethod()),
          params(request.GetParam("", Json::Value())),
          peer(Json::asInt64(Json::member(params, kPeer))),
          timeout(Json::hasMember(params, kTimeout) ? Json::asInt(params[kTimeout]) : -1) {
        // The peer must not relay in its turn.
        params.removeMember(kPeer);
        params.removeMember(kTimeout);
    }

    std::string api;
    int version;
    std::string method;
    Json::Value params;
    long peer;
    int timeout;
};

/** Queues the call; an upload's body goes on from where standard input stands. Negative on failure. */
int Queue(CredRequestMgr& requests, const RelayedCall& call, const APIRequest& request) {
    if (!request.IsUploadRequest()) {
        return requests.AddWebAPIRequest(call.peer, call.api, call.version, call.method, call.params);
    }
    Json::Value headers(Json::objectValue);
    headers["Content-Type"] = request.GetEnv("CONTENT_TYPE", Json::Value());
    headers["Content-Length"] = request.GetEnv("CONTENT_LENGTH", Json::Value());
    return requests.AddRelayRequest(call.peer, call.api, call.version, call.method, headers, stdin, nullptr);
}

bool Refuse(APIResponse* answer, int error) {
    answer->SetError(error, Json::Value());
    return false;
}

}  // namespace

bool WebEntry::ProcessRelay(APIRequest* call, APIResponse* answer) {
    if (!CheckRequestParam(call, answer) || !AddAPIInfo(call)) {
        return false;
    }
    // The whole of the local check: whom the API is open to is the peer's to say.
    const int error = CheckPermission(Json::asBool(call->GetAPIInfo("skipTimeout", false)));
    if (error != WEBAPI_ERR_NONE) {
        return Refuse(answer, error);
    }
    const RelayedCall relayed(*call);
    CredRequestMgr requests;
    const int number = Queue(requests, relayed, *call);
    if (number < 0) {
        return Refuse(answer, WEBAPI_ERR_RELAY_FAILED);
    }
    if (relayed.timeout > 0) {
        requests.GetRequest(number)->SetResponseTimeout(relayed.timeout);
    }
    if (!requests.Run()) {
        WEBAPI_LOG(LOG_ERR, "relay request fail[%d]", requests.GetError());
        return Refuse(answer, WEBAPI_ERR_RELAY_FAILED);
    }
    answer->SetEnableOutput(false);
    OutputHeader();
    const std::string body = requests.GetResponse(number);
    fwrite(body.data(), 1, body.size(), stdout);
    fflush(stdout);
    return true;
}

}  // namespace ZOVA
