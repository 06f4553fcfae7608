#include "Paths.h"

// The prefix is empty on a device.
#ifndef ZOVA_REFERENCE_ROOT
#define ZOVA_REFERENCE_ROOT ""
#endif

// Empty: in the folder "zova" beside this library.
#ifndef ZOVA_REFERENCE_MODULES
#define ZOVA_REFERENCE_MODULES ""
#endif

namespace reference::paths {

const char kRunDirectory[] = ZOVA_REFERENCE_ROOT "/run/zova";
const char kSessionDirectory[] = ZOVA_REFERENCE_ROOT "/run/zova/sessions";
const char kLoginFailureDirectory[] = ZOVA_REFERENCE_ROOT "/run/zova/login-failures";
const char kTaskDirectory[] = ZOVA_REFERENCE_ROOT "/run/zova/tasks";
const char kTaskSweepStamp[] = ZOVA_REFERENCE_ROOT "/run/zova/tasks.swept";
const char kSecretDirectory[] = ZOVA_REFERENCE_ROOT "/etc/zova";
const char kSecretLock[] = ZOVA_REFERENCE_ROOT "/etc/zova/.lock";
const char kEnvelopeKey[] = ZOVA_REFERENCE_ROOT "/etc/zova/envelope-key.pem";
const char kDeviceSecret[] = ZOVA_REFERENCE_ROOT "/etc/zova/device-secret";
const char kAppPrivileges[] = ZOVA_REFERENCE_ROOT "/etc/zova/app-privileges.json";
const char kWebServer[] = ZOVA_REFERENCE_ROOT "/etc/zova/web-server.json";
const char kDeviceInformation[] = ZOVA_REFERENCE_ROOT "/etc/zovainfo.conf";
const char kNewDeviceInformation[] = ZOVA_REFERENCE_ROOT "/etc/.zovainfo.conf.new";
const char kDeviceInformationLock[] = ZOVA_REFERENCE_ROOT "/etc/zova/.information-lock";
const char kAccessTokenDirectory[] = ZOVA_REFERENCE_ROOT "/var/lib/zova/access-tokens";
const char kMimeTypes[] = ZOVA_REFERENCE_ROOT "/etc/mime.types";
const char kSharingDirectory[] = ZOVA_REFERENCE_ROOT "/var/lib/zova/sharing";
const char kSharingDatabase[] = ZOVA_REFERENCE_ROOT "/var/lib/zova/sharing/sharing.db";
const char kPeers[] = ZOVA_REFERENCE_ROOT "/etc/zova/peers.json";
const char kVolumes[] = ZOVA_REFERENCE_ROOT "/etc/zova/volumes.json";
const char kGroupDirectory[] = ZOVA_REFERENCE_ROOT "/var/lib/zova/groups";
const char* const kPamDirectory = sizeof(ZOVA_REFERENCE_ROOT) > 1 ? ZOVA_REFERENCE_ROOT "/etc/pam.d" : nullptr;
const char kModuleDirectory[] = ZOVA_REFERENCE_MODULES;

}  // namespace reference::paths
