#pragma once

// What the packages import from libzovasdk.so.6.

extern "C" {

/** 1 if the user is a member of the administrators' group, 0 if not; negative on failure. The second argument is 0. */
int QLIBGroupIsAdminGroupMem(const char* user, int unused);

}  // extern "C"

namespace package {

/** False also where the system cannot say. */
inline bool IsAdministrator(const char* user) {
    return QLIBGroupIsAdminGroupMem(user, 0) == 1;
}

}  // namespace package
