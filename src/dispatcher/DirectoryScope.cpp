#include "dispatcher/DirectoryScope.h"

#include <unistd.h>

#include <cstdlib>

#include "base/ErrnoGuard.h"

namespace ZOVA {

void DirectoryScope::Save() {
    saved = getcwd(nullptr, 0);
}

void DirectoryScope::Restore() {
    if (saved == nullptr) {
        return;
    }
    base::ErrnoGuard errnoGuard;
    // A process that has become another user for good may be refused the way back; it ends with this call.
    [[maybe_unused]] const int result = chdir(saved);
    free(saved);
    saved = nullptr;
}

}  // namespace ZOVA
