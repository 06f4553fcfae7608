#pragma once

namespace package {

/** Error numbers of this package's own. */
enum VisitError : int {
    /** Wrong password, or a user who may not use the link; the client is not told which. */
    VISIT_ERR_REFUSED = 400,
    /** No such link, or one that is closed, used up, or not for this address; the client is not told which. */
    VISIT_ERR_NO_SUCH_LINK = 402,
    /** As many visitors as there may be. */
    VISIT_ERR_TOO_MANY = 403,
    /** Too many failures on this link, of this user or from this address. */
    VISIT_ERR_BLOCKED = 407,
};

}  // namespace package
