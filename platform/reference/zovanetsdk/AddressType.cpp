#include <arpa/inet.h>

#include "Seam.h"

int ZOVANetGetAddrType(const char* text) {
    unsigned char address[sizeof(in6_addr)];
    for (const int family : {AF_INET, AF_INET6}) {
        if (text != nullptr && inet_pton(family, text, address) == 1) {
            return family;
        }
    }
    return 0;
}
