#pragma once

#include <webapi/APIRequest.h>

namespace package {

/**
 * Checks the session that the client named by the cookie "id", with its address and the token that it sent in the
 * header "X-ZOVA-TOKEN".
 * @param user at least 493 bytes; left alone unless the session is good.
 * @return an authorisation result, 1 or 2 for a good session.
 */
int CheckClientSession(ZOVA::APIRequest* request, char* user, int size);

/** Ends the client's session; true if it has none any more. */
bool EndClientSession(ZOVA::APIRequest* request);

}  // namespace package
