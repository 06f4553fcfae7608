#pragma once

#include <array>
#include <optional>
#include <string>
#include <string_view>

namespace reference {

/** An internet address. IPv4 is held as its IPv4-mapped IPv6 form, so that both spellings of one address are equal. */
class NetAddress {
public:
    /** Nothing for what is no plain numeric address (no port, no brackets, no zone). */
    static std::optional<NetAddress> Parse(std::string_view text);

    /** The usual spelling: dotted for IPv4. */
    std::string Text() const;
    /** What counts as one source of attempts: the address itself for IPv4, the /64 network for IPv6. */
    std::string SourceKey() const;
    /** Whether the address lies in "address" or "address/bits". A malformed network holds nothing. */
    bool IsIn(std::string_view network) const;

    bool operator==(const NetAddress& other) const { return bytes == other.bytes; }

private:
    bool IsVersion4() const;

    std::array<unsigned char, 16> bytes{};
};

/** Whether the address lies in one of the networks, which are separated by commas. */
bool IsInNetworkList(const NetAddress& address, std::string_view networks);

}  // namespace reference
