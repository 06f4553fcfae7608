#pragma once

#include <webapi/APIResponse.h>

namespace package {

/** Error numbers of this package's own. */
enum TokenError : int {
    /** The call was not made in a login session: tokens are not managed by means of a token. */
    TOKEN_ERR_NO_SESSION = 400,
    /** No such user, or one who may not log in. */
    TOKEN_ERR_NO_SUCH_USER = 401,
    TOKEN_ERR_NO_SUCH_TOKEN = 402,
    /** The user, or the device, has as many tokens as there may be. */
    TOKEN_ERR_TOO_MANY = 403,
};

/** Answers for a platform operation that failed. @param result a ZovaAccessTokenResult other than success. */
void RefuseToken(ZOVA::APIResponse* response, int result);

}  // namespace package
