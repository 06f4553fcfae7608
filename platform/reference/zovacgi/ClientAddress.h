#pragma once

#include <string>
#include <string_view>

namespace reference {

/**
 * Address of the client: the peer's, or, where that is one of the trusted proxies, the last forwarded one that is none.
 * A forwarded text that is no address ends the search, so that nothing to its left counts.
 * @return "" if the peer's address is none.
 */
std::string ClientAddress(std::string_view peer, std::string_view forwarded, std::string_view trustedProxies);

/** The same for the request in the process environment. */
std::string ClientAddressOfRequest();

}  // namespace reference
