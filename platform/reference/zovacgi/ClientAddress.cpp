#include "zovacgi/ClientAddress.h"

#include <cstdlib>

#include "common/DeviceInformation.h"
#include "common/NetAddress.h"
#include "common/WithoutBlanks.h"

namespace reference {

std::string ClientAddress(std::string_view peer, std::string_view forwarded, std::string_view trustedProxies) {
    auto address = NetAddress::Parse(peer);
    if (!address) {
        return "";
    }
    while (!forwarded.empty() && IsInNetworkList(*address, trustedProxies)) {
        const size_t comma = forwarded.rfind(',');
        const size_t start = comma == std::string_view::npos ? 0 : comma + 1;
        const std::string_view last = WithoutBlanks(forwarded.substr(start));
        forwarded = forwarded.substr(0, comma == std::string_view::npos ? 0 : comma);
        const auto next = NetAddress::Parse(last);
        if (!next) {
            break;
        }
        address = next;
    }
    return address->Text();
}

std::string ClientAddressOfRequest() {
    const char* peer = getenv("REMOTE_ADDR");
    if (peer == nullptr) {
        return "";
    }
    const char* forwarded = getenv("HTTP_X_FORWARDED_FOR");
    if (forwarded == nullptr || *forwarded == '\0') {
        return ClientAddress(peer, "", "");
    }
    return ClientAddress(peer, forwarded, DeviceInformation().TrustedProxies());
}

}  // namespace reference
