#pragma once

namespace ZOVA {

class APIRequest;
class APIResponse;
class APIRunner;

/**
 * The gate in front of a call, through the runner's hooks: that of sharing links, or the login's where one is needed.
 * @return false if the call ends here, with the error that the hook set; a forgiven refusal leaves its error standing.
 */
bool PassesGate(APIRunner& runner, APIRequest* request, APIResponse* response);

}  // namespace ZOVA
