// Compiles only if the packages declare what they import from libwebapi.so as the platform's header does.

#include <type_traits>

#include "../../platform/include/webapiutil.h"

// The second declaration of the class gets another name here, so that both can be seen side by side.
#define WebAPIUtil ImportedWebAPIUtil
#include "../../packages/common/PlatformText.h"
#undef WebAPIUtil

static_assert(
    std::is_same_v<decltype(ZOVA::WebAPIUtil::strPairToJsonObj), decltype(ZOVA::ImportedWebAPIUtil::strPairToJsonObj)>);
