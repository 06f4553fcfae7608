#include "zovacredential/RelayError.h"

namespace reference {

const char* TextOf(RelayError error) {
    switch (error) {
        case RelayError::kNone:
            return "no failure";
        case RelayError::kNoTable:
            return "the table of peers cannot be used";
        case RelayError::kUnknownPeer:
            return "there is no such peer in the table";
        case RelayError::kBadRecord:
            return "the peer's record cannot be used";
        case RelayError::kNoCredential:
            return "the user has no credential for the peer";
        case RelayError::kBadRequest:
            return "the call cannot be sent in this form";
        case RelayError::kFailed:
            return "no memory, or no libcurl";
        case RelayError::kNoConnection:
            return "no connection";
        case RelayError::kNotTrusted:
            return "the peer's certificate is not the one of the table";
        case RelayError::kTimeout:
            return "time-out";
        case RelayError::kBroken:
            return "the answer is broken";
        case RelayError::kStatus:
            return "the answer's status is not 200";
        case RelayError::kTooLarge:
            return "the answer is too large";
        case RelayError::kClientGone:
            return "the client's body ended too early";
    }
    return "unknown";
}

}  // namespace reference
