#pragma once

namespace package {

/** Error numbers of this package's own. */
enum UserError : int {
    USER_ERR_NO_SUCH_USER = 401,
    /** The user database could not be read. */
    USER_ERR_DATABASE = 402,
};

}  // namespace package
