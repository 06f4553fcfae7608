#include <sys/apparmor.h>

#include <cstdlib>
#include <cstring>

#include "Seam.h"

int ZOVA_aa_has_profile_restricted() {
    char* label = nullptr;
    char* mode = nullptr;
    if (aa_getcon(&label, &mode) < 0) {
        return 0;
    }
    const bool confined = strcmp(label, "unconfined") != 0;
    free(label);
    return confined ? 1 : 0;
}
