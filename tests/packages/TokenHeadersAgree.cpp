// Compiles only if the package declares the operations on access tokens as the reference platform does: two different
// declarations of one C function are refused.

#include "../../platform/reference/zovatokens.h"

namespace provided {

constexpr int kResults[] = {ZOVA_ACCESS_TOKEN_OK,       ZOVA_ACCESS_TOKEN_BAD_APIS, ZOVA_ACCESS_TOKEN_BAD_LABEL,
                            ZOVA_ACCESS_TOKEN_BAD_TIME, ZOVA_ACCESS_TOKEN_NO_USER,  ZOVA_ACCESS_TOKEN_TOO_MANY,
                            ZOVA_ACCESS_TOKEN_UNKNOWN,  ZOVA_ACCESS_TOKEN_FAILED};

}  // namespace provided

// The second declaration of each name gets another one here, so that both can be seen side by side.
#define ZovaAccessTokenResult ImportedAccessTokenResult
#define ZOVA_ACCESS_TOKEN_OK IMPORTED_OK
#define ZOVA_ACCESS_TOKEN_BAD_APIS IMPORTED_BAD_APIS
#define ZOVA_ACCESS_TOKEN_BAD_LABEL IMPORTED_BAD_LABEL
#define ZOVA_ACCESS_TOKEN_BAD_TIME IMPORTED_BAD_TIME
#define ZOVA_ACCESS_TOKEN_NO_USER IMPORTED_NO_USER
#define ZOVA_ACCESS_TOKEN_TOO_MANY IMPORTED_TOO_MANY
#define ZOVA_ACCESS_TOKEN_UNKNOWN IMPORTED_UNKNOWN
#define ZOVA_ACCESS_TOKEN_FAILED IMPORTED_FAILED
#include "../../packages/ZOVA.Core.Token/PlatformTokens.h"

static_assert(provided::kResults[0] == IMPORTED_OK);
static_assert(provided::kResults[1] == IMPORTED_BAD_APIS);
static_assert(provided::kResults[2] == IMPORTED_BAD_LABEL);
static_assert(provided::kResults[3] == IMPORTED_BAD_TIME);
static_assert(provided::kResults[4] == IMPORTED_NO_USER);
static_assert(provided::kResults[5] == IMPORTED_TOO_MANY);
static_assert(provided::kResults[6] == IMPORTED_UNKNOWN);
static_assert(provided::kResults[7] == IMPORTED_FAILED);
