// Compiles only if the packages declare a sharing link, which the framework hands out by value, and the question what
// it shares as the platform does.

#include <cstddef>
#include <type_traits>

#include "../../platform/include/zovasharing.h"

#include "../../platform/reference/zovalinks.h"

namespace provided {

constexpr auto kOpenPath = &ZovaLinkOpenPath;

}  // namespace provided

// The second declaration of the record and the function get other names here, so that both can be seen side by side.
#define record importedrecord
#define ZovaLinkOpenPath ImportedLinkOpenPath
#include "../../packages/common/PlatformSharedPath.h"
#undef record
#undef ZovaLinkOpenPath

using Provided = ZOVA::sharing::record::Entry;
using Imported = ZOVA::sharing::importedrecord::Entry;

#define SAME_MEMBER(name)                                                              \
    static_assert(std::is_same_v<decltype(Provided::name), decltype(Imported::name)>); \
    static_assert(offsetof(Provided, name) == offsetof(Imported, name))

static_assert(sizeof(Provided) == sizeof(Imported));
SAME_MEMBER(id);
SAME_MEMBER(hash);
SAME_MEMBER(ownerUid);
SAME_MEMBER(ownerName);
SAME_MEMBER(projectName);
SAME_MEMBER(paths);
SAME_MEMBER(protectType);
SAME_MEMBER(matchIp);

static_assert(std::is_same_v<decltype(provided::kOpenPath), int (*const)(const Provided*, const char*)>);
static_assert(std::is_same_v<decltype(ImportedLinkOpenPath), int(const Imported*, const char*)>);
