#pragma once

// All fixed places that the reference libraries read or write. The prefix is empty on a device; the tests build the
// same sources with a private root.

#ifndef ZOVA_REFERENCE_ROOT
#define ZOVA_REFERENCE_ROOT ""
#endif

// Where the modules opened at first use lie. Empty: in the folder "zova" beside this library.
#ifndef ZOVA_REFERENCE_MODULES
#define ZOVA_REFERENCE_MODULES ""
#endif

namespace reference::paths {

constexpr const char* kRunDirectory = ZOVA_REFERENCE_ROOT "/run/zova";
constexpr const char* kSessionDirectory = ZOVA_REFERENCE_ROOT "/run/zova/sessions";
constexpr const char* kLoginFailureDirectory = ZOVA_REFERENCE_ROOT "/run/zova/login-failures";
constexpr const char* kTaskDirectory = ZOVA_REFERENCE_ROOT "/run/zova/tasks";
/** Beside the folder and not in it, since everybody may create files there. */
constexpr const char* kTaskSweepStamp = ZOVA_REFERENCE_ROOT "/run/zova/tasks.swept";

constexpr const char* kSecretDirectory = ZOVA_REFERENCE_ROOT "/etc/zova";
constexpr const char* kSecretLock = ZOVA_REFERENCE_ROOT "/etc/zova/.lock";
constexpr const char* kEnvelopeKey = ZOVA_REFERENCE_ROOT "/etc/zova/envelope-key.pem";
constexpr const char* kDeviceSecret = ZOVA_REFERENCE_ROOT "/etc/zova/device-secret";
constexpr const char* kAppPrivileges = ZOVA_REFERENCE_ROOT "/etc/zova/app-privileges.json";
constexpr const char* kWebServer = ZOVA_REFERENCE_ROOT "/etc/zova/web-server.json";

constexpr const char* kDeviceInformation = ZOVA_REFERENCE_ROOT "/etc/zovainfo.conf";
/** What is to become the file above. One name for all writers: the next of them removes what a killed one left. */
constexpr const char* kNewDeviceInformation = ZOVA_REFERENCE_ROOT "/etc/.zovainfo.conf.new";
/** In a folder that only root can enter, so that nobody else can hold the lock. */
constexpr const char* kDeviceInformationLock = ZOVA_REFERENCE_ROOT "/etc/zova/.information-lock";
constexpr const char* kAccessTokenDirectory = ZOVA_REFERENCE_ROOT "/var/lib/zova/access-tokens";
constexpr const char* kGroupDirectory = ZOVA_REFERENCE_ROOT "/var/lib/zova/groups";
// Null: wherever the system keeps its PAM services.
constexpr const char* kPamDirectory = sizeof(ZOVA_REFERENCE_ROOT) > 1 ? ZOVA_REFERENCE_ROOT "/etc/pam.d" : nullptr;

constexpr const char* kSharingDirectory = ZOVA_REFERENCE_ROOT "/var/lib/zova/sharing";
constexpr const char* kSharingDatabase = ZOVA_REFERENCE_ROOT "/var/lib/zova/sharing/sharing.db";
constexpr const char* kModuleDirectory = ZOVA_REFERENCE_MODULES;
constexpr const char* kCryptoModule = "zova-crypto.so";
constexpr const char* kLoginModule = "zova-login.so";
constexpr const char* kSqliteModule = "zova-sqlite.so";

}  // namespace reference::paths
