#pragma once

#include <webapi/APIRequest.h>

#include <string>

#include "../common/Secret.h"

namespace package {

/** What a client sent to log in. */
struct LoginParameters {
    std::string account;
    Secret password;
    /** Whether each call of the session shall bring a token. */
    bool csrf = false;
};

/**
 * Reads "account", "passwd" and "csrf" from the parameters or, where one is absent, from the members of the object
 * parameter "webapi", which is where the pairs of an enciphered envelope arrive.
 *
 * A number without a fraction counts as the text of its digits, since a client that sends `passwd=1234` means that.
 * Account and password are not empty, at most 255 and 511 bytes long, and hold no control bytes.
 *
 * @return null, or the name of the first parameter that is missing or unusable.
 */
const char* ReadLoginParameters(const ZOVA::APIRequest* request, LoginParameters& out);

}  // namespace package
