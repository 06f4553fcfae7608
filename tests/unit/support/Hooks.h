#pragma once

#include <functional>
#include <map>
#include <string>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"

/** Every method of the test library "hook.so": does what the parameter "do" names. */
extern "C" __attribute__((visibility("default"))) void UnitHook(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

namespace unit {

using Hook = std::function<void(ZOVA::APIRequest*, ZOVA::APIResponse*)>;

/** What the test has taught the library, by name; naming anything else ends the process. */
std::map<std::string, Hook>& Hooks();

}  // namespace unit
