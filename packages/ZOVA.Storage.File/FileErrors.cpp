#include "FileErrors.h"

#include <errno.h>
#include <string.h>
#include <syslog.h>

namespace package {

FileError ErrorOf(int error, const char* step) {
    switch (error) {
        case ENOENT:
            return FILE_ERR_NOT_FOUND;
        case EACCES:
        case EPERM:
        case EROFS:
            return FILE_ERR_DENIED;
        case EEXIST:
            return FILE_ERR_EXISTS;
        case ENOTEMPTY:
            return FILE_ERR_NOT_EMPTY;
        case ENOTDIR:
        case EISDIR:
        case ELOOP:
        // A socket, or a device without a driver.
        case ENXIO:
        case ENODEV:
            return FILE_ERR_WRONG_KIND;
        case ENOSPC:
        case EDQUOT:
        case EFBIG:
            return FILE_ERR_NO_ROOM;
        case ENAMETOOLONG:
            return FILE_ERR_BAD_PATH;
        case EXDEV:
            return FILE_ERR_ELSEWHERE;
        default:
            syslog(LOG_ERR, "%s: %s", step, strerror(error));
            return FILE_ERR_SYSTEM;
    }
}

void Refuse(ZOVA::APIResponse* response, FileError error) {
    response->SetError(error, Json::Value());
}

}  // namespace package
