#pragma once

// libzovacredentials.so.6: identity of the process.

extern "C" {

/**
 * Makes the process run as that user: supplementary groups, group id and user id. Needs effective root.
 * @param keep true leaves the way back to root open; false closes it for good.
 * @return true if the identity was taken as a whole.
 */
bool ResetCredentialsByName(const char* user, bool keep);

/**
 * Takes on, with the way back open, the identity that belongs to the named file. Needs effective root.
 * @return true if there is such an identity and it was taken as a whole; otherwise nothing has changed.
 */
bool InitCredentialsByExecutable(const char* path, int keep);

}  // extern "C"
