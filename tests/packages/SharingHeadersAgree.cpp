// Compiles only if the packages declare the operations on sharing links as the reference platform does: two different
// declarations of one C function are refused.

#include <cstddef>
#include <iterator>
#include <type_traits>

#include "../../platform/reference/zovalinks.h"

namespace provided {

constexpr int kResults[] = {ZOVA_LINK_OK,        ZOVA_LINK_BAD_FIELD,      ZOVA_LINK_BAD_PROJECT,
                            ZOVA_LINK_BAD_PATHS, ZOVA_LINK_BAD_PROTECTION, ZOVA_LINK_BAD_ADDRESSES,
                            ZOVA_LINK_BAD_TIME,  ZOVA_LINK_BAD_LIMIT,      ZOVA_LINK_NO_USER,
                            ZOVA_LINK_TOO_MANY,  ZOVA_LINK_UNKNOWN,        ZOVA_LINK_REFUSED,
                            ZOVA_LINK_BLOCKED,   ZOVA_LINK_FAILED};
constexpr auto kOpen = &ZovaLinkOpen;
using Visit = ZovaLinkVisit;

}  // namespace provided

// The second declaration of each name gets another one here, so that both can be seen side by side.
#define ZovaLinkResult ImportedLinkResult
#define ZovaLinkVisit ImportedLinkVisit
#define ZovaLinkOpen ImportedLinkOpen
#define ZOVA_LINK_OK IMPORTED_OK
#define ZOVA_LINK_BAD_FIELD IMPORTED_BAD_FIELD
#define ZOVA_LINK_BAD_PROJECT IMPORTED_BAD_PROJECT
#define ZOVA_LINK_BAD_PATHS IMPORTED_BAD_PATHS
#define ZOVA_LINK_BAD_PROTECTION IMPORTED_BAD_PROTECTION
#define ZOVA_LINK_BAD_ADDRESSES IMPORTED_BAD_ADDRESSES
#define ZOVA_LINK_BAD_TIME IMPORTED_BAD_TIME
#define ZOVA_LINK_BAD_LIMIT IMPORTED_BAD_LIMIT
#define ZOVA_LINK_NO_USER IMPORTED_NO_USER
#define ZOVA_LINK_TOO_MANY IMPORTED_TOO_MANY
#define ZOVA_LINK_UNKNOWN IMPORTED_UNKNOWN
#define ZOVA_LINK_REFUSED IMPORTED_REFUSED
#define ZOVA_LINK_BLOCKED IMPORTED_BLOCKED
#define ZOVA_LINK_FAILED IMPORTED_FAILED
#include "../../packages/common/PlatformSharing.h"

constexpr int kImported[] = {IMPORTED_OK,        IMPORTED_BAD_FIELD,      IMPORTED_BAD_PROJECT,
                             IMPORTED_BAD_PATHS, IMPORTED_BAD_PROTECTION, IMPORTED_BAD_ADDRESSES,
                             IMPORTED_BAD_TIME,  IMPORTED_BAD_LIMIT,      IMPORTED_NO_USER,
                             IMPORTED_TOO_MANY,  IMPORTED_UNKNOWN,        IMPORTED_REFUSED,
                             IMPORTED_BLOCKED,   IMPORTED_FAILED};

constexpr bool AreEqual() {
    for (std::size_t at = 0; at < std::size(kImported); ++at) {
        if (kImported[at] != provided::kResults[at]) {
            return false;
        }
    }
    return std::size(kImported) == std::size(provided::kResults);
}

static_assert(AreEqual());
static_assert(sizeof(provided::Visit) == sizeof(ImportedLinkVisit));
static_assert(offsetof(provided::Visit, user) == offsetof(ImportedLinkVisit, user));
static_assert(offsetof(provided::Visit, password) == offsetof(ImportedLinkVisit, password));
static_assert(offsetof(provided::Visit, address) == offsetof(ImportedLinkVisit, address));
static_assert(
    std::is_same_v<decltype(ImportedLinkOpen), int(const char*, const ImportedLinkVisit*, char*, int, long long*)>);
static_assert(std::is_same_v<decltype(provided::kOpen),
                             int (*const)(const char*, const provided::Visit*, char*, int, long long*)>);
