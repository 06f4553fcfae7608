#pragma once

#include "webapi/APIRequest.h"

namespace fuzz {

/** Asks the request everything that can be asked of it, and checks what holds for every request. */
void AskEverything(ZOVA::APIRequest& request);

/** Checks that a copy, and a request rebuilt from the text of this one, say the same. */
void CheckCopies(ZOVA::APIRequest& request);

}  // namespace fuzz
