#pragma once

#include <json/value.h>

#include <string>

#include "common/Crypto.h"
#include "zovacredential/RelayError.h"

namespace reference {

/** How a peer device is reached and known, and as whom one user calls there. */
struct Peer {
    /** "https://" with host, port and path. */
    std::string url;
    /** "::ADDRESS:" where the connection goes in place of the URL's host; "" for none. */
    std::string connectTo;
    /** "sha256//" and base64 of the public key's SHA-256; "" only if there is an authority. */
    std::string pin;
    /** Certificates in PEM; "" only if there is a pin. */
    std::string authority;
    /** Of the user at the peer. */
    Secret token;
};

/**
 * Reads the record of a peer, and in it the token of the local user. The account has to be the one that the token was
 * entered for, and may log in.
 * @return kNone, or why `peer` cannot be used.
 */
RelayError FindPeer(long number, const std::string& user, Peer& peer);

/** The same for a record that was read: everything but the user. */
bool ParsePeer(const Json::Value& record, Peer& peer);

}  // namespace reference
