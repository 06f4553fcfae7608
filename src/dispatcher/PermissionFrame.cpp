#include "dispatcher/PermissionFrame.h"

#include "webapi/APIRequest.h"
#include "webapi/APIRunner.h"

namespace ZOVA {

bool PassesGate(APIRunner& runner, APIRequest* request, APIResponse* response) {
    bool permitted = true;
    if (request->IsSharing()) {
        permitted = runner.CheckSharingPermission(request, response);
    } else if (runner.NeedPermission(request)) {
        permitted = runner.CheckPermission(request, response);
    }
    return permitted || runner.SkipPermission(request);
}

}  // namespace ZOVA
