#include "common/DeviceInformation.h"

#include "Paths.h"
#include "common/Files.h"
#include "common/KeyValueText.h"

namespace reference {

DeviceInformation::DeviceInformation() {
    constexpr size_t kLargest = 65536;
    if (ReadFile(paths::kDeviceInformation, kLargest, FileTrust::kRootOnlyWrites, text) != ReadResult::kGood) {
        text.clear();
    }
}

int DeviceInformation::IdleMinutes() const {
    const auto value = FindKeyValue(text, "login_idle_minutes");
    if (!value || value->empty() || value->size() > 4) {
        return kDefaultIdleMinutes;
    }
    int minutes = 0;
    for (char digit : *value) {
        if (digit < '0' || digit > '9') {
            return kDefaultIdleMinutes;
        }
        minutes = minutes * 10 + (digit - '0');
    }
    return minutes >= 1 && minutes <= kLongestIdleMinutes ? minutes : kDefaultIdleMinutes;
}

bool DeviceInformation::SkipsAddressCheck() const {
    return FindKeyValue(text, "skip_ip_checking") == "yes";
}

std::string DeviceInformation::TrustedProxies() const {
    return std::string(FindKeyValue(text, "trusted_proxies").value_or(""));
}

std::string DeviceInformation::FastDownload() const {
    return std::string(FindKeyValue(text, "fast_download").value_or(""));
}

std::string DeviceInformation::FastDownloadLocation() const {
    return std::string(FindKeyValue(text, "fast_download_location").value_or(""));
}

}  // namespace reference
