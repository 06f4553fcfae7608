#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"

namespace ZOVA {

// No daemon is served yet: a description's "socket" counts as one that is not there, and the library serves.

bool APIRunner::CanProcessSocket(APIRequest*) {
    return false;
}

bool APIRunner::ProcessSocket(APIRequest*, APIResponse* answer) {
    answer->SetError(WEBAPI_ERR_INTERNAL, Json::Value());
    return false;
}

}  // namespace ZOVA
