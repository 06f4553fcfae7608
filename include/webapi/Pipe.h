#pragma once

#include <json/value.h>
#include <sys/types.h>

#include "Export.h"

namespace ZOVA {

/**
 * Carries JSON values from a forked child to its parent: one Unix pipe, one frame per value. Both sides are the same
 * program, so the frame is native and unversioned: 8 bytes of length in the host's byte order, then the JSON text.
 *
 * The parent makes the object and calls `Init`; after the fork the child calls `WriteOnly` and the parent `ReadOnly`.
 * The descriptors close on exec. Nothing here throws. One writer and one reader, each with one thread.
 */
class WEBAPI_EXPORT Pipe {
public:
    /** Opens nothing. */
    Pipe();
    Pipe(const Pipe&) = delete;
    Pipe& operator=(const Pipe&) = delete;
    /** Closes whatever is open. */
    ~Pipe();

    /** Makes the pipe. @return false if it is refused; nothing is open then. */
    bool Init();
    /** Closes this side's end for writing; a target of 0 or above becomes a copy of the end for reading. */
    void ReadOnly(int target);
    /** Closes this side's end for reading; a target of 0 or above becomes a copy of the end for writing. */
    void WriteOnly(int target);
    /** Closes both ends. */
    void Close();
    /**
     * Closes the ends of every pipe that this process holds, for a forked child that outlives the call: it must not
     * keep another process waiting for the end of a pipe.
     */
    static void CloseInherited();
    /** Whether the end for reading is open. */
    bool IsReadable() const;

    /**
     * Writes one frame, its text in one call.
     * @return false unless all of it was written. A reader that is gone raises SIGPIPE, which is not handled here.
     */
    bool WriteJson(const Json::Value& value);
    /**
     * Reads one frame, its text in one call: a frame longer than what one read of the pipe delivers fails. Blocks
     * until the writer writes or ends. Logs what is wrong with a frame.
     * @return false if no whole frame of JSON came; `value` is then left alone.
     */
    bool ReadJson(Json::Value& value);
    /** Zeroes `length` bytes of `buffer`, then reads once. @return what `read` gave. */
    ssize_t Read(char* buffer, int length);

private:
    int readFd;
    int writeFd;
};

}  // namespace ZOVA
