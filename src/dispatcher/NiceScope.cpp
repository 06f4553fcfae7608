#include "dispatcher/NiceScope.h"

#include <sys/resource.h>

#include <cerrno>

#include "base/ErrnoGuard.h"

namespace ZOVA {

NiceScope::NiceScope(int priority) : oldPriority(0), changed(false) {
    base::ErrnoGuard errnoGuard;
    errno = 0;
    oldPriority = getpriority(PRIO_PROCESS, 0);
    // -1 is a nice value too. One that cannot be read could not be given back.
    if (errno == 0 && oldPriority != priority) {
        changed = true;
        setpriority(PRIO_PROCESS, 0, priority);
    }
}

void NiceScope::Restore() {
    if (changed) {
        base::ErrnoGuard errnoGuard;
        changed = false;
        setpriority(PRIO_PROCESS, 0, oldPriority);
    }
}

}  // namespace ZOVA
