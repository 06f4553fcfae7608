#pragma once

#include <cstdint>
#include <cstdio>
#include <string_view>

#include "httpfileoutputer/PipeSignalScope.h"

namespace reference {

/**
 * The way to the client, over a descriptor that stays the caller's: pipe, socket or file, waiting or not. What is sent
 * never lies in this process's memory but for small parts. Each function is false once not all of it could be sent,
 * because the client is gone or takes nothing for `kLongestWait`, or because the content came to an early end.
 */
class ClientOutput {
public:
    /** In milliseconds, for a descriptor that does not wait by itself. */
    static constexpr int kLongestWait = 360'000;

    explicit ClientOutput(int descriptor) : client(descriptor) {}

    bool Write(std::string_view text);
    /** Part of a regular file; its own position stays. */
    bool SendFile(int file, std::uint64_t first, std::uint64_t length);
    /** A stream, from its position to its end. */
    bool SendStream(FILE* stream);

private:
    bool CopyFile(int file, std::uint64_t first, std::uint64_t length);
    /** After a call that failed: whether it is to be tried again. */
    bool CanTryAgain() const;

    PipeSignalScope signal;
    int client;
};

}  // namespace reference
