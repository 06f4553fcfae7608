#pragma once

#include <json/value.h>

namespace ZOVA {

class APIRunner;
struct CallName;

/**
 * The attributes of the method as `GetMethodAttr` reads them: an entry whose attributes are no object has those of
 * `lib.def`, as one without attributes does. Valid until the runner takes in another description.
 */
const Json::Value& MethodAttributes(APIRunner& runner, const CallName& call);

}  // namespace ZOVA
