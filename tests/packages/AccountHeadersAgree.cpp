// Compiles only if the packages declare what they import from libzovasdk.so.6 as the platform's header does: two
// different declarations of one C function are refused.

#include <type_traits>

#include "../../packages/common/PlatformAccounts.h"
#include "../../platform/include/zovasdk.h"

static_assert(std::is_same_v<decltype(QLIBGroupIsAdminGroupMem), int(const char*, int)>);
