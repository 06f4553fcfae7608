#include "base/UniqueFd.h"

#include "base/ErrnoGuard.h"

namespace ZOVA::base {

void UniqueFd::Close() {
    if (fd >= 0) {
        ErrnoGuard errnoGuard;
        close(Release());
    }
}

}  // namespace ZOVA::base
