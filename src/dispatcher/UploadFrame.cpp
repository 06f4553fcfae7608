#include "dispatcher/UploadFrame.h"

#include "envelope/APIRequestPrivate.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"

namespace ZOVA {

bool TakesUpload(APIRunner& runner, const CallName& call, const Json::Value& attributes, APIRequest* request,
                 APIResponse* response) {
    if (!request->IsUploadRequest()) {
        return true;
    }
    const bool uploaded =
        Json::asBool(Json::member(attributes, "allowUpload")) && runner.HandleUpload(request, response);
    APIRequestPrivate::Of(*request).SetCallName(call);
    return uploaded;
}

}  // namespace ZOVA
