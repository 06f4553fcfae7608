#pragma once

namespace package {

/** Error numbers of this package's own. */
enum SessionError : int {
    /** Unknown account or wrong password; the client is not told which. */
    SESSION_ERR_REFUSED = 400,
    /** Too many failed logins of this account or from this address. */
    SESSION_ERR_BLOCKED = 407,
};

}  // namespace package
