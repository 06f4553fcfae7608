#pragma once

// What the packages import from libzovacredentials.so.6.

extern "C" {

/**
 * Makes the process run as that user: supplementary groups, group id and user id. Needs effective root.
 * @param keep true leaves the way back to root open; false closes it for good.
 * @return true if the identity was taken as a whole.
 */
bool ResetCredentialsByName(const char* user, bool keep);

}  // extern "C"
