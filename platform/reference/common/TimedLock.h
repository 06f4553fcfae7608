#pragma once

#include "common/UniqueFd.h"

namespace reference {

/**
 * Takes an exclusive lock on a lock file, which is made with mode 0600 if needed, and waits at most `seconds` (0 tries
 * once). The lock lasts as long as the descriptor and its copies in forked children are open, or until it is unlocked.
 * @return a closed descriptor on failure, with errno; ETIMEDOUT when the time is up.
 */
UniqueFd TakeTimedLock(const char* path, int seconds);

/** As `TakeTimedLock`, on a file that is open already. @return false on failure, with errno. */
bool LockDescriptor(int descriptor, int seconds);

}  // namespace reference
