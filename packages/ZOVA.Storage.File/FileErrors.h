#pragma once

#include <webapi/APIResponse.h>

namespace package {

/** Error numbers of this package's own. */
enum FileError : int {
    FILE_OK = 0,
    /** No path or name that can be used: not absolute, an empty part, "." or "..", NUL, too long; a bad new name. */
    FILE_ERR_BAD_PATH = 401,
    /** In no folder of the caller's; whether there is such a path is not told. */
    FILE_ERR_OUTSIDE = 402,
    FILE_ERR_NOT_FOUND = 403,
    /** The caller may not do this there. */
    FILE_ERR_DENIED = 404,
    /** Something of this name is there already. */
    FILE_ERR_EXISTS = 405,
    /** A file where a folder is needed or the other way round, a symbolic link, a device. */
    FILE_ERR_WRONG_KIND = 406,
    /** A folder that holds something. */
    FILE_ERR_NOT_EMPTY = 407,
    /** No room, or the caller's quota is used up. */
    FILE_ERR_NO_ROOM = 408,
    /** A folder of the caller's itself, which stays as it is. */
    FILE_ERR_TOP_FOLDER = 409,
    /** Source and target lie in different folders of the caller's, or on different file systems. */
    FILE_ERR_ELSEWHERE = 410,
    /** A folder into itself. */
    FILE_ERR_INTO_ITSELF = 411,
    /** The device's table of shared folders cannot be used. */
    FILE_ERR_TABLE = 412,
    /** No archive can be made: the device lacks the library. */
    FILE_ERR_NO_ARCHIVER = 413,
    /** The upload was stopped, or broke off. */
    FILE_ERR_BROKEN_OFF = 414,
    /** The system refused a step; the log says which. */
    FILE_ERR_SYSTEM = 415,
};

/** The error number for a system call's `errno`; one that has none is logged. @param step for the log. */
FileError ErrorOf(int error, const char* step);

/** Answers the number without details. */
void Refuse(ZOVA::APIResponse* response, FileError error);

}  // namespace package
