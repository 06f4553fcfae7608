#pragma once

// libzovaaccesstoken.so.6: device access tokens.

#include <string>

extern "C" {

/** Tests that the token may call the method, and fills in its user's name; negative on refusal. */
int ZovaAccessTokenGrant(const std::string* tokenId, const char* api, const char* method, char* user, int userSize);

}  // extern "C"
