#pragma once

#include <ctime>
#include <string>
#include <string_view>

#include "zovacgi/Session.h"

namespace reference {

/** The session files: one for each session, named by its id, renewed by its modification time. */
class SessionStore {
public:
    enum class Result {
        kGood,
        /** No such session; also an id of another form, for which no file is touched. */
        kUnknown,
        /** There is something, but not a session file of root's that can be read. */
        kBroken,
    };

    struct Entry {
        Session session;
        /** When the session was last used. */
        time_t used = 0;
    };

    static Result Load(std::string_view sid, Entry& entry);

    /**
     * Writes a new session, and first removes the ones that ended long ago.
     * @return its id, or "" if it could not be written or there are too many.
     */
    static std::string Create(const Session& session);

    /** Sets the time of last use to now. */
    static Result Renew(std::string_view sid);

    static bool Remove(std::string_view sid);

    /** Path of the session's file; "" for an id of another form. */
    static std::string PathOf(std::string_view sid);
};

}  // namespace reference
