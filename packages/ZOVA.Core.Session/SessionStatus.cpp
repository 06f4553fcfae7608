#include "SessionStatus.h"

#include <webapi/APIRequest.h>

namespace package {
namespace {

struct Refusal {
    int result;
    int error;
    const char* word;
};

constexpr Refusal kRefusals[] = {
    {ZOVA::AUTHORIZED_RESULT_TIMEOUT, ZOVA::WEBAPI_ERR_SESSION_TIMEOUT, "timeout"},
    {ZOVA::AUTHORIZED_RESULT_UNAUTHENTICATED, ZOVA::WEBAPI_ERR_NOT_AUTHENTICATED, "unauth"},
    {ZOVA::AUTHORIZED_RESULT_IP_MISMATCH, ZOVA::WEBAPI_ERR_IP_MISMATCH, "errorip"},
};
constexpr Refusal kAnyOther = {0, ZOVA::WEBAPI_ERR_NO_PERMISSION, "noprivilege"};

const Refusal& Find(int result) {
    for (const Refusal& refusal : kRefusals) {
        if (refusal.result == result) {
            return refusal;
        }
    }
    return kAnyOther;
}

}  // namespace

void RefuseSession(ZOVA::APIResponse* response, int result) {
    const Refusal& refusal = Find(result);
    response->SetServerError(refusal.word);
    response->SetError(refusal.error, Json::Value());
}

}  // namespace package
