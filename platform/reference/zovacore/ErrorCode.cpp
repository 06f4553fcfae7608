#include <syslog.h>

#include "Seam.h"

namespace {

int lastError;

}  // namespace

void QLIBCErrSetEx(int code, const char* file, int line) {
    lastError = code;
    syslog(LOG_DEBUG, "error 0x%04X set at %s:%d", static_cast<unsigned int>(code), file != nullptr ? file : "?", line);
}

int QLIBCErrGet() {
    return lastError;
}
