#pragma once

// libzovanetsdk.so.6: network addresses.

extern "C" {

/** `AF_INET` (2) for the text of an IPv4 address, `AF_INET6` (10) for that of an IPv6 address, 0 for any other. */
int ZOVANetGetAddrType(const char* text);

}  // extern "C"
