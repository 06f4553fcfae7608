#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/WebEntry.h"

namespace ZOVA {

// No method can be called through a sharing link yet: every such call is refused as one whose method forbids it.

bool WebEntry::CheckSharingPermission(APIRequest* call, APIResponse* answer) {
    if (call == nullptr) {
        return false;
    }
    answer->SetError(WEBAPI_ERR_SHARING_NOT_ALLOWED, Json::Value());
    call->SetAuthResult(AUTHORIZED_RESULT_INVALID);
    return false;
}

}  // namespace ZOVA
