#include "StandardDescriptors.h"

#include <fcntl.h>
#include <unistd.h>

namespace host {

bool OpenStandardDescriptors() {
    for (int descriptor = STDIN_FILENO; descriptor <= STDERR_FILENO; ++descriptor) {
        if (::fcntl(descriptor, F_GETFD) >= 0) {
            continue;
        }
        // The lowest free number is this one, as those below it are open.
        if (::open("/dev/null", descriptor == STDIN_FILENO ? O_RDONLY : O_WRONLY) != descriptor) {
            return false;
        }
    }
    return true;
}

}  // namespace host
