#pragma once

#include <string>

namespace reference {

/** Idle time of a login unless configured, and the longest that can be, in minutes. */
constexpr int kDefaultIdleMinutes = 15;
constexpr int kLongestIdleMinutes = 1440;

/** The settings of the device information file, read anew by each object. A bad value counts as absent. */
class DeviceInformation {
public:
    DeviceInformation();

    /** "login_idle_minutes", 1 to kLongestIdleMinutes. */
    int IdleMinutes() const;
    /** "skip_ip_checking" is "yes". */
    bool SkipsAddressCheck() const;
    /** "trusted_proxies": addresses and networks, separated by commas. */
    std::string TrustedProxies() const;
    /** "fast_download": the header by which the web server is told to send a file. */
    std::string FastDownload() const;
    /** "fast_download_location": in front of a file's path in that header. */
    std::string FastDownloadLocation() const;

private:
    std::string text;
};

}  // namespace reference
