#pragma once

// libzovacloudservice.so.1: keys derived from the device secret.

extern "C" {

/** Writes the key text for the token, 32 characters and a NUL, into `out` of `size` bytes; negative on failure. */
int ZOVACloudServiceZntokenGenerateToken(const char* token, char* out, int size);

}  // extern "C"
