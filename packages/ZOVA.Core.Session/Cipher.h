#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "cipher": what a client needs to encipher parameters, as data.envelope: "scheme", and "public_key", the base64 text
 * of a SubjectPublicKeyInfo. 117 where the platform has no key.
 */
void Cipher(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
