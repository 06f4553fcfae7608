#include "common/NetAddress.h"

#include <arpa/inet.h>

#include <cstring>

#include "common/Hex.h"
#include "common/WithoutBlanks.h"

namespace reference {

namespace {

constexpr unsigned char kMappedPrefix[12] = {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff};

/** Decimal number of at most three digits, -1 for anything else. */
int SmallNumber(std::string_view text) {
    if (text.empty() || text.size() > 3) {
        return -1;
    }
    int number = 0;
    for (char digit : text) {
        if (digit < '0' || digit > '9') {
            return -1;
        }
        number = number * 10 + (digit - '0');
    }
    return number;
}

}  // namespace

std::optional<NetAddress> NetAddress::Parse(std::string_view text) {
    char buffer[INET6_ADDRSTRLEN];
    if (text.empty() || text.size() >= sizeof(buffer) || text.find('\0') != std::string_view::npos) {
        return std::nullopt;
    }
    memcpy(buffer, text.data(), text.size());
    buffer[text.size()] = '\0';
    NetAddress address;
    if (inet_pton(AF_INET, buffer, &address.bytes[sizeof(kMappedPrefix)]) == 1) {
        memcpy(address.bytes.data(), kMappedPrefix, sizeof(kMappedPrefix));
        return address;
    }
    if (inet_pton(AF_INET6, buffer, address.bytes.data()) == 1) {
        return address;
    }
    return std::nullopt;
}

bool NetAddress::IsVersion4() const {
    return memcmp(bytes.data(), kMappedPrefix, sizeof(kMappedPrefix)) == 0;
}

std::string NetAddress::Text() const {
    char buffer[INET6_ADDRSTRLEN];
    const char* text = IsVersion4() ? inet_ntop(AF_INET, &bytes[sizeof(kMappedPrefix)], buffer, sizeof(buffer))
                                    : inet_ntop(AF_INET6, bytes.data(), buffer, sizeof(buffer));
    return text != nullptr ? text : "";
}

std::string NetAddress::SourceKey() const {
    const size_t length = IsVersion4() ? bytes.size() : bytes.size() / 2;
    return HexText(std::string_view(reinterpret_cast<const char*>(bytes.data()), length));
}

bool NetAddress::IsIn(std::string_view network) const {
    const size_t slash = network.find('/');
    const auto base = Parse(network.substr(0, slash));
    if (!base || base->IsVersion4() != IsVersion4()) {
        return false;
    }
    const int width = IsVersion4() ? 32 : 128;
    const int given = slash == std::string_view::npos ? width : SmallNumber(network.substr(slash + 1));
    if (given < 0 || given > width) {
        return false;
    }
    const int bits = given + (128 - width);
    for (int bit = 0; bit < bits; ++bit) {
        const unsigned char mask = static_cast<unsigned char>(0x80 >> (bit % 8));
        if (((bytes[bit / 8] ^ base->bytes[bit / 8]) & mask) != 0) {
            return false;
        }
    }
    return true;
}

bool IsInNetworkList(const NetAddress& address, std::string_view networks) {
    while (!networks.empty()) {
        const size_t comma = networks.find(',');
        const std::string_view network = WithoutBlanks(networks.substr(0, comma));
        if (address.IsIn(network)) {
            return true;
        }
        networks.remove_prefix(comma == std::string_view::npos ? networks.size() : comma + 1);
    }
    return false;
}

}  // namespace reference
