#include "dispatcher/NiceScope.h"

#include <sys/resource.h>

#include "base/ErrnoGuard.h"

namespace ZOVA {

NiceScope::NiceScope(int priority) : oldPriority(getpriority(PRIO_PROCESS, 0)), changed(oldPriority != priority) {
    if (changed) {
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
