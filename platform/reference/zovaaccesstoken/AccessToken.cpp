#include "Seam.h"

// There is no store of device access tokens: every token is refused, and the user's name left alone.

int ZovaAccessTokenGrant(const std::string*, const char*, const char*, char*, int) {
    return -1;
}
