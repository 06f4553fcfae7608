// Tests here change no identity and follow no link: whoever asks for either gets nothing.

#include "../../packages/common/PlatformIdentity.h"
#include "../../packages/common/PlatformSharedPath.h"

bool ResetCredentialsByName(const char*, bool) {
    return false;
}

int ZovaLinkOpenPath(const ZOVA::sharing::record::Entry*, const char*) {
    return -1;
}
