#pragma once

#include <webapi/APIResponse.h>

namespace package {

/**
 * Answers for a session that is not good, as the framework's own gate would: error number and the word of the header
 * "x-request-error".
 * @param result an authorisation result other than 1 and 2.
 */
void RefuseSession(ZOVA::APIResponse* response, int result);

}  // namespace package
