#pragma once

namespace reference {

/** What `ZOVA::CredRequestMgr::GetError` tells; the numbers stand in logs and never change. */
enum class RelayError : int {
    kNone = 0,
    /** The table of peers is missing, open to others than root, or no such table. */
    kNoTable = 1,
    kUnknownPeer = 2,
    /** The peer's record, or the file that it names, cannot be used. */
    kBadRecord = 3,
    /** The table has no credential for the user at this peer. */
    kNoCredential = 4,
    /** The call cannot be sent in this form. */
    kBadRequest = 5,
    /** Lack of memory, or libcurl cannot be opened. */
    kFailed = 6,
    kNoConnection = 7,
    /** No TLS, or not the certificate of the table. */
    kNotTrusted = 8,
    kTimeout = 9,
    /** The connection broke, or what came is no HTTP answer. */
    kBroken = 10,
    /** A status other than 200. */
    kStatus = 11,
    kTooLarge = 12,
    /** The client's body ended before its announced length. */
    kClientGone = 13,
};

/** Words for the log. */
const char* TextOf(RelayError error);

}  // namespace reference
