#pragma once

#include <json/value.h>

namespace ZOVA {

class APIRequest;
class APIResponse;
class APIRunner;
struct CallName;

/**
 * Takes the upload that came with a call, through the runner's hook; true at once for a call without one. The request
 * names `call` afterwards, whatever the upload's form fields brought.
 * @param attributes of the method; one without "allowUpload" takes none.
 * @return false if the call ends here, with the error that the hook set.
 */
bool TakesUpload(APIRunner& runner, const CallName& call, const Json::Value& attributes, APIRequest* request,
                 APIResponse* response);

}  // namespace ZOVA
