// Compiles only if the packages declare what they import from libzovacredentials.so.6 as the platform's header does:
// two different declarations of one C function are refused.

#include "../../packages/common/PlatformIdentity.h"
#include "../../platform/include/zovacredentials.h"
