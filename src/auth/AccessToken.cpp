#include "webapi/APIAuth.h"

namespace ZOVA {

// Bearer tokens are not looked at yet: every call counts as one without.

bool APIAuth::CheckAccessToken(APIRequest*) {
    return false;
}

}  // namespace ZOVA
