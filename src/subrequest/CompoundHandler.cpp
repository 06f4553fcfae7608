#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"

namespace ZOVA {

// Batches are not served yet: one that is asked for answers as one that could not be set up.

bool APIRunner::HandleCompound(APIRequest*, APIResponse* answer) {
    answer->SetError(WEBAPI_ERR_INTERNAL, Json::Value());
    return false;
}

}  // namespace ZOVA
