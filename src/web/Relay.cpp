#include "webapi/APIResponse.h"
#include "webapi/WebEntry.h"

namespace ZOVA {

// No peer can be reached yet: a relayed call answers as one that could not be queued.

bool WebEntry::ProcessRelay(APIRequest*, APIResponse* answer) {
    answer->SetError(WEBAPI_ERR_RELAY_FAILED, Json::Value());
    return false;
}

}  // namespace ZOVA
