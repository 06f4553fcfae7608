#pragma once

// All fixed places that the reference libraries read or write. What they are stands in Paths.cpp alone, so that the
// tests link everything else as it is with a private root.

namespace reference::paths {

extern const char kRunDirectory[];
extern const char kSessionDirectory[];
extern const char kLoginFailureDirectory[];
extern const char kTaskDirectory[];
/** Beside the folder and not in it, since everybody may create files there. */
extern const char kTaskSweepStamp[];

extern const char kSecretDirectory[];
extern const char kSecretLock[];
extern const char kEnvelopeKey[];
extern const char kDeviceSecret[];
extern const char kAppPrivileges[];
extern const char kWebServer[];
extern const char kVolumes[];
extern const char kPeers[];

extern const char kDeviceInformation[];
/** What is to become the file above. One name for all writers: the next of them removes what a killed one left. */
extern const char kNewDeviceInformation[];
/** In a folder that only root can enter, so that nobody else can hold the lock. */
extern const char kDeviceInformationLock[];
extern const char kAccessTokenDirectory[];
/** The system's table of MIME types, of the Debian package media-types. */
extern const char kMimeTypes[];
extern const char kGroupDirectory[];
extern const char kSharingDirectory[];
extern const char kSharingDatabase[];
/** Null: wherever the system keeps its PAM services. */
extern const char* const kPamDirectory;

/** Where the modules opened at first use lie. Empty: in the folder "zova" beside this library. */
extern const char kModuleDirectory[];
constexpr const char* kCryptoModule = "zova-crypto.so";
constexpr const char* kLoginModule = "zova-login.so";
constexpr const char* kSqliteModule = "zova-sqlite.so";
constexpr const char* kHttpsModule = "zova-https.so";

}  // namespace reference::paths
