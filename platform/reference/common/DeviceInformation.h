#pragma once

#include <string>

namespace reference {

/** Idle time of a login unless configured, and the longest that can be, in minutes. */
constexpr int kDefaultIdleMinutes = 15;
constexpr int kLongestIdleMinutes = 1440;

/** The login settings of the device information file, read anew by each object. A bad value counts as absent. */
class DeviceInformation {
public:
    DeviceInformation();

    /** "login_idle_minutes", 1 to kLongestIdleMinutes. */
    int IdleMinutes() const;
    /** "skip_ip_checking" is "yes". */
    bool SkipsAddressCheck() const;
    /** "trusted_proxies": addresses and networks, separated by commas. */
    std::string TrustedProxies() const;

private:
    std::string text;
};

}  // namespace reference
