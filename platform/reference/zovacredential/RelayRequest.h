#pragma once

#include <cstdint>
#include <cstdio>
#include <string>

#include "common/Crypto.h"
#include "zovacredential/PeerTable.h"
#include "zovacredential/RelayError.h"

namespace reference {

/** One request to a peer: what it sends, and what came back. */
class RelayRequest {
public:
    /** Largest body of an answer, in bytes: it is held in memory until it goes to the client. */
    static constexpr size_t kLargestAnswer = 16 * 1024 * 1024;
    static constexpr long kAnswerSeconds = 60;
    /** The longest time that can be asked for: a client chooses it, and holds a process as long. */
    static constexpr long kMostAnswerSeconds = 3600;

    long number = 0;
    Peer peer;
    /** The URL's query string; it holds the token where the body cannot. */
    Secret query;
    std::string contentType;
    /** The body, or what goes before that of `in`. */
    Secret body;
    /** Where the rest of the body comes from; null if there is none. Not owned. */
    FILE* in = nullptr;
    uint64_t inSize = 0;
    long answerSeconds = kAnswerSeconds;

    std::string answer;
    bool isDone = false;

    /** Sends the request and waits for the answer. Logs a failure. */
    RelayError Perform();
};

/** Writes why a peer was not asked, or not successfully. Names no user and no parameter. */
void LogRelayFailure(long peer, RelayError error, long detail);

}  // namespace reference
