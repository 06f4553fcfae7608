#pragma once

// What the module zova-login.so exports. It stands apart so that PAM is mapped only where a password is checked.

extern "C" {

enum ZovaLoginModuleResult {
    ZOVA_LOGIN_MODULE_GOOD = 0,
    ZOVA_LOGIN_MODULE_REFUSED = 1,
    ZOVA_LOGIN_MODULE_FAILED = 2,
};

/**
 * Authenticates the user by the password and checks the account, without a pause after a refusal.
 * @param directory where the PAM services are described; null for the system's own place.
 * @param address the client's address for the log, or "".
 */
int ZovaLoginModuleCheck(const char* directory, const char* service, const char* user, const char* password,
                         const char* address);

}  // extern "C"
