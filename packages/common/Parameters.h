#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <string>

namespace package {

/**
 * Answers 101 and names the parameter that cannot be used: `{"code":101,"errors":{"parameter":"limit"}}`.
 */
void RefuseParameter(ZOVA::APIResponse* response, const char* parameter);

/**
 * An optional integer parameter from `lowest` to `highest`; `value` keeps what it held if the client sent none.
 * @return false for anything else the client sent; the answer is then 101.
 */
bool ReadInteger(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* parameter, int lowest,
                 int highest, int& value);

}  // namespace package
