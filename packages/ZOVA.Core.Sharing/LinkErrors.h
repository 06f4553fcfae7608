#pragma once

#include <webapi/APIResponse.h>

namespace package {

/** Error numbers of this package's own. */
enum LinkError : int {
    /** The caller's account may not have links. */
    LINK_ERR_NO_USER = 401,
    LINK_ERR_NO_SUCH_LINK = 402,
    /** The user, or the device, has as many links as there may be. */
    LINK_ERR_TOO_MANY = 403,
};

/** Answers for a platform operation that failed. @param result a ZovaLinkResult other than success. */
void RefuseLink(ZOVA::APIResponse* response, int result);

}  // namespace package
